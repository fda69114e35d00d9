// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/nearestneighbour.h"

#include "processes/qrtfilters/resamplers/detail/axismapping.h"
#include "processes/qrtfilters/resamplers/detail/checks.h"
#include "processes/qrtfilters/resamplers/detail/copypixels.h"
#include "processes/qrtfilters/resamplers/detail/fill.h"
#include "processes/qrtfilters/resamplers/detail/filledrun.h"
#include "processes/qrtfilters/resamplers/detail/instantiate.h"
#include "processes/qrtfilters/resamplers/detail/saturate.h"

namespace orin::resamplers {
namespace {

/// The source pixel of a mapped coordinate, 0 .. size - 1. Deliberate: the whole part is read as an
/// unsigned 32-bit number, so -1 and below end at the last pixel and 2^32 starts again at the
/// first. What no 64-bit integer holds reads the first pixel.
uint32_t SourceIndex(double coordinate, uint32_t size) {
  constexpr double kLimit = 9223372036854775808.0;
  const bool isWhole = coordinate > -kLimit && coordinate < kLimit;
  const auto index = isWhole ? static_cast<uint32_t>(static_cast<int64_t>(coordinate)) : 0u;
  return index < size ? index : size - 1;
}

Scratch<uint32_t> SourceIndices(const detail::AxisMapping& mapping, uint32_t dstSize,
                                uint32_t srcSize) {
  Scratch<uint32_t> indices(dstSize);
  for (uint32_t i = 0; i < dstSize; ++i) indices[i] = SourceIndex(mapping.Anchor(i), srcSize);
  return indices;
}

}  // namespace

template <class T>
void NearestNeighbour<T>::Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) {
  detail::RequireSameChannels(*src, *dst);
  const uint64_t components = uint64_t{src->channelCount} * (state_.isComplex ? 2 : 1);
  const Scratch<T> noData(components, detail::Saturate<T>(state_.noDataValue));
  gobs::Mask* const validity = detail::KeptValidity(*src, srcMask, *dst);
  if (!detail::HasData(*src, srcMask))
    return detail::FillBlock(*dst, gobs::ViewOf<T>(*dst, state_.isComplex ? 2 : 1), noData,
                             validity);
  const detail::SourceMapping mapping = detail::MappingOf(state_, *src, *dst);
  const uint64_t pixelBytes = components * sizeof(T);
  detail::CopyPixels({{src->data, gobs::LayoutOf(*src), pixelBytes},
                      {dst->data, gobs::LayoutOf(*dst), pixelBytes},
                      srcMask,
                      reinterpret_cast<const uint8_t*>(noData.data()),
                      validity,
                      SourceIndices(mapping.x, dst->width, src->width),
                      SourceIndices(mapping.y, dst->height, src->height)});
}

ORIN_INSTANTIATE_KERNEL(NearestNeighbour);

template <>
std::unique_ptr<IResamplerFactory> detail::NewFactory<ResampleNearest>() {
  return std::make_unique<NearestNeighbourResamplerFactory>();
}

}  // namespace orin::resamplers
