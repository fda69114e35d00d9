/// Compares pixel values bit for bit and says where they part.
// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <cstring>
#include <iomanip>
#include <sstream>
#include <string>
#include <type_traits>

#include "tests/testing/rasterbuilder.h"

namespace orin::testing {

enum class NotANumber {
  kBitForBit,  ///< copied values
  kAnyPayload  ///< computed values: which operand's sign and payload a NaN inherits is up to the
               ///< compiler's order of operands, and no method promises it
};

template <class T>
bool SameBits(const T& a, const T& b, NotANumber nan = NotANumber::kBitForBit) {
  if constexpr (std::is_floating_point_v<T>)
    if (nan == NotANumber::kAnyPayload && std::isnan(a) && std::isnan(b)) return true;
  return std::memcmp(&a, &b, sizeof(T)) == 0;
}

/// The value and its bytes, so that no two different values read alike.
template <class T>
std::string Exactly(const T& value) {
  std::ostringstream text;
  text << std::setprecision(17) << +value << " (";
  uint8_t bytes[sizeof(T)];
  std::memcpy(bytes, &value, sizeof(T));
  for (size_t i = sizeof(T); i > 0; --i)
    text << std::hex << std::setw(2) << std::setfill('0') << +bytes[i - 1];
  return text.str() + ")";
}

/// Compares whole buffers, margins included.
template <class T>
::testing::AssertionResult SamePixels(TestRaster<T>& expected, TestRaster<T>& actual,
                                      NotANumber nan) {
  const Geometry& g = expected.Size();
  const uint32_t perPixel = expected.ValuesPerPixel();
  for (size_t i = 0; i < expected.ValueCount(); ++i) {
    const T& want = expected.Values()[i];
    const T& got = actual.Values()[i];
    if (SameBits(want, got, nan)) continue;
    const auto pixel = static_cast<int64_t>(i / perPixel);
    return ::testing::AssertionFailure()
           << "pixel (" << pixel % g.Columns() - g.marginX << ", "
           << pixel / g.Columns() - g.marginY << ") component " << i % perPixel << ": expected "
           << Exactly(want) << ", got " << Exactly(got);
  }
  return ::testing::AssertionSuccess();
}

}  // namespace orin::testing
