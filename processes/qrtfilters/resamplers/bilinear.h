/// Bilinear: every destination pixel is interpolated between the four source pixels at its centre.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

namespace orin::resamplers {

/// Refuses complex data. T is one of the pixel types.
template <class T>
class Bilinear final : public Resampler {
 public:
  /// Where `srcMask` has the upper left of the four clear, every channel gets the no-data value;
  /// for another one that is clear, the upper left stands in.
  /// \throws orin::Exception  a margin of `src` is below 1, then the channel counts differ
  void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) override;
  uint32_t GetMargin() override { return 1; }
  /// \throws orin::Exception  `isComplex` is true; the state is unchanged
  void SetComplex(bool isComplex) override;
};

class BilinearResamplerFactory final : public KernelFactory<Bilinear> {};

}  // namespace orin::resamplers
