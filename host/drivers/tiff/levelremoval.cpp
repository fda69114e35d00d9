/// How levels get out of a file: their directories are taken out of the chain, and the space at the
/// end is given back.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <set>

#include "host/drivers/tiff/references.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/services/text.h"

namespace orin::drivers {
/// The directories of the levels and of their masks, ascending. Of levels that share a factor, the
/// one that is listed.
std::vector<size_t> TiffLevelStore::DirectoriesOf(const std::vector<unsigned>& levels) const {
  std::set<size_t> indices;
  for (const unsigned level : levels) {
    const StoredLevel* stored = Find(level);
    if (!stored) continue;
    indices.insert(stored->index);
    for (const size_t mask : catalogue_->MasksOf(stored->index)) indices.insert(mask);
  }
  return {indices.begin(), indices.end()};
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
  if (areThere) EndChange();
}

}  // namespace orin::drivers
