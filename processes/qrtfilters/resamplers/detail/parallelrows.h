/// The kernels' one door to threads.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace orin::resamplers::detail {

/// Calls `body(row)` for the rows 0 .. height - 1, split over the threads of the team into
/// contiguous runs. Nothing happens for a height of 0.
/// \pre  `body` throws nothing and writes its own row only
template <class Body>
void ParallelRows(uint32_t height, const Body& body) {
  if (height == 0) return;
  const int64_t rows = height;
#pragma omp parallel for schedule(static)
  for (int64_t row = 0; row < rows; ++row) body(static_cast<uint32_t>(row));
}

}  // namespace orin::resamplers::detail
