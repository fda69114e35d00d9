/// How many bytes a level takes in the file at most, before it is made.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "host/drivers/tiff/levelcoding.h"

namespace orin::drivers {

/// The most bytes that a level's tiles take in `planes` of its planes, with its directory; exact
/// without compression. A level's samples may compress worse than its image's: one value in four of
/// a smooth image is less smooth, a mean of whole numbers is none, and a level of an image with
/// loss may be stored without.
/// \param isBig  the file is a BigTIFF
uint64_t MostBytesOf(const LevelCoding& level, uint32_t planes, bool isBig);

/// The most bytes of all that is usually built of an image: the pyramids of factor 2 and of 3.
/// \param level  the coding of one of the levels
uint64_t MostBytesOfPyramids(uint32_t imageWidth, uint32_t imageHeight, LevelCoding level);

/// The end of what a classic TIFF can address.
inline constexpr uint64_t kClassicBytes = 0xFFFFFFFF;

}  // namespace orin::drivers
