// SPDX-License-Identifier: MIT
#include "host/datasources/blocksize.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <numeric>
#include <set>
#include <string>
#include <utility>

#include "tests/testing/fakeraster.h"

namespace {

using orin::gobs::DataTypeOf;
using orin::testing::FakeRaster;
using orin::testing::LevelOf;

struct Size {
  unsigned width = 0;
  unsigned height = 0;
  friend auto operator<=>(const Size&, const Size&) = default;
};

Size BlockOf(FakeRaster source, FakeRaster target, unsigned budget) {
  Size size;
  FindOptimalRasterSize(&source, &target, budget, size.width, size.height, {});
  return size;
}

/// Pixels of an input and an output block together, margins of the input included.
double PixelsOf(const Size& block, const FakeRaster& source, const FakeRaster& target) {
  const double ratio = double(source.level) / target.level;
  const double width = std::min(block.width, target.width);
  const double height = std::min(block.height, target.height);
  return width * height +
         (width / ratio + 2.0 * source.GetMarginX()) * (height / ratio + 2.0 * source.GetMarginY());
}

constexpr unsigned kBudgets[] = {1,       100,     1000,     65536,     100000,
                                 1000000, 8388608, 33554432, 134217728, 4294967295u};

TEST(FindOptimalRasterSize, IsAtLeastOneByOneAndAMultipleOfTheStepWhateverIsAsked) {
  const std::pair<unsigned, unsigned> kLevels[] = {{1, 2},  {1, 3},  {1, 4}, {2, 4},
                                                   {2, 3},  {4, 6},  {3, 2}, {2, 8},
                                                   {1, 75}, {1, 77}, {5, 7}, {0, 0}};
  for (const auto& [source, target] : kLevels)
    for (const unsigned budget : kBudgets)
      for (const unsigned side : {1u, 100u, 5001u, 70000u}) {
        FakeRaster from = LevelOf(side, side, std::max(source, 1u));
        FakeRaster to = LevelOf(side, side, std::max(target, 1u));
        from.level = source;
        to.level = target;
        if (to.width == 0) continue;
        const Size size = BlockOf(from, to, budget);
        const unsigned step =
            std::max(source, 1u) / std::gcd(std::max(source, 1u), std::max(target, 1u));
        EXPECT_GE(size.width, 1u);
        EXPECT_GE(size.height, 1u);
        EXPECT_EQ(0u, size.width % step) << source << " " << target << " " << budget;
        EXPECT_EQ(0u, size.height % step) << source << " " << target << " " << budget;
      }
}

TEST(FindOptimalRasterSize, AnEmptyLevelGetsASizeToo) {
  FakeRaster source = LevelOf(1, 1, 1);
  FakeRaster target;
  target.level = 2;
  target.width = 0;
  target.height = 0;
  const Size size = BlockOf(source, target, 1000);
  EXPECT_GE(size.width, 1u);
  EXPECT_GE(size.height, 1u);
}

TEST(FindOptimalRasterSize, InputAndOutputOfAStepStayWithinTheBudgetUnlessTheBlockIsOnePixel) {
  for (const unsigned margin : {0u, 1u, 3u})
    for (const unsigned tile : {16u, 100u, 256u, 20000u})
      for (const unsigned level : {2u, 4u, 8u, 64u})
        for (const unsigned budget : kBudgets) {
          FakeRaster source = LevelOf(20000, 15000, 1);
          source.SetMargin(margin, margin, 2);
          FakeRaster target = LevelOf(20000, 15000, level);
          source.storedTileWidth = target.storedTileWidth = tile;
          const Size size = BlockOf(source, target, budget);
          if (size == Size{1, 1}) continue;
          EXPECT_LE(PixelsOf(size, source, target), budget)
              << level << " tile " << tile << " margin " << margin << ": " << size.width << "x"
              << size.height;
        }
}

TEST(FindOptimalRasterSize, ALargeBudgetIsUsedToMoreThanHalf) {
  FakeRaster source = LevelOf(60000, 60000, 1);
  FakeRaster target = LevelOf(60000, 60000, 2);
  const Size size = BlockOf(source, target, 33554432);
  EXPECT_GT(PixelsOf(size, source, target), 33554432 / 2.0);
}

TEST(FindOptimalRasterSize, AComplexSampleCountsAsTwo) {
  FakeRaster source = LevelOf(20000, 20000, 1);
  FakeRaster target = LevelOf(20000, 20000, 2);
  source.type = target.type = DataTypeOf<float>(true);
  const Size size = BlockOf(source, target, 4000000);
  EXPECT_LE(2 * PixelsOf(size, source, target), 4000000);
}

TEST(FindOptimalRasterSize, BlocksAreWholeTilesWhereverATileFits) {
  const std::pair<unsigned, unsigned> kTiles[] = {{256, 256}, {512, 512}, {128, 512},
                                                  {512, 128}, {16, 16},   {240, 80}};
  for (const auto& [tileWidth, tileHeight] : kTiles)
    for (const unsigned budget : {2000000u, 8388608u, 33554432u}) {
      FakeRaster source = LevelOf(50000, 50000, 1);
      FakeRaster target = LevelOf(50000, 50000, 2);
      target.storedTileWidth = tileWidth;
      target.storedTileHeight = tileHeight;
      const Size size = BlockOf(source, target, budget);
      EXPECT_TRUE(size.width == target.width || size.width % tileWidth == 0)
          << tileWidth << " " << size.width;
      EXPECT_EQ(0u, size.height % tileHeight) << tileHeight << " " << size.height;
    }
}

TEST(FindOptimalRasterSize, BlocksAreAsWideAsTheLevelWhenTheSourceIsStoredInStrips) {
  FakeRaster source = LevelOf(50000, 50000, 1);
  source.storedTileWidth = 50000;
  source.storedTileHeight = 4;
  FakeRaster target = LevelOf(50000, 50000, 2);
  for (const unsigned budget : {200000u, 2000000u, 33554432u})
    EXPECT_EQ(25000u, BlockOf(source, target, budget).width) << budget;
}

TEST(FindOptimalRasterSize, ALevelThatFitsIsOneBlock) {
  FakeRaster source = LevelOf(1001, 777, 1);
  FakeRaster target = LevelOf(1001, 777, 2);
  EXPECT_EQ((Size{500, 388}), BlockOf(source, target, 33554432));
}

TEST(FindOptimalRasterSize, WithoutExactArithmeticTheSizeIsFixedWhateverTheBudget) {
  const std::pair<unsigned, unsigned> kLevels[] = {{1, 75}, {1, 77}, {2, 3},
                                                   {4, 6},  {3, 7},  {2, 75}};
  for (const auto& [from, to] : kLevels) {
    std::set<Size> sizes;
    for (const unsigned budget : kBudgets)
      for (const unsigned tile : {64u, 256u, 50000u}) {
        FakeRaster source = LevelOf(50000, 50000, from);
        FakeRaster target = LevelOf(50000, 50000, to);
        source.storedTileWidth = tile;
        target.storedTileHeight = tile;
        sizes.insert(BlockOf(source, target, budget));
      }
    ASSERT_EQ(1u, sizes.size()) << from << " " << to;
    EXPECT_LE(double(sizes.begin()->width) * to / from, 1024 + double(to)) << from << " " << to;
  }
}

}  // namespace
