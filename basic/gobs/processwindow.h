/// Where a block lies in its raster.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace orin::parallelio {

/// Margin and position of a block; all in pixels.
struct ProcessWindow {
  uint32_t marginX = 0;  ///< on the left and on the right
  uint32_t marginY = 0;  ///< at the top and at the bottom
  uint32_t x = 0;        ///< column of the block's first pixel, margin not counted
  uint32_t y = 0;        ///< row of the block's first pixel, margin not counted

  friend bool operator==(const ProcessWindow&, const ProcessWindow&) = default;
};

}  // namespace orin::parallelio
