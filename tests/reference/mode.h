/// Mode, slow and literal: the most frequent of the three by three values round the mapped pixel.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cmath>
#include <cstdint>
#include <type_traits>

#include "tests/reference/pixels.h"

namespace orin::reference {

struct Position {
  int64_t x, y;
};

template <class T>
bool SameValue(T a, T b) {
  if constexpr (std::is_floating_point_v<T>)
    return std::fabs(static_cast<double>(a) - static_cast<double>(b)) < 2.220446049250313e-16;
  else return a == b;
}

/// The most frequent value; of equally frequent ones, the first. A NaN has no vote, its own
/// included.
template <class T>
T MostFrequent(const std::array<T, 9>& v) {
  std::array<int, 9> n{};
  for (int j = 0; j < 9; ++j)
    for (int i = 0; i < 9; ++i)
      if (SameValue(v[i], v[j])) n[j] = n[j] + 1;
  int best = 0;
  for (int j = 1; j < 9; ++j)
    if (n[j] > n[best]) best = j;
  return v[best];
}

/// The source pixel along one axis: of the centre by ground coordinates, of the corner by ratio.
inline int64_t ModeIndex(const Settings& s, int64_t i, double dstPixelSize, double offset,
                         double srcPixelSize, double ratio) {
  const double index = static_cast<double>(i);
  if (s.georeferenced)
    return static_cast<int64_t>(std::trunc(((index + 0.5) * dstPixelSize + offset) / srcPixelSize));
  return static_cast<int64_t>(std::floor(index / ratio));
}

/// The nine pixels, column by column; an invalid neighbour's place is taken by the centre.
inline std::array<Position, 9> ModeNeighbours(int64_t x, int64_t y, const Bits* mask) {
  std::array<Position, 9> nine = {{{x - 1, y - 1},
                                   {x - 1, y},
                                   {x - 1, y + 1},
                                   {x, y - 1},
                                   {x, y},
                                   {x, y + 1},
                                   {x + 1, y - 1},
                                   {x + 1, y},
                                   {x + 1, y + 1}}};
  if (mask != nullptr)
    for (Position& p : nine)
      if (!mask->Valid(p.x, p.y)) p = {x, y};
  return nine;
}

template <class T>
void Mode(const Block<T>& src, const Bits* mask, const Block<T>& dst, const Settings& s) {
  if (src.marginX < 1 || src.marginY < 1) throw NotDefined{};
  const double offsetX = s.dstOriginX - s.srcOriginX;
  const double offsetY = s.dstOriginY - s.srcOriginY;
  const double rX = RatioOf(s.ratioGiven, s.ratioX, src.width, dst.width);
  const double rY = RatioOf(s.ratioGiven, s.ratioY, src.height, dst.height);
  for (int64_t r = 0; r < dst.height; ++r) {
    for (int64_t c = 0; c < dst.width; ++c) {
      const int64_t y = ModeIndex(s, r, s.dstPixelSizeY, offsetY, s.srcPixelSizeY, rY);
      const int64_t x = ModeIndex(s, c, s.dstPixelSizeX, offsetX, s.srcPixelSizeX, rX);
      if (mask != nullptr && !mask->Valid(x, y)) {
        for (int64_t k = 0; k < dst.channels; ++k) dst.At(c, r, k) = Convert<T>(s.noDataValue);
        continue;
      }
      const std::array<Position, 9> nine = ModeNeighbours(x, y, mask);
      for (int64_t k = 0; k < dst.channels; ++k) {
        std::array<T, 9> v;
        for (int j = 0; j < 9; ++j) v[j] = src.At(nine[j].x, nine[j].y, k);
        dst.At(c, r, k) = MostFrequent(v);
      }
    }
  }
}

}  // namespace orin::reference
