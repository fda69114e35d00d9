/// Average, slow and literal: the mean of the source pixels under a destination pixel.
// SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>
#include <type_traits>
#include <vector>

#include "tests/reference/pixels.h"

namespace orin::reference {

/// A sample as both methods see it; `im` is not used for real data.
template <class T>
struct Sample {
  T re, im;
};

/// re x re + im x im, wrapped to the width of the type by dropping the higher ones. Signed operands
/// multiply as their two's complement: the low bits of a product do not depend on the sign.
template <class Unsigned>
Unsigned WrappedSquareSum(Unsigned re, Unsigned im) {
  return static_cast<Unsigned>(static_cast<Unsigned>(re * re) + static_cast<Unsigned>(im * im));
}

/// Length of a complex sample. Deliberate: the integer sums wrap, at 32 or at 64 bits, and a
/// negative one has no length (NaN); the 32-bit float sums are single precision.
template <class T>
double Magnitude(Sample<T> v) {
  if constexpr (std::is_floating_point_v<T>) {
    const T re = v.re * v.re;
    const T im = v.im * v.im;
    const T sum = re + im;
    return std::sqrt(static_cast<double>(sum));
  } else if constexpr (sizeof(T) == 8) {
    const uint64_t sum = WrappedSquareSum(static_cast<uint64_t>(v.re), static_cast<uint64_t>(v.im));
    if (std::is_signed_v<T>) return std::sqrt(static_cast<double>(static_cast<int64_t>(sum)));
    return std::sqrt(static_cast<double>(sum));
  } else {
    const uint32_t sum = WrappedSquareSum(static_cast<uint32_t>(v.re), static_cast<uint32_t>(v.im));
    if (std::is_same_v<T, uint32_t>) return std::sqrt(static_cast<double>(sum));
    return std::sqrt(static_cast<double>(static_cast<int32_t>(sum)));
  }
}

template <class T>
T RealMean(const std::vector<Sample<T>>& samples) {
  double sum = 0;
  for (const Sample<T>& v : samples) sum = sum + static_cast<double>(v.re);
  return Convert<T>(sum / static_cast<double>(samples.size()));
}

/// Along the vector sum, as long as the samples are on average.
template <class T>
Sample<T> ComplexMean(const std::vector<Sample<T>>& samples) {
  double sumMag = 0, sumRe = 0, sumIm = 0;
  for (const Sample<T>& v : samples) {
    sumMag = sumMag + Magnitude(v);
    sumRe = sumRe + static_cast<double>(v.re);
    sumIm = sumIm + static_cast<double>(v.im);
  }
  const double length = std::sqrt(sumRe * sumRe + sumIm * sumIm);
  const double scale = sumMag / (length * static_cast<double>(samples.size()));
  return {Convert<T>(sumRe * scale), Convert<T>(sumIm * scale)};
}

template <class T>
Sample<T> SampleAt(const Block<T>& src, bool isComplex, int64_t x, int64_t y, int64_t channel) {
  if (!isComplex) return {src.At(x, y, channel), T{}};
  return {src.At(x, y, 2 * channel), src.At(x, y, 2 * channel + 1)};
}

/// One channel of a destination pixel from its samples.
template <class T>
void WriteMean(const Block<T>& dst, bool isComplex, int64_t i, int64_t j, int64_t channel,
               const std::vector<Sample<T>>& samples) {
  if (!isComplex) {
    dst.At(i, j, channel) = RealMean(samples);
    return;
  }
  const Sample<T> mean = ComplexMean(samples);
  dst.At(i, j, 2 * channel) = mean.re;
  dst.At(i, j, 2 * channel + 1) = mean.im;
}

/// Whole channels of no data: the first `channels` components hold it, the others hold 0.
template <class T>
void WriteNoData(const Block<T>& dst, bool isComplex, int64_t i, int64_t j, double noDataValue) {
  const int64_t components = dst.channels * (isComplex ? 2 : 1);
  for (int64_t k = 0; k < components; ++k)
    dst.At(i, j, k) = k < dst.channels ? Convert<T>(noDataValue) : T{};
}

/// One channel, exactly `f` times smaller, f = 2 or 3. Invalid samples do not count; with fewer
/// than 2 of 4, or 5 of 9, there is no data.
template <class T>
void AverageExact(const Block<T>& src, const Bits* mask, const Block<T>& dst, const Settings& s,
                  int64_t f) {
  const size_t needed = f == 2 ? 2 : 5;
  for (int64_t j = 0; j < dst.height; ++j) {
    for (int64_t i = 0; i < dst.width; ++i) {
      std::vector<Sample<T>> counted;
      for (int64_t row = f * j; row < f * j + f; ++row) {
        for (int64_t column = f * i; column < f * i + f; ++column) {
          const int64_t y = row > src.height - 1 ? src.height - 1 : row;
          if (mask == nullptr || mask->Valid(column, y))
            counted.push_back(SampleAt(src, s.isComplex, column, y, 0));
        }
      }
      if (counted.size() < needed) WriteNoData(dst, s.isComplex, i, j, s.noDataValue);
      else WriteMean(dst, s.isComplex, i, j, 0, counted);
    }
  }
}

/// Source pixels [start, end) along one axis, and the one whose validity decides.
struct Footprint {
  int64_t start, centre, end;
};

/// \throws NotDefined  the value does not fit a signed 32-bit integer
inline int64_t Truncate32(double v) {
  const double whole = std::trunc(v);
  if (!(whole >= -2147483648.0 && whole <= 2147483647.0)) throw NotDefined{};
  return static_cast<int64_t>(whole);
}

/// \param ratio  destination size / source size, used when the mapping is not georeferenced
/// \param limit  source size plus one margin
inline Footprint FootprintOf(const Settings& s, int64_t i, double dstPixelSize, double offset,
                             double srcPixelSize, double ratio, int64_t limit) {
  const double index = static_cast<double>(i);
  Footprint f{};
  if (s.georeferenced) {
    const auto ground = [&](double position) {  // whole ground units: deliberate, both truncations
      const auto distance = static_cast<double>(Truncate32(position * dstPixelSize + offset));
      return Truncate32(distance / srcPixelSize);
    };
    f.start = ground(index);
    f.centre = ground(index + 0.5);
    f.end = ground(index + 1);
  } else {
    f.start = static_cast<int64_t>(std::floor(index / ratio));
    f.centre = f.start;
    f.end = static_cast<int64_t>(std::floor((index + 1) / ratio));
  }
  if (f.end >= limit - 1) f.end = limit - 1;
  return f;
}

/// The samples of one channel; an invalid pixel's place is taken by the centre.
template <class T>
std::vector<Sample<T>> SamplesUnder(const Block<T>& src, const Bits* mask, bool isComplex,
                                    const Footprint& x, const Footprint& y, int64_t channel) {
  std::vector<Sample<T>> samples;
  for (int64_t row = y.start; row < y.end; ++row) {
    for (int64_t column = x.start; column < x.end; ++column) {
      const bool valid = mask == nullptr || mask->Valid(column, row);
      samples.push_back(
          SampleAt(src, isComplex, valid ? column : x.centre, valid ? row : y.centre, channel));
    }
  }
  return samples;
}

template <class T>
void AverageGeneral(const Block<T>& src, const Bits* mask, const Block<T>& dst, const Settings& s,
                    double ratioX, double ratioY) {
  if (src.marginX < 1 || src.marginY < 1) throw NotDefined{};
  const double offsetX = s.dstOriginX - s.srcOriginX;
  const double offsetY = s.dstOriginY - s.srcOriginY;
  for (int64_t j = 0; j < dst.height; ++j) {
    for (int64_t i = 0; i < dst.width; ++i) {
      const Footprint y = FootprintOf(s, j, s.dstPixelSizeY, offsetY, s.srcPixelSizeY, ratioY,
                                      src.height + src.marginY);
      const Footprint x = FootprintOf(s, i, s.dstPixelSizeX, offsetX, s.srcPixelSizeX, ratioX,
                                      src.width + src.marginX);
      if (mask != nullptr && !mask->Valid(x.centre, y.centre)) {
        WriteNoData(dst, s.isComplex, i, j, s.noDataValue);
        continue;
      }
      if (x.end <= x.start || y.end <= y.start) {
        WriteNoData(dst, s.isComplex, i, j, s.noDataValue);
        continue;
      }
      for (int64_t channel = 0; channel < dst.channels; ++channel)
        WriteMean(dst, s.isComplex, i, j, channel,
                  SamplesUnder(src, mask, s.isComplex, x, y, channel));
    }
  }
}

template <class T>
void Average(const Block<T>& src, const Bits* mask, const Block<T>& dst, const Settings& s) {
  double ratioX = RatioOf(s.ratioGiven, s.ratioX, src.width, dst.width);
  double ratioY = RatioOf(s.ratioGiven, s.ratioY, src.height, dst.height);
  if (s.georeferenced) {
    ratioX = s.dstPixelSizeX / s.srcPixelSizeX;
    ratioY = s.dstPixelSizeY / s.srcPixelSizeY;
  }
  if (dst.channels == 1 && ratioX == 0.5 && ratioY == 0.5) AverageExact(src, mask, dst, s, 2);
  else if (dst.channels == 1 && ratioX == 1.0 / 3 && ratioY == 1.0 / 3)
    AverageExact(src, mask, dst, s, 3);
  else AverageGeneral(src, mask, dst, s, ratioX, ratioY);
}

}  // namespace orin::reference
