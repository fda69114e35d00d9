// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfatree.h"

#include <algorithm>

namespace orin::drivers {

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

size_t HfaPyramid::CountOf(unsigned channel) const {
  return channel >= 1 && channel <= channels.size() ? channels[channel - 1].size() : 0;
}

bool IsHfaItemTable(const HfaNode& node) {
  return node.name == "GDAL_MetaData" && node.type == "Edsc_Table";
}

bool IsHfaItem(const HfaNode& node) { return node.type == "Edsc_Column"; }

std::map<std::string, HfaItemPlace> HfaItemsOf(HfaTree& tree) {
  std::map<std::string, HfaItemPlace> items;
  for (const HfaNode& table : tree.ChildrenOf(tree.Root())) {
    if (!IsHfaItemTable(table)) continue;
    for (const HfaNode& column : tree.ChildrenOf(table)) {
      if (!IsHfaItem(column)) continue;
      const std::string data = tree.DataOf(column);  // rows, position, type of 2 bytes, length
      items.try_emplace(column.name, HfaItemPlace{HfaNumberAt(data, 4), HfaNumberAt(data, 10)});
    }
  }
  return items;
}

std::optional<HfaItemPlace> FindHfaItem(const std::string& path, const std::string& key) {
  HfaTree tree(path);
  const auto items = HfaItemsOf(tree);
  const auto item = items.find(key);
  if (item == items.end()) return std::nullopt;
  return item->second;
}

bool IsHfaLayer(const HfaNode& node) { return node.type == "Eimg_Layer"; }

namespace {

uint64_t CountNodes(HfaTree& tree, const HfaNode& node, unsigned depth) {
  if (depth > kDeepestHfaNode) tree.Fail();
  uint64_t count = 1;
  for (const HfaNode& child : tree.ChildrenOf(node)) count += CountNodes(tree, child, depth + 1);
  return count;
}

}  // namespace

uint64_t CountHfaNodes(const std::string& path) {
  HfaTree tree(path);
  return CountNodes(tree, tree.Root(), 0);
}

std::vector<HfaLayer> HfaLayersOf(HfaTree& tree) {
  std::vector<HfaLayer> layers;
  for (const HfaNode& layer : tree.ChildrenOf(tree.Root()))
    if (IsHfaLayer(layer)) layers.push_back({layer, tree.ChildrenOf(layer)});
  return layers;
}

unsigned FactorOfHfaPart(const HfaNode& part) {
  return part.type == "Eimg_Layer_SubSample" ? ParseHfaLevelName("(:" + part.name).factor : 0;
}

bool IsHfaNameList(const HfaNode& part) { return part.type == "Eimg_RRDNamesList"; }

HfaPyramid ReadHfaPyramid(const std::string& path) {
  HfaTree tree(path);
  return HfaPyramidOf(tree);
}

HfaPyramid HfaPyramidOf(HfaTree& tree) {
  HfaPyramid pyramid;
  for (const HfaLayer& layer : HfaLayersOf(tree)) {
    std::vector<HfaLevelName> names, unlisted;
    for (const HfaNode& part : layer.parts) {
      if (IsHfaNameList(part)) names = HfaNameList(tree.DataOf(part)).Levels();
      if (part.type == "Eimg_Layer_SubSample")
        unlisted.push_back(ParseHfaLevelName("(:" + part.name));
      if (part.type == "ImgExternalRaster") pyramid.isSpilled = true;
    }
    // As the library does: without a list, what is there counts in the order of the nodes.
    pyramid.channels.push_back(std::move(names.empty() ? unlisted : names));
  }
  return pyramid;
}

}  // namespace orin::drivers
