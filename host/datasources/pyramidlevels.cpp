// SPDX-License-Identifier: MIT
#include "host/datasources/pyramidlevels.h"

#include <algorithm>
#include <cstdint>
#include <limits>

std::vector<unsigned int> ComputePyramidLevel(double width, double height, unsigned int factor) {
  constexpr double kSmallEnough = 256;  // pixels
  std::vector<unsigned int> levels;
  if (factor < 2) return levels;
  const double side = std::max(width, height);
  for (uint64_t before = 1; side / static_cast<double>(before) > kSmallEnough;) {
    before *= factor;
    if (before > std::numeric_limits<unsigned int>::max()) break;
    const auto level = static_cast<double>(before);
    // Of a factor beyond both sides one level is asked for, which no image has.
    if (level <= side && level > std::min(width, height)) break;
    levels.push_back(static_cast<unsigned int>(before));
  }
  return levels;
}
