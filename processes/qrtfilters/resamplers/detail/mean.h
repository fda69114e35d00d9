/// The mean of samples: real, and complex by magnitude.
// SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>
#include <type_traits>

#include "processes/qrtfilters/resamplers/detail/saturate.h"

namespace orin::resamplers::detail {

/// Samples of up to 16 bits are summed as integers: the sums of a whole block stay below 2^53, so
/// that they are the same as in double. All others are rounded to double one by one.
template <class T>
using SumOf = std::conditional_t<std::is_integral_v<T> && sizeof(T) <= 2, int64_t, double>;

template <class T>
struct RealMean {
  static constexpr uint32_t kComponents = 1;
  SumOf<T> sum = 0;

  void Add(const T* sample) { sum += static_cast<SumOf<T>>(*sample); }

  /// \pre  `count` samples were added, at least one
  void Store(T* out, uint64_t count) const {
    *out = Saturate<T>(static_cast<double>(sum) / static_cast<double>(count));
  }
};

/// re * re + im * im in the sample's own arithmetic. Deliberate: integers of up to 32 bits wrap
/// round in 32 bits, the others in 64, and only unsigned 32- and 64-bit samples read the sum as
/// unsigned.
template <class T>
double SquaredMagnitude(T re, T im) {
  if constexpr (std::is_floating_point_v<T>) {
    const T reSquared = re * re;
    const T imSquared = im * im;
    return static_cast<T>(reSquared + imSquared);
  } else {
    using Sum = std::conditional_t<(sizeof(T) < 4), int32_t, T>;
    using Wrapping = std::make_unsigned_t<Sum>;
    const auto r = static_cast<Wrapping>(re);
    const auto i = static_cast<Wrapping>(im);
    return static_cast<double>(static_cast<Sum>(r * r + i * i));
  }
}

/// The mean of real and imaginary pairs: along their sum, with their mean magnitude. A sum of zero
/// has no direction and gives (0, 0) in integer types, NaN in floating ones.
template <class T>
struct ComplexMean {
  static constexpr uint32_t kComponents = 2;
  double sumMagnitude = 0;
  double sumRe = 0;
  double sumIm = 0;

  void Add(const T* sample) {
    sumMagnitude += std::sqrt(SquaredMagnitude(sample[0], sample[1]));
    sumRe += static_cast<double>(sample[0]);
    sumIm += static_cast<double>(sample[1]);
  }

  /// \pre  `count` samples were added, at least one
  void Store(T* out, uint64_t count) const {
    const double scale =
        sumMagnitude / (std::sqrt(sumRe * sumRe + sumIm * sumIm) * static_cast<double>(count));
    out[0] = Saturate<T>(sumRe * scale);
    out[1] = Saturate<T>(sumIm * scale);
  }
};

}  // namespace orin::resamplers::detail
