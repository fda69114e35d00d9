/// The mean of exact squares of a channel: reduction by 2 or 3.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstdint>

#include "basic/gobs/mask/validity.h"
#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/detail/axismapping.h"
#include "processes/qrtfilters/resamplers/detail/fill.h"
#include "processes/qrtfilters/resamplers/detail/filledrun.h"
#include "processes/qrtfilters/resamplers/detail/parallelrows.h"
#include "processes/qrtfilters/resamplers/detail/saturate.h"

namespace orin::resamplers::detail {

/// The valid samples that a square must have; one with fewer becomes no data.
constexpr uint64_t RequiredSamples(int factor) { return factor == 2 ? 2 : 5; }

/// One call of the reduction. `Mean` is the mean of one channel.
template <template <class> class Mean, int kFactor, class T>
class AverageExactPass {
 public:
  /// \param validity  of `dst`, where it is kept
  AverageExactPass(const gobs::Raster& src, const gobs::Raster& dst, double noData,
                   gobs::Mask* validity)
      : src_(gobs::ViewOf<const T>(src, kComponents)),
        dst_(gobs::ViewOf<T>(dst, kComponents)),
        width_(dst.width),
        columns_(RangeOf(src.width, src.marginX)),
        lastRow_(int64_t{src.height} - 1),
        noData_{Saturate<T>(noData)},
        validity_(validity) {}

  template <class Valid>
  void RunRow(uint32_t row, const Valid& valid) const {
    FilledRun filled(validity_, row);
    std::array<int64_t, kFactor> rows;
    for (int k = 0; k < kFactor; ++k) rows[k] = std::min(int64_t{row} * kFactor + k, lastRow_);
    // Columns below `inside` need no clamp.
    const int64_t inside = std::min<int64_t>(width_, (columns_.last + 1) / kFactor);
    T* out = dst_.At(0, row);
    for (int64_t column = 0; column < inside; ++column, out += kComponents)
      WritePixel(out, column, rows, valid, filled, [](int64_t x) { return x; });
    for (int64_t column = inside; column < width_; ++column, out += kComponents)
      WritePixel(out, column, rows, valid, filled, [this](int64_t x) { return columns_.Clamp(x); });
  }

 private:
  static constexpr uint32_t kComponents = Mean<T>::kComponents;

  template <class Valid, class Clamp>
  void WritePixel(T* out, int64_t column, const std::array<int64_t, kFactor>& rows,
                  const Valid& valid, FilledRun& filled, const Clamp& clamp) const {
    Mean<T> mean;
    uint64_t count = 0;
    for (int j = 0; j < kFactor; ++j)
      for (int i = 0; i < kFactor; ++i) {
        const int64_t x = clamp(column * kFactor + i);
        if (!valid(x, rows[j])) continue;
        mean.Add(src_.At(x, rows[j]));
        ++count;
      }
    if (count >= RequiredSamples(kFactor)) return mean.Store(out, count);
    std::copy(noData_.begin(), noData_.end(), out);
    filled.Add(column);
  }

  gobs::PixelView<const T> src_;
  gobs::PixelView<T> dst_;
  int64_t width_;
  BufferRange columns_;
  int64_t lastRow_;
  std::array<T, kComponents> noData_;  ///< deliberate: the imaginary component of no data is 0
  gobs::Mask* validity_;
};

/// Reduces channel 0 of `src` into the one channel of `dst`. Rows past the last one repeat it;
/// columns past the last one read the margin. \param srcMask  null: every pixel is valid
template <template <class> class Mean, int kFactor, class T>
void AverageExact(const gobs::Raster& src, const gobs::Mask* srcMask, gobs::Raster& dst,
                  double noData) {
  gobs::Mask* const validity = KeptValidity(src, srcMask, dst);
  if (!HasData(src, srcMask)) {
    Scratch<T> pixel(Mean<T>::kComponents);
    pixel[0] = Saturate<T>(noData);
    return FillBlock(dst, gobs::ViewOf<T>(dst, Mean<T>::kComponents), pixel, validity);
  }
  const AverageExactPass<Mean, kFactor, T> pass(src, dst, noData, validity);
  gobs::WithValidity(srcMask, [&](const auto& valid) {
    ParallelRows(dst.height, [&](uint32_t row) { pass.RunRow(row, valid); });
  });
}

}  // namespace orin::resamplers::detail
