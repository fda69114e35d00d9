// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfatree.h"

#include <algorithm>
#include <charconv>
#include <string_view>

namespace orin::drivers {
namespace {

/// "scene.img(:Layer_1:_ss_4_)"; factor 0 for what is no level.
HfaLevelName ParseName(std::string_view text) {
  HfaLevelName name;
  const size_t layer = text.find("(:");
  const size_t factor = text.rfind("_ss_");
  if (layer == text.npos) return name;
  name.file = text.substr(0, layer);
  if (factor != text.npos)
    std::from_chars(text.data() + factor + 4, text.data() + text.size(), name.factor);
  return name;
}

/// A text of a list of levels: its length, its position in the file, and its characters.
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
    const std::string_view text = data.substr(at + kTextHeaderBytes, length);
    names.push_back({at, text.substr(0, text.find('\0'))});
    at += kTextHeaderBytes + length;
  }
  return names;
}

std::vector<HfaLevelName> ParseNames(std::string_view data) {
  std::vector<HfaLevelName> names;
  for (const ListText& entry : NamesIn(data))
    if (HfaNumberAt(data, entry.at) > 0) names.push_back(ParseName(entry.text));
  return names;
}

}  // namespace

bool HfaPyramid::NamesAnotherFileThan(const std::string& name) const {
  return std::any_of(channels.begin(), channels.end(), [&](const auto& levels) {
    return std::any_of(levels.begin(), levels.end(), [&](const HfaLevelName& level) {
      return !level.file.empty() && level.file != name;
    });
  });
}

int HfaPyramid::Find(unsigned channel, unsigned factor) const {
  if (channel < 1 || channel > channels.size()) return -1;
  const auto& levels = channels[channel - 1];
  const auto found = std::find_if(levels.begin(), levels.end(),
                                  [&](const HfaLevelName& l) { return l.factor == factor; });
  return found == levels.end() ? -1 : static_cast<int>(found - levels.begin());
}

std::vector<std::vector<HfaNode>> HfaItemListsOf(HfaTree& tree) {
  std::vector<std::vector<HfaNode>> lists;
  for (const HfaNode& table : tree.ChildrenOf(tree.Root()))
    if (table.name == "GDAL_MetaData" && table.type == "Edsc_Table")
      lists.push_back(tree.ChildrenOf(table));
  return lists;
}

bool IsHfaItem(const HfaNode& node, const std::string& key) {
  return node.name == key && node.type == "Edsc_Column";
}

std::optional<HfaItemPlace> FindHfaItem(const std::string& path, const std::string& key) {
  HfaTree tree(path);
  for (const std::vector<HfaNode>& columns : HfaItemListsOf(tree))
    for (const HfaNode& column : columns) {
      if (!IsHfaItem(column, key)) continue;
      const std::string data = tree.DataOf(column);  // rows, position, type of 2 bytes, length
      return HfaItemPlace{HfaNumberAt(data, 4), HfaNumberAt(data, 10)};
    }
  return std::nullopt;
}

std::vector<HfaLayer> HfaLayersOf(HfaTree& tree) {
  std::vector<HfaLayer> layers;
  for (const HfaNode& layer : tree.ChildrenOf(tree.Root()))
    if (layer.type == "Eimg_Layer") layers.push_back({layer, tree.ChildrenOf(layer)});
  return layers;
}

unsigned FactorOfHfaPart(const HfaNode& part) {
  return part.type == "Eimg_Layer_SubSample" ? ParseName("(:" + part.name).factor : 0;
}

bool IsHfaNameList(const HfaNode& part) { return part.type == "Eimg_RRDNamesList"; }

HfaPyramid ReadHfaPyramid(const std::string& path) {
  HfaTree tree(path);
  HfaPyramid pyramid;
  for (const HfaLayer& layer : HfaLayersOf(tree)) {
    std::vector<HfaLevelName> names, unlisted;
    for (const HfaNode& part : layer.parts) {
      if (IsHfaNameList(part)) names = ParseNames(tree.DataOf(part));
      if (part.type == "Eimg_Layer_SubSample") unlisted.push_back(ParseName("(:" + part.name));
      if (part.type == "ImgExternalRaster") pyramid.isSpilled = true;
    }
    // As the library does: without a list, what is there counts in the order of the nodes.
    pyramid.channels.push_back(std::move(names.empty() ? unlisted : names));
  }
  return pyramid;
}

std::vector<unsigned> FactorsInHfaList(const std::string& data) {
  std::vector<unsigned> factors;
  for (const HfaLevelName& name : ParseNames(data)) factors.push_back(name.factor);
  return factors;
}

HfaNameList NamesWithout(const std::string& data, const std::vector<unsigned>& factors) {
  HfaNameList list;
  std::string names;
  for (const ListText& entry : NamesIn(data)) {
    const unsigned factor = ParseName(entry.text).factor;
    if (std::find(factors.begin(), factors.end(), factor) != factors.end()) {
      list.isShorter = true;
      continue;
    }
    ++list.names;
    names += data.substr(entry.at, kTextHeaderBytes + HfaNumberAt(data, entry.at));
  }
  list.data = data;
  if (!list.isShorter) return list;
  const size_t count = kTextHeaderBytes + size_t{HfaNumberAt(data, 0)};
  PutHfaNumber(list.data, count, list.names);
  std::fill(list.data.begin() + std::ptrdiff_t(count + kTextHeaderBytes), list.data.end(), '\0');
  list.data.replace(count + kTextHeaderBytes, names.size(), names);
  return list;
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

std::string PlaceHfaNameList(std::string data, uint32_t position) {
  // What each leads to begins right behind it.
  for (const uint32_t at : PointersInHfaNameList(data)) PutHfaNumber(data, at, position + at + 4);
  return data;
}

}  // namespace orin::drivers
