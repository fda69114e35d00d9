/// The tiles of a level that are in the file but not yet in its directory.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "host/drivers/tiff/levelcoding.h"

namespace orin::drivers {

/// Where a tile is stored; both 0 for one that is left out.
struct TilePlace {
  uint64_t offset = 0;
  uint64_t count = 0;  ///< bytes
};

/// Tiles are numbered row by row, plane after plane.
class LevelBuild {
 public:
  /// \param firstEnd   where the file ended before the first tile
  LevelBuild(const LevelCoding& coding, uint64_t firstEnd);

  const LevelCoding& Coding() const { return coding_; }
  uint64_t FirstEnd() const { return firstEnd_; }

  void Record(uint64_t tile, TilePlace place);
  /// The tile is being written anew, and not complete until it is recorded again.
  void Forget(uint64_t tile);
  bool IsComplete(uint32_t plane) const { return written_[plane] == tilesPerPlane_; }
  /// True when there is nothing, or nothing but complete planes, the mask included.
  bool HasOnlyCompletePlanes() const;
  bool IsEmpty() const;
  /// The tiles of one plane. \pre IsComplete(plane)
  const TilePlace* PlacesOf(uint32_t plane) const { return &places_[plane * tilesPerPlane_]; }
  uint64_t TilesPerPlane() const { return tilesPerPlane_; }
  /// The plane's tiles are in the directory now.
  void Release(uint32_t plane);

  std::unique_ptr<LevelBuild> mask;  ///< tiles of the level's mask; null when it gets none
  int writers = 0;                   ///< writers at work
  bool isClosed = false;  ///< all is stored or given up: a writer that goes on starts another build

 private:
  LevelCoding coding_;
  uint64_t firstEnd_;
  uint64_t tilesPerPlane_;
  std::vector<TilePlace> places_;
  std::vector<bool> isWritten_;
  std::vector<uint64_t> written_;  // tiles, for each plane
};

}  // namespace orin::drivers
