/// Writes the no-data value into destination pixels.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/detail/parallelrows.h"

namespace orin::resamplers::detail {

/// False for a source without a single valid sample: all that can be written then is no data.
/// \param srcMask  null: every pixel is valid
inline bool HasData(const gobs::RasterInfo& src, const gobs::Mask* srcMask) {
  if (src.width == 0 || src.height == 0 || src.channelCount == 0) return false;
  return !srcMask || srcMask->Uniform() != false;
}

/// Fills the useful area of `dst` with copies of `pixel`, which are no data.
/// \param validity  of `dst`, where it is kept
template <class T>
void FillBlock(const gobs::Raster& dst, const gobs::PixelView<T>& out, const Scratch<T>& pixel,
               gobs::Mask* validity) {
  ParallelRows(dst.height, [&](uint32_t row) {
    if (validity) validity->ClearRun(0, row, dst.width);
    T* at = out.At(0, row);
    if (pixel.size() == 1) std::fill_n(at, dst.width, pixel.front());
    else
      for (uint32_t column = 0; column < dst.width; ++column)
        at = std::copy(pixel.begin(), pixel.end(), at);
  });
}

}  // namespace orin::resamplers::detail
