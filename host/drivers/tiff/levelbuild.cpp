// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelbuild.h"

#include <algorithm>

namespace orin::drivers {

LevelBuild::LevelBuild(const LevelCoding& coding, uint64_t firstEnd)
    : coding_(coding),
      firstEnd_(firstEnd),
      tilesPerPlane_(coding.format.TilesPerPlane()),
      places_(tilesPerPlane_ * coding.Planes()),
      isWritten_(places_.size()),
      written_(coding.Planes()) {}

void LevelBuild::Record(uint64_t tile, TilePlace place) {
  places_[tile] = place;
  if (!isWritten_[tile]) ++written_[tile / tilesPerPlane_];
  isWritten_[tile] = true;
}

void LevelBuild::Forget(uint64_t tile) {
  if (isWritten_[tile]) --written_[tile / tilesPerPlane_];
  isWritten_[tile] = false;
}

bool LevelBuild::HasOnlyCompletePlanes() const {
  const bool isMaskComplete = !mask || mask->IsComplete(0);
  return isMaskComplete && std::all_of(written_.begin(), written_.end(), [this](uint64_t tiles) {
           return tiles == 0 || tiles == tilesPerPlane_;
         });
}

bool LevelBuild::IsEmpty() const {
  return std::all_of(written_.begin(), written_.end(), [](uint64_t tiles) { return tiles == 0; });
}

void LevelBuild::Release(uint32_t plane) {
  for (uint64_t tile = plane * tilesPerPlane_; tile < (plane + uint64_t{1}) * tilesPerPlane_;
       ++tile)
    Forget(tile);
}

}  // namespace orin::drivers
