/// The one addressing rule of raster and mask buffers.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace orin::gobs {

/// Where the useful area lies in a buffer; all in pixels.
struct BufferLayout {
  uint64_t marginX = 0;
  uint64_t marginY = 0;
  uint64_t stride = 0;  ///< pixels per buffer line, margins included

  /// Index of the pixel (x, y) of the useful area; negative and overhanging coordinates reach the
  /// margin.
  constexpr uint64_t Index(int64_t x, int64_t y) const {
    return (marginY + static_cast<uint64_t>(y)) * stride + marginX + static_cast<uint64_t>(x);
  }
};

/// Layout of a raster or a mask: anything with `marginX`, `marginY` and `stride`.
template <class Buffer>
constexpr BufferLayout LayoutOf(const Buffer& buffer) {
  return {buffer.marginX, buffer.marginY, buffer.stride};
}

}  // namespace orin::gobs
