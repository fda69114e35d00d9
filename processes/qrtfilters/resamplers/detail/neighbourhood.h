/// Runs a method that makes each pixel from a square of source pixels round the mapped position.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
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

/// Where a destination column or row lands: the centre's source coordinate, and what blending
/// needs.
template <class Weights>
struct Place {
  int32_t at;
  Weights weights;
};

/// Weights of the methods that choose and do not blend.
struct NoWeights {};

/// A position between two source pixels of an axis.
struct Between {
  int32_t at;       ///< the pixel at or before it
  double fraction;  ///< of the way to the next pixel, below 1
};

/// The position of the destination pixel's centre, measured between centres of source pixels.
inline Between LocateBetween(const AxisMapping& mapping, uint32_t i) {
  const double position = mapping.Centre(i) - 0.5;
  const double whole = std::floor(position);
  return {ToInt32(whole), position - whole};
}

/// A `Method` for pixels of T says:
///   `kSpan`, `kBefore`   the square's side, and how many of its lines lie before the centre
///   `Sample`             what blending computes with; every sample is converted to it
///   `Weights`            what blending needs to know of a column or row
///   `Locate(mapping, i)` the `Place<Weights>` of the destination column or row i
///   `Blend(samples, x, y)`  the pixel's value of one channel; samples[i * kSpan + j] is column i
///   of the
///                           square, row j
/// Pixels of the square that the buffer does not hold are read at its nearest edge.
template <class Method, class T>
class NeighbourhoodPass {
 public:
  /// \param validity  of `dst`, where it is kept
  NeighbourhoodPass(const ResamplerState& state, const gobs::Raster& src, const gobs::Raster& dst,
                    gobs::Mask* validity)
      : src_(gobs::ViewOf<const T>(src, 1)),
        dst_(gobs::ViewOf<T>(dst, 1)),
        channels_(src.channelCount),
        noData_(Saturate<T>(state.noDataValue)),
        validity_(validity) {
    const SourceMapping mapping = MappingOf(state, src, dst);
    columns_ = LinesOf(mapping.x, dst.width, RangeOf(src.width, src.marginX));
    rows_ = LinesOf(mapping.y, dst.height, RangeOf(src.height, src.marginY));
  }

  template <class Valid>
  void Run(const Valid& valid) const {
    ParallelRows(static_cast<uint32_t>(rows_.size()), [&](uint32_t row) {
      FilledRun filled(validity_, row);
      T* out = dst_.At(0, row);
      for (const Line& column : columns_) {
        if (!WritePixel(out, column, rows_[row], valid)) filled.Add(&column - columns_.data());
        out += channels_;
      }
    });
  }

 private:
  static constexpr int kSpan = Method::kSpan;
  static constexpr int kCentre = Method::kBefore;
  using Samples = std::array<typename Method::Sample, kSpan * kSpan>;
  using Pixels = std::array<const T*, kSpan * kSpan>;

  /// One destination column or row: the source coordinates of its square, all inside the buffer.
  struct Line {
    std::array<int64_t, kSpan> at;
    typename Method::Weights weights;
  };

  static Scratch<Line> LinesOf(const AxisMapping& mapping, uint32_t size,
                               const BufferRange& range) {
    Scratch<Line> lines(size);
    for (uint32_t i = 0; i < size; ++i) {
      const auto place = Method::Locate(mapping, i);
      for (int k = 0; k < kSpan; ++k) lines[i].at[k] = range.Clamp(int64_t{place.at} + k - kCentre);
      lines[i].weights = place.weights;
    }
    return lines;
  }

  /// \returns false when the pixel is filled with no data
  template <class Valid>
  bool WritePixel(T* out, const Line& column, const Line& row, const Valid& valid) const {
    if (!valid(column.at[kCentre], row.at[kCentre])) {
      std::fill_n(out, channels_, noData_);
      return false;
    }
    const Pixels pixels = Gather(column, row, valid);
    for (uint64_t channel = 0; channel < channels_; ++channel) {
      Samples samples;
      for (size_t n = 0; n < samples.size(); ++n)
        samples[n] = static_cast<typename Method::Sample>(pixels[n][channel]);
      out[channel] = Method::Blend(samples, column.weights, row.weights);
    }
    return true;
  }

  /// Column by column, top to bottom. Deliberate: a pixel without data is not dropped, the centre
  /// takes its place.
  template <class Valid>
  Pixels Gather(const Line& column, const Line& row, const Valid& valid) const {
    const T* const centre = src_.At(column.at[kCentre], row.at[kCentre]);
    Pixels pixels;
    for (int i = 0; i < kSpan; ++i)
      for (int j = 0; j < kSpan; ++j)
        pixels[i * kSpan + j] =
            valid(column.at[i], row.at[j]) ? src_.At(column.at[i], row.at[j]) : centre;
    return pixels;
  }

  gobs::PixelView<const T> src_;
  gobs::PixelView<T> dst_;
  uint64_t channels_;
  T noData_;
  gobs::Mask* validity_;
  Scratch<Line> columns_;
  Scratch<Line> rows_;
};

/// Fills `dst` by `Method`, and keeps its validity. \param srcMask  null: every pixel is valid
/// \pre the channel counts are equal, and `src` has a margin
template <class Method, class T>
void ResampleNeighbourhoods(const ResamplerState& state, const gobs::Raster& src,
                            const gobs::Mask* srcMask, gobs::Raster& dst) {
  gobs::Mask* const validity = KeptValidity(src, srcMask, dst);
  if (!HasData(src, srcMask))
    return FillBlock(dst, gobs::ViewOf<T>(dst, 1),
                     Scratch<T>(dst.channelCount, Saturate<T>(state.noDataValue)), validity);
  const NeighbourhoodPass<Method, T> pass(state, src, dst, validity);
  gobs::WithValidity(srcMask, [&](const auto& valid) { pass.Run(valid); });
}

}  // namespace orin::resamplers::detail
