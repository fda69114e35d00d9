/// How many bytes a level takes in the file, before it is made.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "host/drivers/tiff/levelcoding.h"

namespace orin::drivers {

struct StoredSize {
  uint64_t expected = 0;  ///< bytes; exact without compression
  uint64_t most = 0;      ///< bytes; as good as never exceeded

  StoredSize& operator+=(const StoredSize& other);
};

/// The size of a level's tiles in `planes` of its planes, with its directory. No level is taken to
/// need more bytes than its image does in the same codec.
/// \param isBig  the file is a BigTIFF
StoredSize StoredSizeOf(const LevelCoding& level, uint32_t planes, bool isBig);

/// The most bytes of all that is usually built of an image: the pyramids of factor 2 and of 3.
/// \param level  the coding of one of the levels
uint64_t MostBytesOfPyramids(uint32_t imageWidth, uint32_t imageHeight, LevelCoding level);

/// The end of what a classic TIFF can address.
inline constexpr uint64_t kClassicBytes = 0xFFFFFFFF;

}  // namespace orin::drivers
