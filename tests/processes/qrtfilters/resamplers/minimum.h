/// A method of the tests, written as docs/add-a-method.md says: the smallest of nine source pixels.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>

#include "processes/qrtfilters/resamplers/detail/checks.h"
#include "processes/qrtfilters/resamplers/detail/createkernel.h"
#include "processes/qrtfilters/resamplers/detail/neighbourhood.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"

namespace orin::resamplers {

template <class T>
struct MinimumMethod {
  static constexpr int kSpan = 3;
  static constexpr int kBefore = 1;
  using Sample = T;
  using Weights = detail::NoWeights;

  static detail::Place<Weights> Locate(const detail::AxisMapping& mapping, uint32_t i) {
    return {detail::ToInt32(std::floor(mapping.Anchor(i))), {}};
  }

  static T Blend(const std::array<T, 9>& samples, Weights, Weights) {
    return *std::min_element(samples.begin(), samples.end());
  }
};

template <class T>
class Minimum final : public Resampler {
 public:
  void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) override {
    detail::RequireMargin(*src, GetMargin(),
                          "Input rasters must have at least a one pixel margin.");
    detail::RequireSameChannels(*src, *dst);
    detail::ResampleNeighbourhoods<MinimumMethod<T>, T>(state_, *src, srcMask, *dst);
  }
  uint32_t GetMargin() override { return 1; }
};

class MinimumResamplerFactory final : public KernelFactory<Minimum> {};

}  // namespace orin::resamplers
