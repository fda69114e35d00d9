/// The one conversion of a computed value, or of the no-data value, to a pixel type.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <limits>
#include <type_traits>

namespace orin::resamplers::detail {

/// `v` as a T. Up to 32 bits: rounded half away from zero (unsigned: half up) and clamped to T's
/// range. 64-bit integers: truncated and clamped, nothing below 0. Floating types: narrowed, never
/// clamped. NaN gives 0 in every integer type.
template <class T>
inline T Saturate(double v) {
  using Limits = std::numeric_limits<T>;
  constexpr double kMax = static_cast<double>(Limits::max());
  constexpr double kMin = static_cast<double>(Limits::min());
  if constexpr (std::is_floating_point_v<T>) {
    return static_cast<T>(v);
  } else if constexpr (sizeof(T) == 8) {
    if (!(v > 0)) return 0;  // deliberate: 64-bit integers never hold a negative result
    return v >= kMax ? Limits::max()
                     : static_cast<T>(v);  // kMax is the power of two above the maximum
  } else if constexpr (std::is_signed_v<T>) {
    const double rounded = v >= 0 ? v + 0.5 : v - 0.5;  // deliberate: not std::round
    if (rounded >= kMax) return Limits::max();
    if (!(rounded >= kMin)) return rounded < kMin ? Limits::min() : T{0};
    return static_cast<T>(rounded);
  } else {
    const double rounded = v + 0.5;
    if (!(rounded > 0)) return 0;
    return rounded >= kMax ? Limits::max() : static_cast<T>(rounded);
  }
}

}  // namespace orin::resamplers::detail
