// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/mode.h"

#include <cmath>
#include <limits>
#include <type_traits>

#include "processes/qrtfilters/resamplers/detail/checks.h"
#include "processes/qrtfilters/resamplers/detail/instantiate.h"
#include "processes/qrtfilters/resamplers/detail/neighbourhood.h"

namespace orin::resamplers {
namespace {

/// Deliberate: floats are equal within one fixed tolerance whatever their size, and NaN and
/// infinities equal nothing, themselves included.
template <class T>
bool SameValue(T a, T b) {
  if constexpr (std::is_floating_point_v<T>)
    return std::abs(static_cast<double>(a) - static_cast<double>(b)) <
           std::numeric_limits<double>::epsilon();
  else return a == b;
}

template <class T>
struct ModeMethod {
  static constexpr int kSpan = 3;
  static constexpr int kBefore = 1;
  using Sample = T;
  using Weights = detail::NoWeights;

  static detail::Place<Weights> Locate(const detail::AxisMapping& mapping, uint32_t i) {
    const double anchor = mapping.Anchor(i);
    // Deliberate: ground coordinates are truncated, those by ratio rounded down.
    return {detail::ToInt32(mapping.georeferenced ? anchor : std::floor(anchor)), {}};
  }

  /// Among the values met most often, the one met first.
  static T Blend(const std::array<T, 9>& samples, Weights, Weights) {
    int best = 0;
    int bestCount = 0;
    for (int j = 0; j < 9; ++j) {
      int count = 0;
      for (int i = 0; i < 9; ++i) count += SameValue(samples[i], samples[j]) ? 1 : 0;
      if (count > bestCount) {
        best = j;
        bestCount = count;
      }
    }
    return samples[best];
  }
};

}  // namespace

template <class T>
void Mode<T>::Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) {
  detail::RequireMargin(*src, GetMargin(),
                        N_("Input rasters must have at least a one pixel margin."));
  detail::RequireSameChannels(*src, *dst);
  detail::ResampleNeighbourhoods<ModeMethod<T>, T>(state_, *src, srcMask, *dst);
}

template <class T>
void Mode<T>::SetComplex(bool isComplex) {
  if (isComplex)
    throw Exception(N_("complex data not supported for this resampling method."),
                    "processes/qrtfilters/resamplers/mode",
                    detail::SignatureOf<T>("Mode", "SetComplex(bool)"), 218);
}

ORIN_INSTANTIATE_KERNEL(Mode);

template <>
std::unique_ptr<IResamplerFactory> detail::NewFactory<ResampleMode>() {
  return std::make_unique<ModeResamplerFactory>();
}

}  // namespace orin::resamplers
