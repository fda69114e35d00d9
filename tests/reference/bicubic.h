/// Bicubic, slow and literal: the cubic through four samples, along x and then along y.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cmath>
#include <cstdint>

#include "tests/reference/pixels.h"

namespace orin::reference {

/// The cubic through q1 at 0 and q2 at 1, from the differences to q1 of its other three samples.
inline double Cubic(double d0, double d2, double d3, double q1, double t) {
  const double t2 = t * t;
  const double t3 = t2 * t;
  const double linear = (d2 - d0 / 3 - d3 / 6) * t;
  const double square = (d0 / 2 + d2 / 2) * t2;
  const double cube = (d3 / 6 - (d0 / 6 + d2 / 2)) * t3;
  return ((linear + q1) + square) + cube;
}

/// Along x: the differences are rounded to single precision.
inline double CubicOfFloats(const std::array<float, 4>& q, double t) {
  const float d0 = q[0] - q[1];
  const float d2 = q[2] - q[1];
  const float d3 = q[3] - q[1];
  return Cubic(static_cast<double>(d0), static_cast<double>(d2), static_cast<double>(d3),
               static_cast<double>(q[1]), t);
}

/// Along y: the differences are taken in double.
inline double CubicOfDoubles(const std::array<double, 4>& q, double t) {
  return Cubic(q[0] - q[1], q[2] - q[1], q[3] - q[1], q[1], t);
}

template <class T>
double CubicSurface(const Block<T>& src, const Bits* mask, int64_t x0, int64_t y0, int64_t k,
                    double fx, double fy) {
  std::array<double, 4> lines{};
  for (int j = 0; j < 4; ++j) {
    std::array<float, 4> q{};
    for (int i = 0; i < 4; ++i) {
      int64_t x = x0 - 1 + i;
      int64_t y = y0 - 1 + j;
      if (mask != nullptr && !mask->Valid(x, y)) {
        x = x0;
        y = y0;
      }
      q[i] = static_cast<float>(src.At(x, y, k));
    }
    lines[j] = CubicOfFloats(q, fx);
  }
  return CubicOfDoubles(lines, fy);
}

template <class T>
void Bicubic(const Block<T>& src, const Bits* mask, const Block<T>& dst, const Settings& s) {
  if (src.marginX < 3 || src.marginY < 3) throw NotDefined{};
  const double offsetX = s.dstOriginX - s.srcOriginX;
  const double offsetY = s.dstOriginY - s.srcOriginY;
  const double rX = RatioOf(s.ratioGiven, s.ratioX, src.width, dst.width);
  const double rY = RatioOf(s.ratioGiven, s.ratioY, src.height, dst.height);
  for (int64_t r = 0; r < dst.height; ++r) {
    for (int64_t c = 0; c < dst.width; ++c) {
      const double y = CentrePosition(s, r, s.dstPixelSizeY, offsetY, s.srcPixelSizeY, rY);
      const double x = CentrePosition(s, c, s.dstPixelSizeX, offsetX, s.srcPixelSizeX, rX);
      const auto x0 = static_cast<int64_t>(std::floor(x));
      const auto y0 = static_cast<int64_t>(std::floor(y));
      const double fx = x - static_cast<double>(x0);
      const double fy = y - static_cast<double>(y0);
      for (int64_t k = 0; k < dst.channels; ++k) {
        const bool valid = mask == nullptr || mask->Valid(x0, y0);
        dst.At(c, r, k) =
            Convert<T>(valid ? CubicSurface(src, mask, x0, y0, k, fx, fy) : s.noDataValue);
      }
    }
  }
}

}  // namespace orin::reference
