/// Bicubic at its corners: the cubic step, single precision, masks.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <limits>

#include "processes/qrtfilters/resamplers/bicubic.h"
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

constexpr Shape kMargin{1, 3, 3, false};

/// The value half way between columns 1 and 2 of four samples; every line is the same.
template <class T>
T BetweenOf(const std::vector<T>& samples) {
  Bicubic<T> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 1.5, 0, 1, 1);
  const auto src = BlockOf<T>({samples}, kMargin);
  return Resampled<T>(kernel, *src, nullptr, 1, 1)[0][0];
}

TEST(Bicubic, CubicGoesThroughTheSamplesAndMayOvershoot) {
  EXPECT_EQ(127.5f, BetweenOf<float>({0, 0, 255, 255}));
  EXPECT_EQ(128, BetweenOf<uint8_t>({0, 0, 255, 255}));
  EXPECT_EQ(143.4375, BetweenOf<double>({0, 255, 0, 0}));
  EXPECT_EQ(286.875f, BetweenOf<float>({0, 255, 255, 0}));
  EXPECT_EQ(255, BetweenOf<uint8_t>({0, 255, 255, 0}));
  EXPECT_EQ(0, BetweenOf<uint8_t>({255, 0, 0, 255}));
  EXPECT_EQ(-32, BetweenOf<short>({255, 0, 0, 255}));   // -31.875
  EXPECT_EQ(0, BetweenOf<int64_t>({255, 0, 0, 255}));
}

TEST(Bicubic, LinesAreBlendedBeforeColumns) {
  Bicubic<double> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 0, 1.5, 1, 1);
  const auto src = BlockOf<double>({{0}, {255}, {0}, {0}}, kMargin);
  EXPECT_EQ((Picture<double>{{143.4375}}), Resampled<double>(kernel, *src, nullptr, 1, 1));
}

template <class T>
T IdentityOf(T value) {
  Bicubic<T> kernel;
  kernel.SetRatio(1, 1);
  const auto src = BlockOf<T>({{value, T{3}}, {T{9}, T{1}}}, kMargin);
  return Resampled<T>(kernel, *src, nullptr, 2, 2)[0][0];
}

template <class T>
void ExpectIdentity() {
  using Limits = std::numeric_limits<T>;
  for (const T value : {Limits::lowest(), Limits::max(), T{0}, T{1}})
    EXPECT_EQ(value, IdentityOf(value));
}

TEST(Bicubic, RatioOneIsTheIdentityUpToSixteenBitsAndForFloat) {
  ExpectIdentity<signed char>();
  ExpectIdentity<unsigned char>();
  ExpectIdentity<short>();
  ExpectIdentity<unsigned short>();
  for (const float value : {-1.25f, 1e30f, 1e-40f}) EXPECT_EQ(value, IdentityOf(value));
}

TEST(Bicubic, WiderTypesPassThroughSinglePrecision) {
  EXPECT_EQ(16777216u, IdentityOf<unsigned int>(16777217));
  EXPECT_EQ(0.10000000149011612, IdentityOf<double>(0.1));
  EXPECT_EQ(16777216, IdentityOf<int64_t>(16777217));
  EXPECT_EQ(0, IdentityOf<int64_t>(-5));
  EXPECT_EQ(2147483647, IdentityOf<int>(2147483647));
}

TEST(Bicubic, DifferencesOfSamplesAreTakenInSinglePrecision) {
  // The difference 16777217 is no float and becomes 16777216; kept whole it would give 8388607.5.
  EXPECT_NEAR(8388607.0, BetweenOf<double>({-1, -1, 16777216, 16777216}), 0.001);
}

TEST(Bicubic, ClearCentreGivesNoData) {
  Bicubic<short> kernel;
  kernel.SetRatio(1, 1);
  kernel.SetNoDataValue(-9.5);
  const auto src = BlockOf<short>({{1, 2, 3}}, kMargin);
  const auto mask = MaskOf(*src, {".x."});
  EXPECT_EQ((Picture<short>{{1, -10, 3}}), Resampled<short>(kernel, *src, mask.get(), 3, 1));
}

TEST(Bicubic, ClearNeighbourTakesTheValueOfTheCentre) {
  const Picture<double> bright = {{10, 10, 10, 10},
                                  {10, 10, 10, 10},
                                  {10, 10, 10, 10},
                                  {10, 10, 10, 999}};
  Bicubic<double> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 1.5, 1.5, 1, 1);
  const auto src = BlockOf<double>(bright, kMargin);
  const auto mask = MaskOf(*src, {"....",
                                  "....",
                                  "....",
                                  "...x"});
  EXPECT_NE((Picture<double>{{10}}), Resampled<double>(kernel, *src, nullptr, 1, 1));
  EXPECT_EQ((Picture<double>{{10}}), Resampled<double>(kernel, *src, mask.get(), 1, 1));
}

TEST(Bicubic, AllNeighboursClearLeaveTheCentre) {
  Bicubic<double> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 1.3, 1.7, 1, 1);
  const auto src = BlockOf<double>({{1, 2, 3, 4},
                                    {5, 64, 7, 8},
                                    {9, 1, 2, 3},
                                    {4, 5, 6, 7}}, kMargin);
  const auto mask = MaskOf(*src, {"xxxx",
                                  "x.xx",
                                  "xxxx",
                                  "xxxx"});
  EXPECT_EQ((Picture<double>{{64}}), Resampled<double>(kernel, *src, mask.get(), 1, 1));
}

TEST(Bicubic, HalvingReadsOnePixelLeftAndTwoRight) {
  Bicubic<double> kernel;
  kernel.SetRatio(0.5, 1);   // x = 0.5, 2.5
  const auto src = BlockOf<double>({{0, 255, 0, 0}}, kMargin);
  const auto view = gobs::ViewOf<double>(*src, 1);
  *view.At(-1, 0) = 0;
  // Samples 0, 0, 255, 0 and 255, 0, 0, 0 half way.
  const auto half = Resampled<double>(kernel, *src, nullptr, 2, 1);
  EXPECT_EQ((Picture<double>{{143.4375, -15.9375}}), half);
}

TEST(Bicubic, SamplesOf64BitsAreNarrowedAtOnceNotThroughDouble) {
  // Single precision has steps of 2^37 there. Half a step and one is above the middle; double, with
  // steps of 2^8, loses the one, and the tie goes down.
  constexpr int64_t kBase = int64_t{1} << 60;
  constexpr int64_t kValue = kBase + (int64_t{1} << 36) + 1;
  constexpr int64_t kUp = kBase + (int64_t{1} << 37);
  EXPECT_EQ(kUp, BetweenOf<int64_t>({kValue, kValue, kValue, kValue}));
  EXPECT_EQ(uint64_t{kUp}, BetweenOf<uint64_t>({kValue, kValue, kValue, kValue}));
}

}  // namespace
}  // namespace orin::resamplers
