// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/bicubic.h"

#include "processes/qrtfilters/resamplers/detail/checks.h"
#include "processes/qrtfilters/resamplers/detail/instantiate.h"
#include "processes/qrtfilters/resamplers/detail/neighbourhood.h"

namespace orin::resamplers {
namespace {

/// A position between the second and the third of four samples, and its powers.
struct Powers {
  double t;
  double t2;
  double t3;
};

/// The cubic through q0 .. q3, which stand at -1, 0, 1 and 2, at the position `at`. Differences are
/// taken in the samples' own precision, all else in double. The order of the operations decides the
/// last bit.
template <class Real>
double Cubic(Real q0, Real q1, Real q2, Real q3, const Powers& at) {
  const double d0 = static_cast<Real>(q0 - q1);
  const double d2 = static_cast<Real>(q2 - q1);
  const double d3 = static_cast<Real>(q3 - q1);
  return (d2 - d0 / 3 - d3 / 6) * at.t + q1 + (d0 / 2 + d2 / 2) * at.t2 +
         (d3 / 6 - (d0 / 6 + d2 / 2)) * at.t3;
}

template <class T>
struct BicubicMethod {
  static constexpr int kSpan = 4;
  static constexpr int kBefore = 1;
  using Sample = float;  // deliberate: for every pixel type
  using Weights = Powers;

  static detail::Place<Weights> Locate(const detail::AxisMapping& mapping, uint32_t i) {
    const auto [at, t] = detail::LocateBetween(mapping, i);
    return {at, {t, t * t, t * t * t}};
  }

  static T Blend(const std::array<float, 16>& a, const Powers& x, const Powers& y) {
    std::array<double, 4> g;
    for (size_t j = 0; j < 4; ++j) g[j] = Cubic(a[j], a[4 + j], a[8 + j], a[12 + j], x);
    return detail::Saturate<T>(Cubic(g[0], g[1], g[2], g[3], y));
  }
};

}  // namespace

template <class T>
void Bicubic<T>::Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) {
  detail::RequireMargin(*src, GetMargin(),
                        N_("Input rasters must have at least a 3 pixels margin."));
  detail::RequireSameChannels(*src, *dst);
  detail::ResampleNeighbourhoods<BicubicMethod<T>, T>(state_, *src, srcMask, *dst);
}

template <class T>
void Bicubic<T>::SetComplex(bool isComplex) {
  if (isComplex)
    throw Exception(N_("complex data not supported for this resampling method."),
                    "processes/qrtfilters/resamplers/bicubic",
                    detail::SignatureOf<T>("Bicubic", "SetComplex(bool)"), 238);
}

ORIN_INSTANTIATE_KERNEL(Bicubic);

template <>
std::unique_ptr<IResamplerFactory> detail::NewFactory<ResampleBicubic>() {
  return std::make_unique<BicubicResamplerFactory>();
}

}  // namespace orin::resamplers
