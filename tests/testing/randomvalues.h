/// Seeded pixel values, from smooth to hostile, and no-data values that no type can hold.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstdint>
#include <cstring>
#include <initializer_list>
#include <iterator>
#include <limits>
#include <type_traits>
#include <vector>

namespace orin::testing {

/// A small generator whose sequence is the same on every machine.
class Random {
 public:
  explicit Random(uint64_t seed) : state_(seed) {}

  uint64_t Bits() {
    state_ += 0x9E3779B97F4A7C15u;
    uint64_t z = state_;
    z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9u;
    z = (z ^ (z >> 27)) * 0x94D049BB133111EBu;
    return z ^ (z >> 31);
  }
  /// From `low` to `high`, both included.
  int64_t Between(int64_t low, int64_t high) {
    return low + static_cast<int64_t>(Bits() % static_cast<uint64_t>(high - low + 1));
  }
  bool OneIn(uint64_t n) { return Bits() % n == 0; }
  template <class Container>
  auto From(const Container& choices) {
    return *(std::begin(choices) + static_cast<int64_t>(Bits() % std::size(choices)));
  }

 private:
  uint64_t state_;
};

enum class Values { kFew, kSmall, kAnyBits, kLimits };

/// Values where a conversion or a sum changes its mind.
template <class T>
std::vector<T> LimitsOf() {
  using L = std::numeric_limits<T>;
  if constexpr (std::is_floating_point_v<T>) {
    return {T(0),         T(-0.0),       T(1),           T(-1),           T(0.5),
            T(-0.5),      T(0.1),        T(0.3),         L::denorm_min(), -L::denorm_min(),
            L::min(),     -L::min(),     L::min() / 2,   L::max(),        L::lowest(),
            L::epsilon(), L::infinity(), -L::infinity(), L::quiet_NaN(),  T(9007199254740993.0),
            T(1e19),      T(-1e19)};
  } else if constexpr (sizeof(T) == 8) {
    return {T(0),
            T(1),
            T(-1),
            L::min(),
            L::max(),
            T(L::max() - 1),
            T(L::min() + 1),
            T((int64_t{1} << 53) + 1),
            T(-((int64_t{1} << 53) + 1)),
            T((int64_t{1} << 24) + 1),
            T(INT64_MAX),
            T(INT64_MAX - 512),
            T(INT64_MIN),
            T(3037000500)};
  } else {
    return {T(0),
            T(1),
            T(-1),
            T(2),
            T(-2),
            L::min(),
            L::max(),
            T(L::max() - 1),
            T(L::min() + 1),
            T(L::max() / 2),
            T(16777217),
            T(46341),
            T(32768),
            T(-7)};
  }
}

template <class T>
T AnyBits(Random& random) {
  const uint64_t bits = random.Bits();
  T value;
  std::memcpy(&value, &bits, sizeof value);
  return value;
}

/// Quarters for the floating types, so that sums round.
template <class T>
T SmallValue(Random& random, int64_t low, int64_t high) {
  const int64_t v = random.Between(std::is_signed_v<T> ? low : 0, high);
  if constexpr (std::is_floating_point_v<T>) return static_cast<T>(v) / T(4) + T(0.1);
  else return static_cast<T>(v);
}

template <class T>
void FillRandomly(Random& random, Values kind, T* values, size_t count) {
  const std::vector<T> limits = LimitsOf<T>();
  for (size_t i = 0; i < count; ++i) {
    switch (kind) {
      case Values::kFew:
        values[i] = SmallValue<T>(random, -1, 2);
        break;
      case Values::kSmall:
        values[i] = SmallValue<T>(random, -100, 100);
        break;
      case Values::kAnyBits:
        values[i] = AnyBits<T>(random);
        break;
      case Values::kLimits:
        values[i] = random.OneIn(3) ? SmallValue<T>(random, -3, 3) : random.From(limits);
        break;
    }
  }
}

/// In range, fractional, on a rounding edge, out of the range of some or of every type.
inline constexpr std::array<double, 34> kNoDataValues = {0.0,
                                                         -0.0,
                                                         1.0,
                                                         7.0,
                                                         255.0,
                                                         255.4,
                                                         254.5,
                                                         254.49,
                                                         0.5,
                                                         -0.5,
                                                         0.49999999999999994,
                                                         -0.49999999999999994,
                                                         -1.0,
                                                         -3.2,
                                                         -3.5,
                                                         127.5,
                                                         126.5,
                                                         -128.5,
                                                         -128.49,
                                                         -9999.0,
                                                         32767.4,
                                                         65535.5,
                                                         2147483647.5,
                                                         -2147483649.0,
                                                         4294967295.5,
                                                         9007199254740993.0,
                                                         9223372036854775807.0,
                                                         9223372036854774784.0,
                                                         18446744073709551615.0,
                                                         18446744073709549568.0,
                                                         1e300,
                                                         -1e300,
                                                         std::numeric_limits<double>::infinity(),
                                                         std::numeric_limits<double>::quiet_NaN()};

}  // namespace orin::testing
