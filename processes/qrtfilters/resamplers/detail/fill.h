/// Writes the no-data value into destination pixels.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <vector>

#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/detail/parallelrows.h"

namespace orin::resamplers::detail {

/// False for a source without a single sample: all that can be written then is no data.
inline bool HasSamples(const gobs::RasterInfo& src) {
  return src.width != 0 && src.height != 0 && src.channelCount != 0;
}

/// Fills the useful area of `dst` with copies of `pixel`.
template <class T>
void FillBlock(const gobs::Raster& dst, const gobs::PixelView<T>& out,
               const std::vector<T>& pixel) {
  ParallelRows(dst.height, [&](uint32_t row) {
    T* at = out.At(0, row);
    for (uint32_t column = 0; column < dst.width; ++column)
      at = std::copy(pixel.begin(), pixel.end(), at);
  });
}

}  // namespace orin::resamplers::detail
