// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/file/levelfactor.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace orin::drivers {
namespace {

struct Range {
  uint64_t low;
  uint64_t high;
};

/// The factors that turn `size` into `levelSize`, rounding down or up.
Range FactorsOf(uint32_t size, uint32_t levelSize) {
  const uint64_t low =
      uint64_t{size} / (uint64_t{levelSize} + 1) + 1;  // rounding down gives levelSize
  if (levelSize <= 1) return {low, std::numeric_limits<uint32_t>::max()};
  const uint64_t below = levelSize - 1;
  return {low, (size + below - 1) / below - 1};  // rounding up still gives levelSize
}

}  // namespace

std::optional<unsigned> FactorOf(uint32_t width, uint32_t height, uint32_t levelWidth,
                                 uint32_t levelHeight) {
  if (levelWidth == 0 || levelHeight == 0 || levelWidth > width || levelHeight > height)
    return std::nullopt;
  const Range x = FactorsOf(width, levelWidth);
  const Range y = FactorsOf(height, levelHeight);
  const uint64_t low = std::max<uint64_t>({x.low, y.low, 2});
  const uint64_t high = std::min(x.high, y.high);
  if (low > high) return std::nullopt;
  const double ratio = width >= height ? double(width) / levelWidth : double(height) / levelHeight;
  std::optional<unsigned> best;
  for (uint64_t power = 2; power <= high; power *= 2)
    if (power >= low && (!best || std::abs(double(power) - ratio) < std::abs(*best - ratio)))
      best = static_cast<unsigned>(power);
  if (best) return best;
  return static_cast<unsigned>(
      std::clamp<uint64_t>(static_cast<uint64_t>(std::llround(ratio)), low, high));
}

}  // namespace orin::drivers
