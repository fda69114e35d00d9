/// The interface of a resampling method over one pixel type.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"

namespace orin {

/// Turns source blocks into destination blocks of the same pixel type and channel count. Create,
/// then `SetRatio`, `SetNoDataValue`, `SetComplex`, then `Resample` for each block.
class IRasterResampler {
 public:
  /// Resamples `src` into `dst`.
  /// \param srcMask  validity of `src`, same geometry and margins; null: every pixel is valid.
  ///                 Not kept.
  /// A method that knows where it wrote the no-data value may attach that to `dst` as its validity
  /// where there is a mask and `src` carries a validity.
  /// \throws orin::Exception  what the method cannot take; `dst` is untouched
  virtual void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) = 0;
  /// Pixels that the method reads around the source block, on every side.
  virtual uint32_t GetMargin() = 0;
  /// Scale factors, destination size over source size; kept until `ClearRatio`.
  virtual void SetRatio(double ratioX, double ratioY) = 0;
  /// Whether every sample has two components. \throws orin::Exception  the method refuses complex
  /// data
  virtual void SetComplex(bool isComplex) = 0;
  /// Maps by ground coordinates from now on, whatever the ratio: origins are the ground position of
  /// the blocks' top-left corners, sizes the ground extent of a pixel.
  virtual void SetGeoReference(double srcOriginX, double srcOriginY, double srcPixelSizeX,
                               double srcPixelSizeY, double dstOriginX, double dstOriginY,
                               double dstPixelSizeX, double dstPixelSizeY) = 0;
  /// The blocks' sizes decide the ratio again.
  virtual void ClearRatio() = 0;
  /// The value of destination pixels that have no valid source.
  virtual void SetNoDataValue(double value) = 0;
  virtual ~IRasterResampler() = default;
};

}  // namespace orin
