// SPDX-License-Identifier: MIT
#include "host/model/levelsize.h"

#include <gtest/gtest.h>

namespace orin::model {
namespace {

TEST(LevelSize, HoldsWholePixelsOnly) {
  EXPECT_EQ((LevelSize{500, 388}), LevelSizeOf(1001, 777, 2));
  EXPECT_EQ((LevelSize{333, 259}), LevelSizeOf(1001, 777, 3));
}

TEST(LevelSize, IsEmptyWhereASideIsShorterThanAPixel) {
  EXPECT_FALSE(LevelSizeOf(8, 600, 8).IsEmpty());
  EXPECT_TRUE(LevelSizeOf(7, 600, 8).IsEmpty());
  EXPECT_TRUE(LevelSizeOf(600, 7, 8).IsEmpty());
  EXPECT_TRUE(LevelSizeOf(0, 600, 2).IsEmpty());
}

TEST(LevelSize, Level0HasNoPixels) { EXPECT_TRUE(LevelSizeOf(600, 600, 0).IsEmpty()); }

}  // namespace
}  // namespace orin::model
