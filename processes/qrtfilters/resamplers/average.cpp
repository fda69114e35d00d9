// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/average.h"

#include "processes/qrtfilters/resamplers/detail/averageexact.h"
#include "processes/qrtfilters/resamplers/detail/averagefootprints.h"
#include "processes/qrtfilters/resamplers/detail/axismapping.h"
#include "processes/qrtfilters/resamplers/detail/checks.h"
#include "processes/qrtfilters/resamplers/detail/instantiate.h"
#include "processes/qrtfilters/resamplers/detail/mean.h"

namespace orin::resamplers {
namespace {

/// The factor of the exact reduction that serves this call: 2, 3, or 0 when none does. Deliberate:
/// ground coordinates are asked by the size of a pixel, so that they get here for an enlargement.
int ExactFactor(const detail::SourceMapping& mapping, const gobs::Raster& dst) {
  if (dst.channelCount != 1 || mapping.x.ratio != mapping.y.ratio) return 0;
  if (mapping.x.ratio == 0.5) return 2;
  return mapping.x.ratio == 1.0 / 3 ? 3 : 0;
}

}  // namespace

template <class T>
void Average<T>::Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) {
  using detail::AverageExact, detail::ComplexMean, detail::RealMean;
  const detail::SourceMapping mapping = detail::MappingOf(state_, *src, *dst);
  const int factor = ExactFactor(mapping, *dst);
  if (factor == 0)
    return ResampleGeneral(src, srcMask, dst, mapping.x.ratio, mapping.y.ratio, mapping.x.offset,
                           mapping.y.offset);
  const auto byTwo =
      state_.isComplex ? &AverageExact<ComplexMean, 2, T> : &AverageExact<RealMean, 2, T>;
  const auto byThree =
      state_.isComplex ? &AverageExact<ComplexMean, 3, T> : &AverageExact<RealMean, 3, T>;
  (factor == 2 ? byTwo : byThree)(*src, srcMask, *dst, state_.noDataValue);
}

template <class T>
void Average<T>::ResampleGeneral(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst,
                                 double ratioX, double ratioY, double offsetX, double offsetY) {
  if (src->marginX < 1 || src->marginY < 1)
    throw Exception(
        N_("You need a 1 pixel margin to process average resampling."),
        "processes/qrtfilters/resamplers/average",
        detail::SignatureOf<T>("Average",
                               "ResampleGeneral(orin::gobs::Raster*, orin::gobs::Mask*, "
                               "orin::gobs::Raster*, double, double, double, double)"),
        133);
  const detail::SourceMapping mapping{
      {state_.georeferenced, ratioX, offsetX, state_.dstPixelSizeX, state_.srcPixelSizeX},
      {state_.georeferenced, ratioY, offsetY, state_.dstPixelSizeY, state_.srcPixelSizeY}};
  const auto run = state_.isComplex ? &detail::AverageFootprints<detail::ComplexMean, T>
                                    : &detail::AverageFootprints<detail::RealMean, T>;
  run(mapping, *src, srcMask, *dst, state_.noDataValue);
}

ORIN_INSTANTIATE_KERNEL(Average);

template <>
std::unique_ptr<IResamplerFactory> detail::NewFactory<ResampleAverage>() {
  return std::make_unique<AverageResamplerFactory>();
}

}  // namespace orin::resamplers
