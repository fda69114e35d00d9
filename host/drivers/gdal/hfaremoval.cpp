// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfaremoval.h"

#include <algorithm>
#include <functional>

#include "host/drivers/gdal/hfarecord.h"
#include "host/drivers/gdal/hfaspace.h"
#include "host/drivers/gdal/hfatree.h"
#include "host/drivers/gdal/patchedfile.h"

namespace orin::drivers {
namespace {

void Point(PatchedFile& file, const HfaPointer& pointer) {
  std::string number(4, '\0');
  PutHfaNumber(number, 0, pointer.value);
  file.Write(pointer.position, number.data(), number.size());
}

/// Gives each list that names one of the levels new data without them, at the end of the file.
/// \returns where data is or was that nothing refers to when the list goes as well
ByteRanges ShortenLists(const std::string& path, const std::vector<unsigned>& factors) {
  PatchedFile file(path);
  HfaTree tree(file.LibraryName());
  ByteRanges bytes;
  for (const HfaLayer& layer : HfaLayersOf(tree))
    for (const HfaNode& part : layer.parts) {
      if (!IsHfaNameList(part)) continue;
      const HfaNameList list = NamesWithout(tree.DataOf(part), factors);
      if (!list.isShorter) continue;
      const auto position = static_cast<uint32_t>(file.Size());
      const std::string data = PlaceHfaNameList(list.data, position);
      file.Write(position, data.data(), data.size());
      Point(file, {part.position + kHfaDataAt, position});
      bytes.Add({part.data, uint64_t{part.data} + part.dataBytes});
      bytes.Add({position, position + data.size()});
    }
  file.RequireWritten();
  file.Commit();
  return bytes;
}

/// Takes nodes out of a list of children. \returns their bytes
ByteRanges TakeOut(PatchedFile& file, const std::string& path, const std::vector<HfaNode>& children,
                   const std::function<bool(const HfaNode&)>& goes) {
  ByteRanges bytes;
  for (const HfaPointer& pointer : PointersWithout(children, goes)) Point(file, pointer);
  for (const HfaNode& child : children)
    if (goes(child)) bytes.Add(HfaBytesOf(path, child));
  return bytes;
}

using Goes = std::function<bool(const HfaNode& part, const std::vector<unsigned>& listed)>;

/// Takes the parts of the channels that `goes` out of the tree. \returns their bytes
ByteRanges TakeOutParts(const std::string& path, const Goes& goes) {
  PatchedFile file(path);
  ByteRanges bytes;
  HfaTree tree(file.LibraryName());
  for (const HfaLayer& layer : HfaLayersOf(tree)) {
    std::vector<unsigned> listed;
    for (const HfaNode& part : layer.parts)
      if (IsHfaNameList(part)) listed = FactorsInHfaList(tree.DataOf(part));
    bytes.Add(
        TakeOut(file, path, layer.parts, [&](const HfaNode& part) { return goes(part, listed); }));
  }
  if (!file.Waiting().empty()) file.Commit();
  return bytes;
}

/// The last step: as long as a level's item is there, what is left of it is known to be ours.
ByteRanges TakeOutItems(const std::string& path, const std::vector<std::string>& items) {
  PatchedFile file(path);
  ByteRanges bytes;
  HfaTree tree(file.LibraryName());
  for (const std::vector<HfaNode>& list : HfaItemListsOf(tree))
    bytes.Add(TakeOut(file, path, list, [&](const HfaNode& node) {
      return std::any_of(items.begin(), items.end(),
                         [&](const std::string& key) { return IsHfaItem(node, key); });
    }));
  if (!file.Waiting().empty()) file.Commit();
  return bytes;
}

bool Holds(const std::vector<unsigned>& factors, unsigned factor) {
  return std::find(factors.begin(), factors.end(), factor) != factors.end();
}

}  // namespace

ByteRanges RemoveHfaLevels(const std::string& path, const std::vector<unsigned>& factors,
                           const std::vector<std::string>& items) {
  ByteRanges bytes = ShortenLists(path, factors);
  const auto goes = [&](const HfaNode& part, const std::vector<unsigned>& listed) {
    if (IsHfaNameList(part)) return listed.empty();
    const unsigned factor = FactorOfHfaPart(part);
    return factor != 0 && !Holds(listed, factor) && (Holds(factors, factor) || !listed.empty());
  };
  bytes.Add(TakeOutParts(path, goes));
  bytes.Add(TakeOutItems(path, items));
  return bytes;
}

void RemoveUnlistedHfaLevels(const std::string& path, unsigned factor) {
  const HfaPyramid pyramid = ReadHfaPyramid(path);
  const auto isListed = [&](unsigned level) {
    return std::any_of(pyramid.channels.begin(), pyramid.channels.end(), [&](const auto& names) {
      return std::any_of(names.begin(), names.end(),
                         [&](const HfaLevelName& name) { return name.factor == level; });
    });
  };
  std::vector<std::string> items;
  const auto goes = [&](const HfaNode& part, const std::vector<unsigned>& listed) {
    const unsigned level = FactorOfHfaPart(part);
    if (level == 0 || listed.empty() || Holds(listed, level)) return false;
    const std::string key = HfaRecordKey(level);
    if (level == factor) return true;
    if (!FindHfaItem(path, key)) return false;
    if (!isListed(level)) items.push_back(key);
    return true;
  };
  TakeOutParts(path, goes);
  TakeOutItems(path, items);
}

}  // namespace orin::drivers
