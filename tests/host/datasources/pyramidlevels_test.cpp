// SPDX-License-Identifier: MIT
#include "host/datasources/pyramidlevels.h"

#include <gtest/gtest.h>

#include <limits>
#include <vector>

namespace {

using Levels = std::vector<unsigned>;

TEST(ComputePyramidLevel, PowersOfTheFactorUntilTheLevelBeforeFitsIntoATile) {
  EXPECT_EQ((Levels{2, 4, 8}), ComputePyramidLevel(2048, 100, 2));
  EXPECT_EQ((Levels{2, 4, 8}), ComputePyramidLevel(100, 2048, 2));
  EXPECT_EQ((Levels{2, 4, 8, 16}), ComputePyramidLevel(2049, 100, 2));
  EXPECT_EQ((Levels{3, 9, 27}), ComputePyramidLevel(2305, 100, 3));
  EXPECT_EQ((Levels{3, 9}), ComputePyramidLevel(2304, 100, 3));
}

TEST(ComputePyramidLevel, AnImageOfOneTileNeedsNone) {
  EXPECT_EQ(Levels{}, ComputePyramidLevel(256, 256, 2));
  EXPECT_EQ(Levels{2}, ComputePyramidLevel(257, 2, 2));
  EXPECT_EQ(Levels{}, ComputePyramidLevel(0, 0, 2));
}

TEST(ComputePyramidLevel, ThePyramidOfAThinImageEndsAtTheLastLevelThatExists) {
  EXPECT_EQ(Levels{}, ComputePyramidLevel(600, 1, 2));
  EXPECT_EQ(Levels{}, ComputePyramidLevel(1, 600, 3));
  EXPECT_EQ((Levels{2, 4, 8}), ComputePyramidLevel(200000, 10, 2));
  EXPECT_EQ((Levels{3, 9}), ComputePyramidLevel(10, 200000, 3));
}

TEST(ComputePyramidLevel, FactorsBelowTwoMakeNoPyramid) {
  EXPECT_EQ(Levels{}, ComputePyramidLevel(100000, 100000, 0));
  EXPECT_EQ(Levels{}, ComputePyramidLevel(100000, 100000, 1));
}

TEST(ComputePyramidLevel, NeverOverflows) {
  constexpr unsigned kLargest = std::numeric_limits<unsigned>::max();
  EXPECT_EQ(Levels{kLargest}, ComputePyramidLevel(1000, 1000, kLargest));
  EXPECT_EQ(Levels{kLargest}, ComputePyramidLevel(1e300, 1e300, kLargest));
  EXPECT_EQ(Levels{}, ComputePyramidLevel(200, 200, kLargest));
  const Levels levels = ComputePyramidLevel(1e300, 1e300, 2);
  ASSERT_EQ(31u, levels.size());
  EXPECT_EQ(2147483648u, levels.back());
  EXPECT_EQ((Levels{65536}), ComputePyramidLevel(1e300, 1e300, 65536));
}

}  // namespace
