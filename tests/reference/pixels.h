/// Blocks, masks, settings and conversions of the slow twins, written out with nothing borrowed.
// SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>
#include <type_traits>

namespace orin::reference {

/// Thrown by a twin for a case that has no defined answer: a position outside the block's buffer,
/// or a block without the margin that the method needs.
struct NotDefined {};

/// A block whose buffer starts at the top-left corner of its margin. Does not own its values.
template <class T>
struct Block {
  int64_t width, height;     ///< pixels, margins not counted
  int64_t marginX, marginY;  ///< pixels, on each side
  int64_t channels;
  int64_t components;  ///< per channel: 2 when complex, else 1
  T* values;

  /// Component `k` of the pixel (x, y); k counts the components of the whole pixel.
  /// \throws NotDefined  the pixel is outside the buffer
  T& At(int64_t x, int64_t y, int64_t k) const {
    if (x < -marginX || x >= width + marginX) throw NotDefined{};
    if (y < -marginY || y >= height + marginY) throw NotDefined{};
    const int64_t bufferLine = y + marginY;
    const int64_t bufferColumn = x + marginX;
    const int64_t pixelsPerLine = marginX + width + marginX;
    const int64_t pixel = bufferLine * pixelsPerLine + bufferColumn;
    return values[pixel * channels * components + k];
  }
};

/// One bit a buffer pixel, lines not padded, the top bit of a byte first. Does not own its bytes.
struct Bits {
  int64_t width, height;
  int64_t marginX, marginY;
  const uint8_t* bytes;

  /// \throws NotDefined  the pixel is outside the buffer
  bool Valid(int64_t x, int64_t y) const {
    if (x < -marginX || x >= width + marginX) throw NotDefined{};
    if (y < -marginY || y >= height + marginY) throw NotDefined{};
    const int64_t pixel = (y + marginY) * (marginX + width + marginX) + (x + marginX);
    static constexpr uint8_t kWeights[8] = {128, 64, 32, 16, 8, 4, 2, 1};
    return (bytes[pixel / 8] & kWeights[pixel % 8]) != 0;
  }
};

/// What a resampler is told before it runs; the initial values are those of a fresh one.
struct Settings {
  bool ratioGiven = false;
  double ratioX = 0, ratioY = 0;  ///< destination size / source size
  bool georeferenced = false;
  double srcOriginX = 0, srcOriginY = 0, srcPixelSizeX = 1, srcPixelSizeY = 1;
  double dstOriginX = 0, dstOriginY = 0, dstPixelSizeX = 1, dstPixelSizeY = 1;
  double noDataValue = 0;
  bool isComplex = false;
};

/// The ratio that applies when the mapping is not georeferenced.
inline double RatioOf(bool given, double ratio, int64_t srcSize, int64_t dstSize) {
  if (given) return ratio;
  return static_cast<double>(dstSize) / static_cast<double>(srcSize);
}

/// The source position of a destination pixel's centre, half a pixel subtracted, for the methods
/// that interpolate.
inline double CentrePosition(const Settings& s, int64_t i, double dstPixelSize, double offset,
                             double srcPixelSize, double ratio) {
  const double centre = static_cast<double>(i) + 0.5;
  if (s.georeferenced) return (centre * dstPixelSize + offset) / srcPixelSize - 0.5;
  return centre / ratio - 0.5;
}

/// Rounds half away from zero and clamps. Not a number gives 0.
inline int64_t ConvertSigned(double v, double smallest, double largest) {
  if (std::isnan(v)) return 0;
  const double w = v >= 0 ? v + 0.5 : v - 0.5;
  if (w >= largest) return static_cast<int64_t>(largest);
  if (w < smallest) return static_cast<int64_t>(smallest);
  return static_cast<int64_t>(w);
}

/// Adds a half, truncates and clamps. Not a number gives 0.
inline int64_t ConvertUnsigned(double v, double largest) {
  if (std::isnan(v)) return 0;
  const double w = v + 0.5;
  if (w <= 0) return 0;
  if (w >= largest) return static_cast<int64_t>(largest);
  return static_cast<int64_t>(w);
}

/// Truncates, without rounding; deliberate: nothing below zero. Not a number gives 0.
inline int64_t ConvertSigned64(double v) {
  if (!(v > 0)) return 0;
  if (v >= 9223372036854775808.0) return INT64_MAX;
  return static_cast<int64_t>(v);
}

/// Truncates, without rounding, over the whole unsigned range. Not a number gives 0.
inline uint64_t ConvertUnsigned64(double v) {
  if (!(v > 0)) return 0;
  if (v >= 18446744073709551616.0) return UINT64_MAX;
  if (v < 9223372036854775808.0) return static_cast<uint64_t>(static_cast<int64_t>(v));
  const auto rest = static_cast<int64_t>(v - 9223372036854775808.0);
  return static_cast<uint64_t>(rest) + (uint64_t{1} << 63);
}

/// The pixel value that a computed number, or a no-data value, becomes.
template <class T>
T Convert(double v) {
  if constexpr (std::is_same_v<T, double>) return v;
  else if constexpr (std::is_same_v<T, float>) return static_cast<float>(v);
  else if constexpr (std::is_same_v<T, int8_t>) return static_cast<T>(ConvertSigned(v, -128, 127));
  else if constexpr (std::is_same_v<T, uint8_t>) return static_cast<T>(ConvertUnsigned(v, 255));
  else if constexpr (std::is_same_v<T, int16_t>)
    return static_cast<T>(ConvertSigned(v, -32768, 32767));
  else if constexpr (std::is_same_v<T, uint16_t>) return static_cast<T>(ConvertUnsigned(v, 65535));
  else if constexpr (std::is_same_v<T, int32_t>)
    return static_cast<T>(ConvertSigned(v, -2147483648.0, 2147483647.0));
  else if constexpr (std::is_same_v<T, uint32_t>)
    return static_cast<T>(ConvertUnsigned(v, 4294967295.0));
  else if constexpr (std::is_same_v<T, int64_t>) return ConvertSigned64(v);
  else {
    static_assert(std::is_same_v<T, uint64_t>, "not a pixel type");
    return ConvertUnsigned64(v);
  }
}

}  // namespace orin::reference
