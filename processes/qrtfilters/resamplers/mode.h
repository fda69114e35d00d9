/// Mode: every destination pixel is the most frequent of nine source pixels around its position.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

namespace orin::resamplers {

/// Copies values, never blends them. Refuses complex data. T is one of the pixel types.
template <class T>
class Mode final : public Resampler {
 public:
  /// Where `srcMask` has the centre clear, every channel gets the no-data value; a clear neighbour
  /// votes for the centre's value.
  /// \throws orin::Exception  a margin of `src` is below 1, then the channel counts differ
  void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) override;
  uint32_t GetMargin() override { return 1; }
  /// \throws orin::Exception  `isComplex` is true; the state is unchanged
  void SetComplex(bool isComplex) override;
};

class ModeResamplerFactory final : public KernelFactory<Mode> {};

}  // namespace orin::resamplers
