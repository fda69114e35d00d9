/// Bilinear, slow and literal: the four pixels round the mapped centre, weighted in double.
// SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>

#include "tests/reference/pixels.h"

namespace orin::reference {

template <class T>
void Bilinear(const Block<T>& src, const Bits* mask, const Block<T>& dst, const Settings& s) {
  if (src.marginX == 0 || src.marginY == 0) throw NotDefined{};
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
        if (mask != nullptr && !mask->Valid(x0, y0)) {
          dst.At(c, r, k) = Convert<T>(s.noDataValue);
          continue;
        }
        const auto sample = [&](int64_t sx, int64_t sy) {
          const bool valid = mask == nullptr || mask->Valid(sx, sy);
          return static_cast<double>(valid ? src.At(sx, sy, k) : src.At(x0, y0, k));
        };
        const double p00 = sample(x0, y0);
        const double p10 = sample(x0 + 1, y0);
        const double p01 = sample(x0, y0 + 1);
        const double p11 = sample(x0 + 1, y0 + 1);
        double sum = p00 * (1 - fx) * (1 - fy);
        sum = sum + p10 * fx * (1 - fy);
        sum = sum + p01 * (1 - fx) * fy;
        sum = sum + p11 * fx * fy;
        dst.At(c, r, k) = Convert<T>(sum);
      }
    }
  }
}

}  // namespace orin::reference
