// SPDX-License-Identifier: MIT
#include "host/model/levelinputs.h"

#include <charconv>
#include <cstring>
#include <sstream>

#include "host/services/text.h"

namespace orin::model {
namespace {

bool IsPlain(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
         (c != '\0' && std::strchr("+-.,=_ ", c));
}

std::string Escaped(const std::string& text) {
  std::string escaped;
  for (const char c : text)
    if (IsPlain(c)) escaped += c;
    else escaped += FormatString("%%%02X", unsigned{static_cast<unsigned char>(c)});
  return escaped;
}

std::string Unescaped(const std::string& text) {
  std::string plain;
  for (size_t i = 0; i < text.size(); ++i) {
    unsigned code = 0;
    const bool isCode =
        text[i] == '%' && i + 2 < text.size() &&
        std::from_chars(&text[i + 1], &text[i + 1] + 2, code, 16).ptr == &text[i + 1] + 2;
    plain += isCode ? static_cast<char>(code) : text[i];
    if (isCode) i += 2;
  }
  return plain;
}

std::string Joined(const std::vector<unsigned>& numbers) {
  std::string text;
  for (const unsigned number : numbers) text += (text.empty() ? "" : ",") + std::to_string(number);
  return text;
}

unsigned NumberIn(const std::string& text) {
  unsigned number = 0;
  std::from_chars(text.data(), text.data() + text.size(), number);
  return number;
}

std::vector<unsigned> NumbersIn(const std::string& text) {
  std::vector<unsigned> numbers;
  std::istringstream stream(text);
  for (std::string number; std::getline(stream, number, ',');) numbers.push_back(NumberIn(number));
  return numbers;
}

}  // namespace

StaleReason DifferenceOf(const LevelInputs& recorded, const LevelInputs& now) {
  if (recorded.alphaChannel != now.alphaChannel) return StaleReason::kAlpha;
  if (recorded.coding != now.coding) return StaleReason::kCoding;
  if (recorded.noData != now.noData) return StaleReason::kNoData;
  if (recorded.mask != now.mask) return StaleReason::kMask;
  if (recorded.palette != now.palette) return StaleReason::kPalette;
  return StaleReason::kNone;
}

std::string TextOf(const LevelInputs& inputs) {
  return "nodata=" + Escaped(inputs.noData) + ";origin=" + Escaped(inputs.noDataOrigin) +
         ";mask=" + Escaped(inputs.mask) + ";alpha=" + std::to_string(inputs.alphaChannel) +
         ";palette=" + Escaped(inputs.palette) + ";coding=" + Escaped(inputs.coding) +
         ";channels=" + Joined(inputs.channels);
}

LevelInputs ParseLevelInputs(const std::string& text) {
  LevelInputs inputs;
  std::istringstream stream(text);
  for (std::string field; std::getline(stream, field, ';');) {
    const size_t equals = field.find('=');
    if (equals == field.npos) continue;
    const std::string key = field.substr(0, equals);
    const std::string value = Unescaped(field.substr(equals + 1));
    if (key == "nodata") inputs.noData = value;
    if (key == "origin") inputs.noDataOrigin = value;
    if (key == "mask") inputs.mask = value;
    if (key == "alpha") inputs.alphaChannel = NumberIn(value);
    if (key == "palette") inputs.palette = value;
    if (key == "coding") inputs.coding = value;
    if (key == "channels") inputs.channels = NumbersIn(value);
  }
  return inputs;
}

std::string TextOf(StaleReason reason) {
  switch (reason) {
    case StaleReason::kNone:
      break;
    case StaleReason::kImageData:
      return _("image changed");
    case StaleReason::kCoding:
      return _("storage tags changed");
    case StaleReason::kNoData:
      return _("no-data value changed");
    case StaleReason::kMask:
      return _("mask added or removed");
    case StaleReason::kAlpha:
      return _("alpha channel changed");
    case StaleReason::kPalette:
      return _("palette changed");
    case StaleReason::kSourceRebuilt:
      return _("source level was rebuilt");
  }
  return "";
}

}  // namespace orin::model
