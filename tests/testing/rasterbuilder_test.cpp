/// The tests' own tools: guards, drawn rasters and masks, and the comparison of pixels.
// SPDX-License-Identifier: MIT
#include "tests/testing/rasterbuilder.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "tests/testing/guardedbuffer.h"
#include "tests/testing/matchers.h"

namespace orin::testing {
namespace {

#ifdef ORIN_TESTING_POISONS_GUARDS
TEST(GuardedBuffer, EndsTheProgramAtAnAccessOutside) {
  GuardedBuffer buffer(5);
  volatile uint8_t* data = buffer.Data();
  EXPECT_DEATH(data[-1] = 0, "use-after-poison");
  EXPECT_DEATH(data[5] = 0, "use-after-poison");
}
#else
TEST(GuardedBuffer, NoticesAByteWrittenOutside) {
  for (const int at : {-1, 5}) {
    GuardedBuffer buffer(5);
    volatile uint8_t* data = buffer.Data();
    data[at] = 0;
    EXPECT_FALSE(buffer.GuardsIntact()) << at;
  }
}
#endif

TEST(GuardedBuffer, AllowsEveryByteInside) {
  GuardedBuffer buffer(5);
  std::fill_n(buffer.Data(), buffer.Size(), uint8_t{0});
  EXPECT_TRUE(buffer.GuardsIntact());
}

TEST(RasterOf, DrawsTheMarginToo) {
  auto raster = RasterOf<int16_t>({{1, 2, 3}, {4, 5, 6}, {7, 8, 9}}, 1, 1);
  EXPECT_EQ(1u, raster.Get()->width);
  EXPECT_EQ(1u, raster.Get()->marginX);
  EXPECT_EQ(5, raster.At(0, 0));
  EXPECT_EQ(7, raster.At(-1, 1));
}

TEST(MaskOf, DrawsTheMarginToo) {
  TestMask mask = MaskOf({{0, 0, 0}, {0, 1, 0}, {0, 0, 1}}, 1, 1);
  EXPECT_TRUE(mask.Get()->IsValid(0, 0));
  EXPECT_TRUE(mask.Get()->IsValid(1, 1));
  EXPECT_FALSE(mask.Get()->IsValid(-1, 0));
  EXPECT_TRUE(mask.Untouched());
  mask.Get()->SetValid(0, 0, false);
  EXPECT_FALSE(mask.Untouched());
}

TEST(SamePixels, NamesTheFirstDifference) {
  auto a = RasterOf<uint8_t>({{1, 2, 3}, {4, 5, 6}, {7, 8, 9}}, 1, 1);
  auto b = RasterOf<uint8_t>({{1, 2, 3}, {4, 5, 6}, {7, 8, 0}}, 1, 1);
  EXPECT_TRUE(SamePixels(a, a, NotANumber::kBitForBit));
  const ::testing::AssertionResult result = SamePixels(a, b, NotANumber::kBitForBit);
  EXPECT_FALSE(result);
  EXPECT_STREQ("pixel (1, 1) component 0: expected 9 (09), got 0 (00)", result.message());
}

TEST(SameBits, TellsZerosApartAndNotANumbersOnlyWhenAsked) {
  const double nan = std::numeric_limits<double>::quiet_NaN();
  EXPECT_FALSE(SameBits(0.0, -0.0));
  EXPECT_FALSE(SameBits(nan, std::copysign(nan, -1)));
  EXPECT_TRUE(SameBits(nan, std::copysign(nan, -1), NotANumber::kAnyPayload));
  EXPECT_FALSE(SameBits(nan, 1.0, NotANumber::kAnyPayload));
}

}  // namespace
}  // namespace orin::testing
