/// Nearest neighbour: every destination pixel is a copy of one source pixel.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

namespace orin::resamplers {

/// Takes real and complex data and needs no margin. T is one of the pixel types.
template <class T>
class NearestNeighbour final : public Resampler {
 public:
  /// A source pixel that `srcMask` has clear gives the no-data value in every component.
  /// \throws orin::Exception  the channel counts differ
  void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) override;
  uint32_t GetMargin() override { return 0; }
};

class NearestNeighbourResamplerFactory final : public KernelFactory<NearestNeighbour> {};

}  // namespace orin::resamplers
