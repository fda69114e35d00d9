/// The mean over each destination pixel's footprint, at any ratio.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>

#include "basic/gobs/mask/validity.h"
#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/detail/axismapping.h"
#include "processes/qrtfilters/resamplers/detail/fill.h"
#include "processes/qrtfilters/resamplers/detail/filledrun.h"
#include "processes/qrtfilters/resamplers/detail/parallelrows.h"
#include "processes/qrtfilters/resamplers/detail/saturate.h"

namespace orin::resamplers::detail {

/// The footprints of all destination columns or rows, cut to what the source's buffer holds. The
/// last buffer line is never read.
inline Scratch<Footprint> FootprintsOf(const AxisMapping& mapping, uint32_t dstSize,
                                       const BufferRange& range) {
  Scratch<Footprint> footprints(dstSize);
  for (uint32_t i = 0; i < dstSize; ++i) {
    const Footprint whole = mapping.Cover(i);
    footprints[i] = {std::max(whole.start, range.first), range.Clamp(whole.centre),
                     std::min(whole.end, range.last)};
  }
  return footprints;
}

/// The pixel that is written for no data. Deliberate: the value goes to as many components as there
/// are channels; the rest are 0.
template <class T>
Scratch<T> NoDataPixel(uint64_t channels, uint32_t componentsPerSample, double noData) {
  Scratch<T> pixel(channels * componentsPerSample);
  std::fill_n(pixel.begin(), channels, Saturate<T>(noData));
  return pixel;
}

/// One call of the general average. `Mean` is the mean of one channel.
template <template <class> class Mean, class T>
class AverageFootprintsPass {
 public:
  /// \param validity  of `dst`, where it is kept
  AverageFootprintsPass(const SourceMapping& mapping, const gobs::Raster& src,
                        const gobs::Raster& dst, double noData, gobs::Mask* validity)
      : src_(gobs::ViewOf<const T>(src, kComponents)),
        dst_(gobs::ViewOf<T>(dst, kComponents)),
        channels_(dst.channelCount),
        noData_(NoDataPixel<T>(channels_, kComponents, noData)),
        validity_(validity),
        lastSample_(src_.data + BufferSamples(src) - kComponents),
        columns_(FootprintsOf(mapping.x, dst.width, RangeOf(src.width, src.marginX))),
        rows_(FootprintsOf(mapping.y, dst.height, RangeOf(src.height, src.marginY))) {}

  template <class Valid>
  void RunRow(uint32_t row, const Valid& valid) const {
    FilledRun filled(validity_, row);
    T* out = dst_.At(0, row);
    for (const Footprint& column : columns_) {
      if (!WritePixel(out, column, rows_[row], valid)) filled.Add(&column - columns_.data());
      out += channels_ * kComponents;
    }
  }

 private:
  static constexpr uint32_t kComponents = Mean<T>::kComponents;

  static uint64_t BufferSamples(const gobs::Raster& src) {
    return uint64_t{src.stride} * src.bufferLines * src.channelCount * kComponents;
  }

  /// \returns false when the pixel is filled with no data
  template <class Valid>
  bool WritePixel(T* out, const Footprint& x, const Footprint& y, const Valid& valid) const {
    if (x.start >= x.end || y.start >= y.end || !valid(x.centre, y.centre)) {
      std::copy(noData_.begin(), noData_.end(), out);
      return false;
    }
    const auto count = static_cast<uint64_t>((x.end - x.start) * (y.end - y.start));
    for (uint64_t channel = 0; channel < channels_; ++channel)
      MeanOf(channel, x, y, valid).Store(out + channel * kComponents, count);
    return true;
  }

  /// Deliberate: a pixel without data is not dropped, the centre takes its place.
  template <class Valid>
  Mean<T> MeanOf(uint64_t channel, const Footprint& x, const Footprint& y,
                 const Valid& valid) const {
    const T* const centre = SampleAt(x.centre, y.centre, channel);
    Mean<T> mean;
    for (int64_t row = y.start; row < y.end; ++row)
      for (int64_t column = x.start; column < x.end; ++column)
        mean.Add(valid(column, row) ? SampleAt(column, row, channel) : centre);
    return mean;
  }

  /// A channel that the source does not have reads on in the buffer, up to its last sample.
  const T* SampleAt(int64_t x, int64_t y, uint64_t channel) const {
    return std::min(src_.At(x, y) + channel * kComponents, lastSample_);
  }

  gobs::PixelView<const T> src_;
  gobs::PixelView<T> dst_;
  uint64_t channels_;
  Scratch<T> noData_;
  gobs::Mask* validity_;
  const T* lastSample_;
  Scratch<Footprint> columns_;
  Scratch<Footprint> rows_;
};

/// Fills `dst`. \param srcMask  null: every pixel is valid
/// \pre  `src` has a margin
template <template <class> class Mean, class T>
void AverageFootprints(const SourceMapping& mapping, const gobs::Raster& src,
                       const gobs::Mask* srcMask, gobs::Raster& dst, double noData) {
  gobs::Mask* const validity = KeptValidity(src, srcMask, dst);
  constexpr uint32_t kComponents = Mean<T>::kComponents;
  if (!HasData(src, srcMask))
    return FillBlock(dst, gobs::ViewOf<T>(dst, kComponents),
                     NoDataPixel<T>(dst.channelCount, kComponents, noData), validity);
  const AverageFootprintsPass<Mean, T> pass(mapping, src, dst, noData, validity);
  gobs::WithValidity(srcMask, [&](const auto& valid) {
    ParallelRows(dst.height, [&](uint32_t row) { pass.RunRow(row, valid); });
  });
}

}  // namespace orin::resamplers::detail
