/// How levels get out of a file: their directories are taken out of the chain, and the space at the
/// end is given back.
// SPDX-License-Identifier: MIT
#include <algorithm>

#include "host/drivers/tiff/references.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// True for the mask of a level: of its size, and inside an image's file reduced as well. The first
/// mask of a side-car is not.
bool IsMaskOf(const LevelFile& file, size_t index, const PixelFormat& level, bool isInImage) {
  const TiffDirectory& directory = file.Structure().directories[index];
  const auto number = [&](uint16_t tag) {
    return NumberOf(file.File(), file.Structure(), directory, tag, 0);
  };
  const uint64_t kind = number(TIFFTAG_SUBFILETYPE);
  return (kind & FILETYPE_MASK) != 0 && (!isInImage || (kind & FILETYPE_REDUCEDIMAGE) != 0) &&
         number(TIFFTAG_IMAGEWIDTH) == level.width && number(TIFFTAG_IMAGELENGTH) == level.height;
}

}  // namespace

/// The directories of the levels and of their masks, ascending.
std::vector<size_t> TiffLevelStore::DirectoriesOf(const std::vector<unsigned>& levels) const {
  std::vector<size_t> indices;
  for (const StoredLevel& stored : levels_) {
    if (std::find(levels.begin(), levels.end(), stored.level) == levels.end()) continue;
    indices.push_back(stored.index);
    const bool isLastOfSize = std::none_of(levels_.begin(), levels_.end(), [&](const auto& other) {
      return other.format.width == stored.format.width &&
             other.format.height == stored.format.height &&
             std::find(levels.begin(), levels.end(), other.level) == levels.end();
    });
    for (size_t i = 0; i < file_->Structure().directories.size() && isLastOfSize; ++i)
      if (IsMaskOf(*file_, i, stored.format, settings_.image.isInFile)) indices.push_back(i);
  }
  std::sort(indices.begin(), indices.end());
  indices.erase(std::unique(indices.begin(), indices.end()), indices.end());
  return indices;
}

/// Takes directories out of the chain, by one link for those that follow one another. The last ones
/// go first, so that every state between has all the others.
void TiffLevelStore::Unlink(const std::vector<size_t>& indices) {
  const TiffStructure& structure = file_->Structure();
  for (size_t last = indices.size(); last > 0;) {
    size_t first = last - 1;
    while (first > 0 && indices[first - 1] + 1 == indices[first]) --first;
    file_->Relink(PlaceOf(structure, indices[first]).linkPosition,
                  structure.directories[indices[last - 1]].next);
    last = first;
  }
}

void TiffLevelStore::RemoveStored(const std::vector<unsigned>& levels) {
  CatchUp();
  const std::vector<size_t> indices = DirectoriesOf(levels);
  if (indices.empty()) return;
  const TiffStructure& structure = file_->Structure();
  if (indices.size() == structure.directories.size()) {
    file_->Delete();
    return;
  }
  ByteRanges given;
  for (const size_t index : indices)
    for (const auto& [start, end] :
         ReferencesOf(file_->File(), structure, structure.directories[index]).extents)
      given.Add({start, end});
  Unlink(indices);
  file_->CutOff(given);
  file_->Refresh();
  TidyMasks(std::nullopt);
}

void TiffLevelStore::Remove(const std::vector<unsigned>& levels) {
  const std::lock_guard lock(mutex_);
  const bool areThere = std::any_of(levels.begin(), levels.end(),
                                    [this](unsigned level) { return Find(level) != nullptr; });
  if (areThere) RemoveStored(levels);
  else PrepareToReclaim();
  if (!file_->Exists()) file_->DeleteUnfinished();
  Reload();
  if (areThere) Settle();
}

}  // namespace orin::drivers
