// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/bilinear.h"

#include "processes/qrtfilters/resamplers/detail/checks.h"
#include "processes/qrtfilters/resamplers/detail/instantiate.h"
#include "processes/qrtfilters/resamplers/detail/neighbourhood.h"

namespace orin::resamplers {
namespace {

template <class T>
struct BilinearMethod {
  static constexpr int kSpan = 2;
  static constexpr int kBefore = 0;
  using Sample = double;
  struct Weights {
    double before;  ///< of the pixel at or before the position
    double after;   ///< of the pixel after it
  };

  static detail::Place<Weights> Locate(const detail::AxisMapping& mapping, uint32_t i) {
    const detail::Between place = detail::LocateBetween(mapping, i);
    return {place.at, {1 - place.fraction, place.fraction}};
  }

  /// The order of the operations decides the last bit: products go left to right, and so does the
  /// sum.
  static T Blend(const std::array<double, 4>& samples, const Weights& x, const Weights& y) {
    const auto& [upperLeft, lowerLeft, upperRight, lowerRight] = samples;
    return detail::Saturate<T>(upperLeft * x.before * y.before + upperRight * x.after * y.before +
                               lowerLeft * x.before * y.after + lowerRight * x.after * y.after);
  }
};

}  // namespace

template <class T>
void Bilinear<T>::Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) {
  detail::RequireMargin(*src, 1, N_("Input rasters must have at least a one pixel margin."));
  detail::RequireSameChannels(*src, *dst);
  detail::ResampleNeighbourhoods<BilinearMethod<T>, T>(state_, *src, srcMask, *dst);
}

template <class T>
void Bilinear<T>::SetComplex(bool isComplex) {
  if (isComplex)  // deliberate: the wording is this method's own
    throw Exception(N_("Complex data is not supported for this resampling method"),
                    "processes/qrtfilters/resamplers/bilinear",
                    detail::SignatureOf<T>("Bilinear", "SetComplex(bool)"), 208);
}

ORIN_INSTANTIATE_KERNEL(Bilinear);

template <>
std::unique_ptr<IResamplerFactory> detail::NewFactory<ResampleBilinear>() {
  return std::make_unique<BilinearResamplerFactory>();
}

}  // namespace orin::resamplers
