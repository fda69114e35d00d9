/// Average: every destination pixel is the mean of the source pixels that it covers.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

namespace orin::resamplers {

/// Takes real and complex data; a complex mean points along the samples' sum and has their mean
/// magnitude. T is one of the pixel types. The destination's channel count decides how many
/// channels are written; it is not compared with the source's.
template <class T>
class Average final : public Resampler {
 public:
  /// One channel at a ratio of exactly 1/2 or 1/3 is reduced without a margin, ignores pixels that
  /// `srcMask` has clear, and gives no data where fewer than 2 of 4 or 5 of 9 are left. All else is
  /// `ResampleGeneral`.
  /// \throws orin::Exception  as `ResampleGeneral`
  void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) override;

  /// Any ratio and any number of channels. Where `srcMask` has the footprint's centre clear, or the
  /// footprint is empty, the pixel gets the no-data value; for another pixel that is clear, the
  /// centre stands in.
  /// \param ratioX, ratioY    destination size / source size; not read when georeferenced
  /// \param offsetX, offsetY  destination origin - source origin, ground units; only then read
  /// \throws orin::Exception  `src` has no margin
  void ResampleGeneral(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst, double ratioX,
                       double ratioY, double offsetX, double offsetY);

  uint32_t GetMargin() override { return 1; }
};

class AverageResamplerFactory final : public KernelFactory<Average> {};

}  // namespace orin::resamplers
