// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfanamelist.h"

#include <algorithm>
#include <charconv>

#include "host/drivers/hfa/hfanode.h"

namespace orin::drivers {
namespace {

/// A text of a list: its length, its position in the file, and its characters.
struct ListText {
  size_t at;  ///< of the length, within the list's data
  std::string_view text;
};
constexpr size_t kTextHeaderBytes = 8;

/// The list's first text is the name of a method; then come the number of names, a position, and
/// the names.
std::vector<ListText> NamesIn(std::string_view data) {
  std::vector<ListText> names;
  size_t at = kTextHeaderBytes + size_t{HfaNumberAt(data, 0)};
  if (at + kTextHeaderBytes > data.size()) return names;
  const uint32_t count = HfaNumberAt(data, at);
  at += kTextHeaderBytes;
  for (uint32_t i = 0; i < count && at + kTextHeaderBytes <= data.size(); ++i) {
    const size_t length = HfaNumberAt(data, at);
    if (length > data.size() - at - kTextHeaderBytes) break;
    names.push_back({at, data.substr(at + kTextHeaderBytes, length)});
    at += kTextHeaderBytes + length;
  }
  return names;
}

/// Appends the number, and one that leads to the byte behind both.
void AppendHeader(std::string& data, uint32_t number, uint32_t position) {
  const size_t at = data.size();
  data.resize(at + kTextHeaderBytes);
  PutHfaNumber(data, at, number);
  PutHfaNumber(data, at + 4, static_cast<uint32_t>(position + data.size()));
}

}  // namespace

HfaLevelName ParseHfaLevelName(std::string_view text) {
  HfaLevelName name;
  text = text.substr(0, text.find('\0'));
  const size_t layer = text.find("(:");
  const size_t factor = text.rfind("_ss_");
  if (layer == text.npos) return name;
  name.file = text.substr(0, layer);
  if (factor != text.npos)
    std::from_chars(text.data() + factor + 4, text.data() + text.size(), name.factor);
  return name;
}

HfaNameList::HfaNameList(const std::string& data) : dataBytes_(data.size()) {
  if (data.size() > kTextHeaderBytes) method_ = data.substr(kTextHeaderBytes, HfaNumberAt(data, 0));
  for (const ListText& entry : NamesIn(data))
    if (!entry.text.empty()) names_.emplace_back(entry.text);
}

std::vector<HfaLevelName> HfaNameList::Levels() const {
  std::vector<HfaLevelName> levels;
  for (const std::string& name : names_) levels.push_back(ParseHfaLevelName(name));
  return levels;
}

bool HfaNameList::Has(unsigned factor) const {
  return std::any_of(names_.begin(), names_.end(), [&](const std::string& name) {
    return ParseHfaLevelName(name).factor == factor;
  });
}

bool HfaNameList::Remove(const std::vector<unsigned>& factors) {
  return std::erase_if(names_, [&](const std::string& name) {
           const unsigned factor = ParseHfaLevelName(name).factor;
           return std::find(factors.begin(), factors.end(), factor) != factors.end();
         }) > 0;
}

std::string HfaNameList::DataAt(uint32_t position) const {
  constexpr size_t kGrowthBytes = 3000;  // for the names that other programs add in place
  const std::string method =
      method_.empty() ? std::string("IMAGINE 2X2 Resampling") + '\0' : method_;
  std::string data;
  AppendHeader(data, static_cast<uint32_t>(method.size()), position);
  data += method;
  AppendHeader(data, static_cast<uint32_t>(names_.size()), position);
  for (const std::string& name : names_) {
    AppendHeader(data, static_cast<uint32_t>(name.size()), position);
    data += name;
  }
  if (data.size() <= dataBytes_) data.resize(dataBytes_);
  else data.resize(data.size() + kGrowthBytes);
  return data;
}

std::vector<uint32_t> PointersInHfaNameList(const std::string& data) {
  const size_t count = kTextHeaderBytes + size_t{HfaNumberAt(data, 0)};
  std::vector<uint32_t> pointers;
  if (count + kTextHeaderBytes > data.size()) return pointers;
  for (const size_t at : {size_t{0}, count}) pointers.push_back(static_cast<uint32_t>(at + 4));
  for (const ListText& entry : NamesIn(data))
    pointers.push_back(static_cast<uint32_t>(entry.at + 4));
  return pointers;
}

}  // namespace orin::drivers
