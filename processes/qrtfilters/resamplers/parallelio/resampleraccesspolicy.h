/// Maps an output block to the source block that it is computed from.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "basic/gobs/processwindow.h"
#include "basic/gobs/raster.h"

namespace orin::parallelio {

class ResamplerAccessPolicy {
 public:
  virtual ~ResamplerAccessPolicy() = default;

  /// The source block of an output block at `window`: position and size divided by the ratio and
  /// truncated, cut at the source's right and bottom edge; channels and type are the output's.
  /// \param position  receives the block's place in the source, the margins of `window` unchanged
  gobs::RasterInfo InputOf(const gobs::RasterInfo& output, const ProcessWindow& window,
                           ProcessWindow& position) const;

  double xRatio = 1.0;  ///< output size / input size
  double yRatio = 1.0;
  uint32_t sourceWidth = 0;  ///< pixels; filled by the block planning
  uint32_t sourceHeight = 0;
};

}  // namespace orin::parallelio
