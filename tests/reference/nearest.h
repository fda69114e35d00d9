/// Nearest neighbour, slow and literal: every destination pixel is a copy of one source pixel.
// SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>
#include <cstring>

#include "tests/reference/pixels.h"

namespace orin::reference {

/// The mapped coordinate of destination index `i`; a corner by ratio, a centre by ground
/// coordinates.
inline double NearestCoordinate(const Settings& s, int64_t i, double dstPixelSize, double offset,
                                double srcPixelSize, double ratio) {
  const double index = static_cast<double>(i);
  if (s.georeferenced) return ((index + 0.5) * dstPixelSize + offset) / srcPixelSize;
  return index / ratio;
}

/// Truncates to 64 bits, keeps the low 32 of them, and clamps what is too large: deliberate, so
/// that a coordinate of -1 or less lands on the last pixel.
/// \throws NotDefined  the coordinate does not fit 64 bits
inline int64_t NearestIndex(double coordinate, int64_t size) {
  const double truncated = std::trunc(coordinate);
  if (!(std::fabs(truncated) < 9223372036854775808.0)) throw NotDefined{};
  const auto wide = static_cast<int64_t>(truncated);
  const auto low = static_cast<uint32_t>(static_cast<uint64_t>(wide) & 0xFFFFFFFFu);
  if (static_cast<int64_t>(low) >= size) return size - 1;
  return static_cast<int64_t>(low);
}

template <class T>
void Nearest(const Block<T>& src, const Bits* mask, const Block<T>& dst, const Settings& s) {
  const int64_t n = src.channels * (s.isComplex ? 2 : 1);
  const T noData = Convert<T>(s.noDataValue);
  const double offsetX = s.dstOriginX - s.srcOriginX;
  const double offsetY = s.dstOriginY - s.srcOriginY;
  for (int64_t j = 0; j < dst.height; ++j) {
    for (int64_t i = 0; i < dst.width; ++i) {
      const double ratioX = RatioOf(s.ratioGiven, s.ratioX, src.width, dst.width);
      const double ratioY = RatioOf(s.ratioGiven, s.ratioY, src.height, dst.height);
      const int64_t row = NearestIndex(
          NearestCoordinate(s, j, s.dstPixelSizeY, offsetY, s.srcPixelSizeY, ratioY), src.height);
      const int64_t column = NearestIndex(
          NearestCoordinate(s, i, s.dstPixelSizeX, offsetX, s.srcPixelSizeX, ratioX), src.width);
      const bool valid = mask == nullptr || mask->Valid(column, row);
      for (int64_t k = 0; k < n; ++k) {
        const T& from = valid ? src.At(column, row, k) : noData;
        std::memcpy(&dst.At(i, j, k), &from, sizeof(T));
      }
    }
  }
}

}  // namespace orin::reference
