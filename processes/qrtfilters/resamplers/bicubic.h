/// Bicubic: every destination pixel lies on cubics through the 16 source pixels around its centre.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

namespace orin::resamplers {

/// The cubic goes through four equally spaced samples; it may overshoot them. Samples are narrowed
/// to single precision, whatever T. Refuses complex data. T is one of the pixel types.
template <class T>
class Bicubic final : public Resampler {
 public:
  /// Where `srcMask` has the pixel at or before the position clear, every channel gets the no-data
  /// value; for another one that is clear, that pixel stands in.
  /// \throws orin::Exception  a margin of `src` is below 3, then the channel counts differ
  void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) override;
  uint32_t GetMargin() override { return 3; }
  /// \throws orin::Exception  `isComplex` is true; the state is unchanged
  void SetComplex(bool isComplex) override;
};

class BicubicResamplerFactory final : public KernelFactory<Bicubic> {};

}  // namespace orin::resamplers
