// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/references.h"

#include <algorithm>
#include <array>
#include <set>
#include <utility>
#include <vector>

#include <tiff.h>

namespace orin::drivers {
namespace {

constexpr std::array<uint16_t, 4> kDirectoryTags = {TIFFTAG_SUBIFD, TIFFTAG_EXIFIFD, TIFFTAG_GPSIFD,
                                                    40965};  // the last one: interoperability
constexpr std::array<std::pair<uint16_t, uint16_t>, 4> kPixelTags = {
    {{TIFFTAG_STRIPOFFSETS, TIFFTAG_STRIPBYTECOUNTS},
     {TIFFTAG_TILEOFFSETS, TIFFTAG_TILEBYTECOUNTS},
     {TIFFTAG_JPEGIFOFFSET, TIFFTAG_JPEGIFBYTECOUNT},
     {TIFFTAG_FREEOFFSETS, TIFFTAG_FREEBYTECOUNTS}}};

/// Walks through directories, each once.
class Walk {
 public:
  Walk(const PositionedFile& file, const TiffStructure& structure)
      : file_(file), structure_(structure) {}

  void Add(const TiffDirectory& directory);
  References& Found() { return found_; }

 private:
  std::vector<uint64_t> NumbersOf(const TiffEntry& entry);
  void AddPixels(const TiffDirectory& directory, uint16_t offsetsTag, uint16_t countsTag);
  void AddInner(const TiffEntry& entry);

  const PositionedFile& file_;
  const TiffStructure& structure_;
  References found_;
  std::set<uint64_t> seen_;   // offsets of directories
  uint64_t numbersRead_ = 0;  // directories that share a table cost as much as if each had its own
};

std::vector<uint64_t> Walk::NumbersOf(const TiffEntry& entry) {
  constexpr uint64_t kMostNumbers = uint64_t{1} << 27;
  numbersRead_ += entry.count;
  if (numbersRead_ > kMostNumbers) found_.areAllKnown = false;
  return found_.areAllKnown ? ReadNumbers(file_, structure_, entry) : std::vector<uint64_t>();
}

void Walk::AddPixels(const TiffDirectory& directory, uint16_t offsetsTag, uint16_t countsTag) {
  const TiffEntry* offsets = directory.Find(offsetsTag);
  if (!offsets) return;
  const TiffEntry* counts = directory.Find(countsTag);
  const std::vector<uint64_t> starts = NumbersOf(*offsets);
  const std::vector<uint64_t> sizes = counts ? NumbersOf(*counts) : std::vector<uint64_t>();
  if (starts.size() != sizes.size()) found_.areAllKnown = false;  // a reader guesses the sizes
  const uint64_t fileSize = file_.Size();
  for (size_t i = 0; i < std::min(starts.size(), sizes.size()); ++i)
    if (starts[i] < fileSize)
      found_.extents.Add({starts[i], starts[i] + std::min(sizes[i], fileSize - starts[i])});
}

void Walk::AddInner(const TiffEntry& entry) {
  const bool isDirectory =
      std::find(kDirectoryTags.begin(), kDirectoryTags.end(), entry.tag) != kDirectoryTags.end() ||
      entry.type == TIFF_IFD || entry.type == TIFF_IFD8;
  if (!isDirectory) return;
  constexpr int kMostInChain = 1000;
  for (uint64_t offset : NumbersOf(entry))
    for (int i = 0; offset != 0 && !seen_.contains(offset); ++i) {
      const auto inner = ReadDirectoryAt(file_, structure_, offset);
      if (!inner || i == kMostInChain) {
        found_.areAllKnown = false;
        break;
      }
      Add(*inner);
      offset = inner->next;
    }
}

void Walk::Add(const TiffDirectory& directory) {
  if (!seen_.insert(directory.offset).second) return;
  found_.extents.Add({directory.offset, directory.linkPosition + structure_.LinkBytes()});
  for (const TiffEntry& entry : directory.entries)
    found_.extents.Add({entry.position, entry.position + entry.bytes});
  for (const auto& [offsets, counts] : kPixelTags) AddPixels(directory, offsets, counts);
  for (const TiffEntry& entry : directory.entries) AddInner(entry);
}

}  // namespace

References ReferencesIn(const PositionedFile& file, const TiffStructure& structure) {
  Walk walk(file, structure);
  walk.Found().extents.Add({0, structure.HeaderBytes()});
  walk.Found().areAllKnown = !structure.isBroken;
  for (const TiffDirectory& directory : structure.directories) walk.Add(directory);
  return walk.Found();
}

References ReferencesOf(const PositionedFile& file, const TiffStructure& structure,
                        const TiffDirectory& directory) {
  Walk walk(file, structure);
  walk.Add(directory);
  return walk.Found();
}

}  // namespace orin::drivers
