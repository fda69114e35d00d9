// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/gdalmetadata.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <string_view>
#include <utility>

namespace orin::drivers {
namespace {

constexpr std::string_view kBlanks = " \t\r\n";
constexpr std::pair<std::string_view, char> kEntities[] = {
    {"amp", '&'}, {"lt", '<'}, {"gt", '>'}, {"quot", '"'}, {"apos", '\''}};

void AppendUtf8(uint32_t code, std::string& text) {
  const auto tail = [&](int shift) { text += static_cast<char>(0x80 | (code >> shift & 0x3F)); };
  if (code < 0x80) {
    text += static_cast<char>(code);
  } else if (code < 0x800) {
    text += static_cast<char>(0xC0 | code >> 6);
    tail(0);
  } else if (code < 0x10000) {
    text += static_cast<char>(0xE0 | code >> 12);
    tail(6), tail(0);
  } else {
    text += static_cast<char>(0xF0 | code >> 18);
    tail(12), tail(6), tail(0);
  }
}

/// Appends what the reference `&name;` stands for. \returns false for an unknown one
bool AppendReference(std::string_view name, std::string& text) {
  for (const auto& [entity, character] : kEntities)
    if (name == entity) return text += character, true;
  if (name.size() < 2 || name[0] != '#') return false;
  const bool hex = name[1] == 'x' || name[1] == 'X';
  const std::string_view digits = name.substr(hex ? 2 : 1);
  uint32_t code = 0;
  const auto [end, error] =
      std::from_chars(digits.data(), digits.data() + digits.size(), code, hex ? 16 : 10);
  if (error != std::errc() || end != digits.data() + digits.size() || code == 0 || code > 0x10FFFF)
    return false;
  AppendUtf8(code, text);
  return true;
}

std::string Unescape(std::string_view raw) {
  constexpr size_t kLongestReference = 10;
  std::string text;
  while (!raw.empty()) {
    const size_t plain = std::min(raw.find('&'), raw.size());
    text += raw.substr(0, plain);
    raw.remove_prefix(plain);
    if (raw.empty()) break;
    const size_t end = raw.substr(0, kLongestReference + 2).find(';');
    const bool known = end != raw.npos && AppendReference(raw.substr(1, end - 1), text);
    if (!known) text += '&';
    raw.remove_prefix(known ? end + 1 : 1);
  }
  return text;
}

std::string Escape(const std::string& text) {
  std::string escaped;
  for (const char c : text) {
    const auto entity = std::find_if(std::begin(kEntities), std::end(kEntities),
                                     [c](const auto& entry) { return entry.second == c; });
    if (entity != std::end(kEntities)) (escaped += '&').append(entity->first) += ';';
    else if (static_cast<unsigned char>(c) < ' ') escaped += "&#" + std::to_string(int{c}) + ";";
    else escaped += c;
  }
  return escaped;
}

/// Walks through the text, never past its end.
class Scanner {
 public:
  explicit Scanner(std::string_view text) : rest_(text) {}

  /// Moves behind the next `<Item`. \returns false when there is none
  bool ToItem() {
    for (size_t at = rest_.find('<'); at != rest_.npos; at = rest_.find('<')) {
      rest_.remove_prefix(at);
      if (Skip("<!--")) SkipTo("-->");
      else if (rest_.substr(0, kItem.size()) == kItem && EndsName(kItem.size()))
        return rest_.remove_prefix(kItem.size()), true;
      else rest_.remove_prefix(1);
    }
    return false;
  }

  /// Reads one attribute. \returns false at the tag's end, or where the text is no attribute
  bool Attribute(std::string& name, std::string& value) {
    SkipBlanks();
    const size_t end = std::min(rest_.find_first_of("= \t\r\n/><"), rest_.size());
    name = rest_.substr(0, end);
    if (name.empty()) return false;
    rest_.remove_prefix(end);
    SkipBlanks();
    if (!Skip("=")) return false;
    SkipBlanks();
    if (rest_.empty() || (rest_[0] != '"' && rest_[0] != '\'')) return false;
    const size_t close = rest_.find(rest_[0], 1);
    if (close == rest_.npos) return false;
    value = Unescape(rest_.substr(1, close - 1));
    rest_.remove_prefix(close + 1);
    return true;
  }

  /// Reads an item's text. \returns false when its tag or the item does not end
  bool Text(std::string& text) {
    text.clear();
    SkipBlanks();
    bytesFromTextOn_ = 0;
    if (Skip("/>")) return true;
    if (!Skip(">")) return false;
    bytesFromTextOn_ = rest_.size();
    for (;;) {
      const size_t end = rest_.find('<');
      if (end == rest_.npos) return false;
      text += Unescape(rest_.substr(0, end));
      rest_.remove_prefix(end);
      if (Skip("</Item")) return true;
      if (!SkipMarkup(text)) return false;
    }
  }

  /// From the start of the last item's text to the end of all; 0 when the item had no place for it.
  size_t BytesFromTextOn() const { return bytesFromTextOn_; }

 private:
  static constexpr std::string_view kItem = "<Item";

  bool EndsName(size_t at) const {
    return at < rest_.size() &&
           (kBlanks.find(rest_[at]) != kBlanks.npos || rest_[at] == '>' || rest_[at] == '/');
  }
  void SkipBlanks() {
    rest_.remove_prefix(std::min(rest_.find_first_not_of(kBlanks), rest_.size()));
  }
  bool Skip(std::string_view expected) {
    if (rest_.substr(0, expected.size()) != expected) return false;
    rest_.remove_prefix(expected.size());
    return true;
  }
  /// Moves behind `end`, or to the text's end. \returns what was passed over
  std::string_view SkipTo(std::string_view end) {
    const size_t at = rest_.find(end);
    const std::string_view passed = rest_.substr(0, at);
    rest_.remove_prefix(at == rest_.npos ? rest_.size() : at + end.size());
    return passed;
  }
  /// Passes over markup inside an item; character data counts as text.
  /// \returns false where the next item starts: this one was never closed
  bool SkipMarkup(std::string& text) {
    if (rest_.substr(0, kItem.size()) == kItem && EndsName(kItem.size())) return false;
    if (Skip("<![CDATA[")) text += SkipTo("]]>");
    else if (Skip("<!--")) SkipTo("-->");
    else SkipTo(">");
    return true;
  }

  std::string_view rest_;
  size_t bytesFromTextOn_ = 0;
};

void SetAttribute(MetadataItem& item, const std::string& name, std::string value) {
  if (name == "name") item.name = std::move(value);
  else if (name == "role") item.role = std::move(value);
  else if (name == "domain") item.domain = std::move(value);
  else if (name == "sample") {
    unsigned number = 0;
    const auto [end, error] = std::from_chars(value.data(), value.data() + value.size(), number);
    if (error == std::errc() && end == value.data() + value.size()) item.sample = number;
  }
}

}  // namespace

std::vector<MetadataItem> ParseMetadata(const std::string& xml, std::vector<size_t>* textAt) {
  std::vector<MetadataItem> items;
  const std::string_view text(xml.data(), std::min(xml.find('\0'), xml.size()));
  Scanner scanner(text);
  while (scanner.ToItem()) {
    MetadataItem item;
    std::string name, value;
    while (scanner.Attribute(name, value)) SetAttribute(item, name, std::move(value));
    if (!scanner.Text(item.text) || item.name.empty()) continue;
    items.push_back(std::move(item));
    if (textAt) textAt->push_back(text.size() - scanner.BytesFromTextOn());
  }
  return items;
}

std::string ComposeMetadata(const std::vector<MetadataItem>& items) {
  std::string xml = "<GDALMetadata>\n";
  const auto attribute = [&xml](const char* name, const std::string& value) {
    if (!value.empty()) xml.append(" ").append(name).append("=\"").append(Escape(value)) += '"';
  };
  for (const MetadataItem& item : items) {
    xml += "  <Item";
    attribute("name", item.name);
    if (item.sample) attribute("sample", std::to_string(*item.sample));
    attribute("role", item.role);
    attribute("domain", item.domain);
    xml.append(">").append(Escape(item.text)) += "</Item>\n";
  }
  return xml + "</GDALMetadata>\n";
}

}  // namespace orin::drivers
