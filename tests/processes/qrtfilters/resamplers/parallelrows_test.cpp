// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/detail/parallelrows.h"

#include <gtest/gtest.h>
#include <omp.h>

#include <set>
#include <vector>

namespace orin::resamplers::detail {
namespace {

/// The thread of each row.
std::vector<int> ThreadsOf(uint32_t height, int threads) {
  const int former = omp_get_max_threads();
  omp_set_num_threads(threads);
  std::vector<int> row(height, -1);
  ParallelRows(height, [&row](uint32_t y) { row[y] = omp_get_thread_num(); });
  omp_set_num_threads(former);
  return row;
}

TEST(ParallelRows, AreSplitOverTheTeamIntoContiguousRunsOfOneLength) {
  const std::vector<int> threads = ThreadsOf(64, 4);
  for (size_t y = 0; y < threads.size(); ++y) EXPECT_EQ(int(y / 16), threads[y]) << y;
}

TEST(ParallelRows, AreEachVisitedOnce) {
  for (const uint32_t height : {0u, 1u, 3u, 7u}) {
    const std::vector<int> threads = ThreadsOf(height, 4);
    EXPECT_EQ(0u, std::set<int>(threads.begin(), threads.end()).count(-1)) << height;
  }
}

}  // namespace
}  // namespace orin::resamplers::detail
