/// Describes one component of one sample: width, signedness, float layout, complexness.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <limits>
#include <type_traits>

namespace orin::gobs {

/// Plain value; two descriptors are equal only when all six fields are.
struct DataType {
  uint32_t bits = 0;      ///< of one component: 1, 8, 16, 32 or 64
  bool isSigned = false;  ///< signed integers and both floating types
  bool isFloat = false;
  uint32_t mantissaBits = 0;  ///< integers: equal to `bits`; 23 or 52 for floats
  uint32_t exponentBits = 0;  ///< integers: 0; 8 or 11 for floats
  bool isComplex = false;     ///< every sample holds two components, real then imaginary

  friend bool operator==(const DataType&, const DataType&) = default;
};

inline constexpr DataType eDT_8U{8, false, false, 8, 0, false};
/// Masks only: no kernel takes it.
inline constexpr DataType eDT_BIT{1, false, false, 1, 0, false};

/// The descriptor of the C++ type `T`.
template <class T>
constexpr DataType DataTypeOf(bool isComplex = false) {
  static_assert(std::is_arithmetic_v<T>);
  constexpr uint32_t kBits = 8 * sizeof(T);
  if constexpr (std::is_floating_point_v<T>) {
    constexpr uint32_t kMantissa = std::numeric_limits<T>::digits - 1;
    return {kBits, true, true, kMantissa, kBits - 1 - kMantissa, isComplex};
  } else {
    return {kBits, std::is_signed_v<T>, false, kBits, 0, isComplex};
  }
}

/// Components that one sample of this type holds: 2 when complex, else 1.
constexpr uint32_t ComponentsPerSample(const DataType& type) { return type.isComplex ? 2 : 1; }

/// Whole bytes that one component takes in a raster buffer.
constexpr uint32_t BytesPerComponent(const DataType& type) { return (type.bits + 7) / 8; }

}  // namespace orin::gobs
