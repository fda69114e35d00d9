// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/terminaltext.h"

#include <fmt/core.h>

#include <algorithm>
#include <cstddef>

namespace orin::app {
namespace {

/// Bytes of the UTF-8 character at the start of `text`; 0 when it is none.
size_t CharacterBytes(std::string_view text) {
  const auto first = static_cast<unsigned char>(text.front());
  if (first < 0x80) return 1;
  const size_t bytes = first >= 0xC2 && first < 0xE0   ? 2
                       : first >= 0xE0 && first < 0xF0 ? 3
                       : first >= 0xF0 && first < 0xF5 ? 4
                                                       : 0;
  if (bytes == 0 || text.size() < bytes) return 0;
  for (size_t i = 1; i < bytes; ++i)
    if ((text[i] & 0xC0) != 0x80) return 0;
  return bytes;
}

/// Control characters: C0, DEL, C1, and those that turn the direction of a line.
bool IsControl(std::string_view character) {
  const auto first = static_cast<unsigned char>(character[0]);
  if (character.size() == 1) return first < 0x20 || first == 0x7F;
  const auto second = static_cast<unsigned char>(character[1]);
  if (character.size() == 2) return first == 0xC2 && second < 0xA0;
  const auto third = static_cast<unsigned char>(character[2]);
  if (character.size() != 3 || first != 0xE2) return false;
  const bool breaksLine = second == 0x80 && (third == 0xA8 || third == 0xA9);
  const bool turns = (second == 0x80 && third >= 0xAA && third <= 0xAE) ||
                     (second == 0x81 && third >= 0xA6 && third <= 0xA9);
  return breaksLine || turns;
}

void AppendEscaped(std::string_view bytes, std::string& text) {
  if (bytes == "\n") text += "\\n";
  else if (bytes == "\t") text += "\\t";
  else
    for (const char byte : bytes)
      text += fmt::format("\\x{:02x}", static_cast<unsigned char>(byte));
}

}  // namespace

std::string Printable(std::string_view text) {
  std::string shown;
  while (!text.empty()) {
    const size_t bytes = CharacterBytes(text);
    const std::string_view character = text.substr(0, bytes == 0 ? 1 : bytes);
    if (bytes == 0 || IsControl(character)) AppendEscaped(character, shown);
    else shown += character;
    text.remove_prefix(character.size());
  }
  return shown;
}

std::string AfterFileName(const std::string& file, const std::string& text) {
  const std::string shownFile = Printable(file);
  const std::string name = shownFile + ": ";
  std::string rest = text;
  for (size_t at = rest.find(file); shownFile != file && at != rest.npos;
       at = rest.find(file, at + shownFile.size()))
    rest.replace(at, file.size(), shownFile);
  std::string lines;
  for (size_t start = 0; start < rest.size();) {
    const size_t end = std::min(rest.find('\n', start), rest.size());
    const std::string line = rest.substr(start, end - start);
    start = end + 1;
    if (line.empty()) continue;
    if (!lines.empty()) lines += '\n';
    lines += line.compare(0, name.size(), name) == 0 ? line : name + line;
  }
  return lines;
}

}  // namespace orin::app
