/// Mode at its corners: ties, masks, equality of floats, both mappings.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "processes/qrtfilters/resamplers/mode.h"
#include "tests/processes/qrtfilters/resamplers/blocks.h"

// Pictures keep their lines.
// clang-format off

namespace orin::resamplers {
namespace {

using testing::BlockOf;
using testing::MaskOf;
using testing::Picture;
using testing::Resampled;
using testing::Shape;

constexpr Shape kMargin{1, 1, 1, false};

/// What becomes of the middle of a 3 x 3 picture.
template <class T>
T ModeOf(const Picture<T>& picture, const std::vector<const char*>& noData = {}, double fill = 0) {
  Mode<T> kernel;
  kernel.SetRatio(1, 1);
  kernel.SetNoDataValue(fill);
  const auto src = BlockOf<T>(picture, kMargin);
  const auto mask = noData.empty() ? nullptr : MaskOf(*src, noData);
  return Resampled<T>(kernel, *src, mask.get(), 3, 3)[1][1];
}

TEST(Mode, NineDistinctValuesGiveTheUpperLeftOne) {
  EXPECT_EQ(1, ModeOf<int>({{1, 2, 3},
                            {4, 5, 6},
                            {7, 8, 9}}));
}

TEST(Mode, TieGoesToTheValueMetFirst) {
  EXPECT_EQ(7, ModeOf<uint8_t>({{7, 7, 9},
                                {7, 5, 9},
                                {7, 9, 9}}));   // four 7s, four 9s; columns are read first
  EXPECT_EQ(9, ModeOf<uint8_t>({{1, 7, 7},
                                {9, 9, 7},
                                {9, 9, 7}}));   // by rows 7 would come first
}

TEST(Mode, MostFrequentValueWinsWhereverItStands) {
  EXPECT_EQ(9, ModeOf<uint8_t>({{1, 1, 9},
                                {1, 1, 9},
                                {9, 9, 9}}));
}

TEST(Mode, ClearNeighboursVoteForTheCentre) {
  const Picture<uint8_t> ring = {{1, 1, 1},
                                 {1, 5, 1},
                                 {1, 1, 1}};
  EXPECT_EQ(5, ModeOf<uint8_t>(ring, {"xxx", "x.x", "xxx"}, 99));
  EXPECT_EQ(5, ModeOf<uint8_t>(ring, {"xx.", "x..", "x.."}, 99));   // five votes against four
  EXPECT_EQ(1, ModeOf<uint8_t>(ring, {"xx.", "...", "x.."}, 99));
}

TEST(Mode, ClearCentreGivesNoDataInEveryChannelThoughAllNeighboursAreValid) {
  Mode<uint8_t> kernel;
  kernel.SetRatio(1, 1);
  kernel.SetNoDataValue(99);
  const auto src = BlockOf<uint8_t>({{1, 2}}, {2, 1, 1, false});
  const auto mask = MaskOf(*src, {"x"});
  EXPECT_EQ((Picture<uint8_t>{{99, 99}}), Resampled<uint8_t>(kernel, *src, mask.get(), 1, 1));
}

TEST(Mode, PixelsOfTheNoDataValueVoteWhenThereIsNoMask) {
  EXPECT_EQ(0, ModeOf<uint8_t>({{0, 0, 0},
                                {3, 5, 3},
                                {0, 0, 4}}, {}, 0));
}

TEST(Mode, ChannelsAreCountedEachOnItsOwn) {
  Mode<uint8_t> kernel;
  const auto src = BlockOf<uint8_t>({{1, 9, 2, 9, 2, 8},
                                     {1, 9, 2, 9, 2, 8},
                                     {1, 7, 2, 8, 1, 8}}, {2, 1, 1, false});
  kernel.SetRatio(1, 1);
  const auto middle = Resampled<uint8_t>(kernel, *src, nullptr, 3, 3)[1];
  EXPECT_EQ(2, middle[2]);
  EXPECT_EQ(9, middle[3]);
}

template <class T>
T FillOf(double noData) {
  return ModeOf<T>({{1, 1, 1}, {1, 1, 1}, {1, 1, 1}}, {"...", ".x.", "..."}, noData);
}

TEST(Mode, NoDataValueIsRoundedAndLimited) {
  EXPECT_EQ(255, FillOf<uint8_t>(255.4));
  EXPECT_EQ(0, FillOf<uint8_t>(-3.2));
  EXPECT_EQ(-4, FillOf<signed char>(-3.5));
  EXPECT_EQ(0, FillOf<int64_t>(-1));
}

TEST(Mode, FloatsAreEqualWithinOneFixedTolerance) {
  const float a = 1.0f, b = 1.0000001f;
  EXPECT_EQ(a, ModeOf<float>({{a, b, b},
                              {a, 5, 6},
                              {a, 7, 8}}));    // three a, two b
  EXPECT_EQ(b, ModeOf<float>({{a, b, b},
                              {a, b, 6},
                              {3, 7, 8}}));    // different: three b, two a
  const double sum = 0.1 + 0.2;
  EXPECT_EQ(sum, ModeOf<double>({{sum, 0.3, 5},
                                 {0.3, 5,   5},
                                 // four of one value, and the first stands for it
                                 {0.3, 7,   8}}));
}

TEST(Mode, NoNumbersAndInfinitiesEqualNothing) {
  const double nan = std::numeric_limits<double>::quiet_NaN();
  const double inf = std::numeric_limits<double>::infinity();
  EXPECT_EQ(5, ModeOf<double>({{nan, nan, nan},
                               {nan, 5,   nan},
                               {nan, nan, nan}}));
  EXPECT_EQ(5, ModeOf<double>({{inf, inf, inf},
                               {inf, 5,   inf},
                               {inf, inf, inf}}));
  EXPECT_TRUE(std::isnan(ModeOf<double>({{nan, nan, nan}, {nan, nan, nan}, {nan, nan, nan}})));
}

const Picture<int> kSteps = {{1, 2, 3, 4, 5, 6}};

TEST(Mode, HalvingByRatioMapsToEvenColumns) {
  Mode<int> kernel;
  kernel.SetRatio(0.5, 1);
  const auto src = BlockOf<int>(kSteps, kMargin);
  // Columns 0, 2, 4: the margin's 1 makes the first a majority; in a tie the left one wins.
  EXPECT_EQ((Picture<int>{{1, 2, 4}}), Resampled<int>(kernel, *src, nullptr, 3, 1));
}

TEST(Mode, HalvingByGroundCoordinatesMapsToTheColumnOfTheCentre) {
  Mode<int> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 0, 0, 2, 1);
  const auto src = BlockOf<int>(kSteps, kMargin);
  // Columns 1, 3, 5: here the margin's 6 makes the last a majority.
  EXPECT_EQ((Picture<int>{{1, 3, 6}}), Resampled<int>(kernel, *src, nullptr, 3, 1));
}

TEST(Mode, GroundCoordinatesJustLeftOfTheBlockAreItsFirstColumn) {
  Mode<int> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, -1, 0, 1, 1);   // -0.5 is cut to 0, not rounded down to -1
  kernel.SetNoDataValue(99);
  const auto src = BlockOf<int>(kSteps, kMargin);
  const auto mask = MaskOf(*src, {"x....."});
  EXPECT_EQ((Picture<int>{{99}}), Resampled<int>(kernel, *src, mask.get(), 1, 1));
}

TEST(Mode, PixelsPastTheMarginAreReadAtTheBuffersEdge) {
  Mode<int> kernel;
  kernel.SetRatio(0.125, 1);   // column 1 maps to column 8 of 6
  const auto src = BlockOf<int>(kSteps, kMargin);
  EXPECT_EQ(6, Resampled<int>(kernel, *src, nullptr, 2, 1)[0][1]);
}

}  // namespace
}  // namespace orin::resamplers
