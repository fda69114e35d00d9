// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfaremoval.h"

#include <algorithm>
#include <functional>

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
      bytes.Add(part.data, uint64_t{part.data} + part.dataBytes);
      bytes.Add(position, position + data.size());
    }
  file.RequireWritten();
  file.Commit();
  return bytes;
}

using Goes = std::function<bool(const HfaNode& part, const std::vector<unsigned>& listed)>;

/// Takes the parts of the channels that `goes` out of the tree, and the items.
/// \returns their bytes
ByteRanges TakeOut(const std::string& path, const Goes& goes,
                   const std::vector<std::string>& items) {
  PatchedFile file(path);
  ByteRanges bytes;
  HfaTree tree(file.LibraryName());
  for (const HfaLayer& layer : HfaLayersOf(tree)) {
    std::vector<unsigned> listed;
    for (const HfaNode& part : layer.parts)
      if (IsHfaNameList(part)) listed = FactorsInHfaList(tree.DataOf(part));
    const auto partGoes = [&](const HfaNode& part) { return goes(part, listed); };
    for (const HfaPointer& pointer : PointersWithout(layer.parts, partGoes)) Point(file, pointer);
    for (const HfaNode& part : layer.parts)
      if (partGoes(part)) bytes.Add(HfaBytesOf(path, part));
  }
  for (const HfaPointer& pointer : PointersWithoutItems(file.LibraryName(), items))
    Point(file, pointer);
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
  bytes.Add(TakeOut(path, goes, items));
  return bytes;
}

void RemoveUnlistedHfaLevel(const std::string& path, unsigned factor) {
  const auto goes = [&](const HfaNode& part, const std::vector<unsigned>& listed) {
    return FactorOfHfaPart(part) == factor && !listed.empty() && !Holds(listed, factor);
  };
  TakeOut(path, goes, {});
}

}  // namespace orin::drivers
