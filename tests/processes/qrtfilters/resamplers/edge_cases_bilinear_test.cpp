/// Bilinear at its corners: halving, identity, rounding, masks.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <limits>

#include "processes/qrtfilters/resamplers/bilinear.h"
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

template <class T>
T HalfOf(const Picture<T>& square, const std::vector<const char*>& noData = {}, double fill = 0) {
  Bilinear<T> kernel;
  kernel.SetNoDataValue(fill);
  const auto src = BlockOf<T>(square, kMargin);
  const auto mask = noData.empty() ? nullptr : MaskOf(*src, noData);
  return Resampled<T>(kernel, *src, mask.get(), 1, 1)[0][0];
}

TEST(Bilinear, HalvingGivesTheMeanOfFourRoundedToTheType) {
  EXPECT_EQ(26, HalfOf<uint8_t>({{1, 2},
                                 {0, 99}}));   // 25.5
  EXPECT_EQ(-26, HalfOf<short>({{-1, -2},
                                {0, -99}}));
  EXPECT_EQ(255, HalfOf<uint8_t>({{255, 254},
                                  {254, 255}}));   // 254.5
  EXPECT_EQ(-1, HalfOf<signed char>({{-1, 0},
                                     {0, -1}}));   // -0.5
  EXPECT_EQ(0, HalfOf<int64_t>({{-7, -7},
                                {-7, -7}}));
  EXPECT_EQ(25.5f, HalfOf<float>({{1, 2},
                                  {0, 99}}));
}

TEST(Bilinear, HalvingTakesEachSquareOnce) {
  Bilinear<int> kernel;
  const auto src = BlockOf<int>({{1, 3, 10, 30},
                                 {5, 7, 50, 70}}, kMargin);
  EXPECT_EQ((Picture<int>{{4, 40}}), Resampled<int>(kernel, *src, nullptr, 2, 1));
}

template <class T>
void ExpectIdentity(const Picture<T>& picture) {
  Bilinear<T> kernel;
  kernel.SetRatio(1, 1);
  const auto src = BlockOf<T>(picture, kMargin);
  const auto height = static_cast<uint32_t>(picture.size());
  const auto width = static_cast<uint32_t>(picture[0].size());
  EXPECT_EQ(picture, Resampled<T>(kernel, *src, nullptr, width, height));
}

TEST(Bilinear, RatioOneIsTheIdentityUpToThirtyTwoBits) {
  const auto pictureOf = []<class T>(std::type_identity<T>) {
    using Limits = std::numeric_limits<T>;
    ExpectIdentity<T>({{Limits::lowest(), T{0}, Limits::max()},
                       {T{1}, static_cast<T>(Limits::max() - 1), T{7}}});
  };
  pictureOf(std::type_identity<signed char>{});
  pictureOf(std::type_identity<unsigned char>{});
  pictureOf(std::type_identity<short>{});
  pictureOf(std::type_identity<unsigned short>{});
  pictureOf(std::type_identity<int>{});
  pictureOf(std::type_identity<unsigned int>{});
  ExpectIdentity<float>({{-1.25f, 3e38f, 1e-40f}});
}

TEST(Bilinear, RatioOneMakesNegativeSixtyFourBitValuesZero) {
  Bilinear<int64_t> kernel;
  kernel.SetRatio(1, 1);
  const auto src = BlockOf<int64_t>({{-5, 5}}, kMargin);
  EXPECT_EQ((Picture<int64_t>{{0, 5}}), Resampled<int64_t>(kernel, *src, nullptr, 2, 1));
}

TEST(Bilinear, ClearCornerGivesItsWeightToTheUpperLeftOne) {
  EXPECT_EQ((10 + 20 + 30 + 10) / 4.0, HalfOf<double>({{10, 20},
                                                       {30, 99}}, {"..", ".x"}));
  EXPECT_EQ((10 + 10 + 30 + 50) / 4.0, HalfOf<double>({{10, 99},
                                                       {30, 50}}, {".x", ".."}));
  EXPECT_EQ((10 + 20 + 10 + 50) / 4.0, HalfOf<double>({{10, 20},
                                                       {99, 50}}, {"..", "x."}));
}

TEST(Bilinear, ClearUpperLeftGivesNoDataThoughTheOthersAreValid) {
  EXPECT_EQ(-9, HalfOf<short>({{10, 20},
                               {30, 40}}, {"x.", ".."}, -9));
}

TEST(Bilinear, FloatSumsAreNotRounded) {
  EXPECT_EQ(0.25f * 0.1f + 0.25f * 0.2f + 0.25f * 0.3f + 0.25f * 0.4f,
            HalfOf<float>({{0.1f, 0.2f},
                           {0.3f, 0.4f}}));
}

TEST(Bilinear, WeightsFollowThePositionInBothDirections) {
  Bilinear<double> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 0.25, 0.125, 1, 1);   // x = 0.25, y = 0.125
  const auto src = BlockOf<double>({{0, 64},
                                    {128, 512}}, kMargin);
  const double expected = 64 * 0.25 * 0.875 + 128 * 0.75 * 0.125 + 512 * 0.25 * 0.125;
  EXPECT_EQ((Picture<double>{{expected}}), Resampled<double>(kernel, *src, nullptr, 1, 1));
}

TEST(Bilinear, EnlargementReadsTheMarginLeftAndAbove) {
  Bilinear<double> kernel;   // ratio 2: x = -0.25, 0.25, 0.75, 1.25
  const auto src = BlockOf<double>({{8, 16}}, kMargin);
  const auto view = gobs::ViewOf<double>(*src, 1);
  for (int64_t y = -1; y < 2; ++y) *view.At(-1, y) = 0;
  EXPECT_EQ((Picture<double>{{6, 10, 14, 16}}), Resampled<double>(kernel, *src, nullptr, 4, 1));
}

TEST(Bilinear, NoDataValueIsRoundedAndLimited) {
  const Picture<uint8_t> square = {{1, 1}, {1, 1}};
  EXPECT_EQ(255, HalfOf<uint8_t>(square, {"x.", ".."}, 300));
  EXPECT_EQ(8, HalfOf<uint8_t>(square, {"x.", ".."}, 7.5));
}

}  // namespace
}  // namespace orin::resamplers
