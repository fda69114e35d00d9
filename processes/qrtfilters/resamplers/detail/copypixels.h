/// Copies whole pixels from chosen source columns and rows, whatever their type.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"

namespace orin::resamplers::detail {

/// One block to fill: destination pixel (i, j) is a copy of source pixel (columns[i], rows[j]).
struct PixelCopy {
  gobs::PixelView<const uint8_t>
      src;  ///< `components` is the size of a pixel in bytes, as in `dst`
  gobs::PixelView<uint8_t> dst;
  const gobs::Mask* srcMask;  ///< null: every pixel is valid
  const uint8_t* noData;      ///< the pixel that is written where `srcMask` is clear
  gobs::Mask* dstValidity;    ///< receives where that is; null: not kept
  Scratch<uint32_t> columns;  ///< inside the source's useful area, one for each destination column
  Scratch<uint32_t> rows;     ///< likewise
};

void CopyPixels(const PixelCopy& job);

}  // namespace orin::resamplers::detail
