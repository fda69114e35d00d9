/// Pixels of one channel in memory, and their way into and out of blocks.
// SPDX-License-Identifier: MIT
#pragma once

#include <vector>

#include "basic/gobs/datatype.h"
#include "basic/gobs/raster.h"

namespace orin::drivers {

/// One channel of one level: rows from the top, samples without gaps; the bit type takes one byte a
/// sample, 0 or 1. The samples belong to someone else.
struct MemoryPlane {
  unsigned width;   ///< pixels
  unsigned height;  ///< pixels
  unsigned char* samples;
};

/// Bytes that one sample of this type takes in a plane.
inline uint64_t SampleBytes(const gobs::DataType& type) {
  return uint64_t{BytesPerComponent(type)} * ComponentsPerSample(type);
}

/// Fills the whole buffer of `block` from `planes`, one a channel: margins inside the raster with
/// the real neighbours, margins outside with the edge pixels. In a block of the bit type, channel c
/// of buffer pixel n is bit n * channels + c, most significant bit first.
/// \pre the useful area lies inside, and the planes hold samples of the block's type
void ReadPlanes(const std::vector<MemoryPlane>& planes, gobs::Raster& block);

/// Stores the useful area of `block` into `planes`, one a channel. \pre as `ReadPlanes`
void WritePlanes(const std::vector<MemoryPlane>& planes, const gobs::Raster& block);

}  // namespace orin::drivers
