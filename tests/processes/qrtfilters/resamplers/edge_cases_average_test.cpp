/// Average at its corners: both exact reductions, the general path, masks, complex samples.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "host/services/exception.h"
#include "processes/qrtfilters/resamplers/average.h"
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
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// The mean of a whole picture in one pixel.
template <class T>
T MeanOf(const Picture<T>& picture, const std::vector<const char*>& noData = {}, double fill = 0) {
  Average<T> kernel;
  kernel.SetNoDataValue(fill);
  const auto src = BlockOf<T>(picture, kMargin);
  const auto mask = noData.empty() ? nullptr : MaskOf(*src, noData);
  return Resampled<T>(kernel, *src, mask.get(), 1, 1)[0][0];
}

TEST(AverageByTwo, OneValidSampleOfFourIsNoDataAndTwoAreTheirMean) {
  const Picture<uint8_t> square = {{10, 20},
                                   {30, 50}};
  EXPECT_EQ(99, MeanOf<uint8_t>(square, {"x.", "xx"}, 99));
  EXPECT_EQ(99, MeanOf<uint8_t>(square, {"xx", "xx"}, 99));
  EXPECT_EQ(35, MeanOf<uint8_t>(square, {"x.", "x."}, 99));
  EXPECT_EQ(33, MeanOf<uint8_t>(square, {"x.", ".."}, 99));
  EXPECT_EQ(28, MeanOf<uint8_t>(square, {}, 99));
}

TEST(AverageByThree, FourValidSamplesOfNineAreNoDataAndFiveAreTheirMean) {
  const Picture<uint8_t> square = {{1, 2, 3},
                                   {4, 5, 6},
                                   {7, 8, 100}};
  EXPECT_EQ(99, MeanOf<uint8_t>(square, {"..x", "x.x", ".xx"}, 99));
  EXPECT_EQ(5, MeanOf<uint8_t>(square, {"..x", "x.x", "..x"}, 99));   // 23 of five
  EXPECT_EQ(15, MeanOf<uint8_t>(square, {}, 99));                     // 136 of nine
}

TEST(Average, HalvesAreRoundedAwayFromZero) {
  EXPECT_EQ(2, MeanOf<uint8_t>({{1, 2}, {1, 2}}));
  EXPECT_EQ(-2, MeanOf<signed char>({{-1, -2}, {-1, -2}}));
  EXPECT_EQ(-2, MeanOf<short>({{-1, -2}, {-1, -2}}));
  EXPECT_EQ(1.5f, MeanOf<float>({{1, 2}, {1, 2}}));
}

TEST(Average, SixtyFourBitMeansAreCutAndNeverNegative) {
  EXPECT_EQ(1, MeanOf<int64_t>({{1, 2}, {1, 2}}));
  EXPECT_EQ(0, MeanOf<int64_t>({{-10, -20}, {-10, -20}}));
  EXPECT_EQ(1u, MeanOf<uint64_t>({{1, 2}, {1, 2}}));
  const int64_t top = std::numeric_limits<int64_t>::max();
  EXPECT_EQ(top, MeanOf<int64_t>({{top, top}, {top, top}}));
}

TEST(Average, SamplesThatAreNoNumbersStayInFloatsOnly) {
  const float nan = std::numeric_limits<float>::quiet_NaN();
  EXPECT_TRUE(std::isnan(MeanOf<float>({{1, nan}, {1, 2}})));
  EXPECT_EQ(0, MeanOf<int>({{5}}, {"x"}, kNaN));
}

TEST(AverageByTwo, LastRowStandsInForRowsPastItButColumnsReadTheMargin) {
  Average<uint8_t> kernel;
  kernel.SetRatio(0.5, 0.5);
  const auto src = BlockOf<uint8_t>({{10, 20, 30}}, kMargin);
  const auto view = gobs::ViewOf<uint8_t>(*src, 1);
  for (int64_t x = -1; x < 4; ++x) *view.At(x, 1) = 250;   // the row below is not read
  *view.At(3, 0) = 50;                                     // the column to the right is
  EXPECT_EQ((Picture<uint8_t>{{15, 40}}), Resampled<uint8_t>(kernel, *src, nullptr, 2, 1));
}

TEST(AverageByTwo, ReadsNothingOutsideABlockWithoutMargin) {
  Average<uint8_t> kernel;
  kernel.SetRatio(0.5, 0.5);
  const auto src = BlockOf<uint8_t>({{10, 20, 30}});
  EXPECT_EQ((Picture<uint8_t>{{15, 30, 30}}), Resampled<uint8_t>(kernel, *src, nullptr, 3, 1));
}

TEST(Average, OnlyExactRatiosOfOneChannelDoWithoutAMargin) {
  const auto src = BlockOf<uint8_t>({{10, 20, 30}, {10, 20, 30}, {10, 20, 30}});
  Average<uint8_t> kernel;
  for (const double ratio : {0.5, 1.0 / 3, 0.3333333333333333}) {
    kernel.SetRatio(ratio, ratio);
    EXPECT_NO_THROW(Resampled<uint8_t>(kernel, *src, nullptr, 1, 1)) << ratio;
  }
  for (const auto& [x, y] : {std::pair{0.5000000000000001, 0.5}, {0.5, 0.25}, {0.25, 0.25},
                             {0.33333333333333337, 0.33333333333333337}, {1.0 / 3, 0.5}}) {
    kernel.SetRatio(x, y);
    EXPECT_THROW(Resampled<uint8_t>(kernel, *src, nullptr, 1, 1), Exception) << x << ", " << y;
  }
}

TEST(Average, ExactPathLeavesClearSamplesOutAndTheGeneralPathPutsTheCentreInstead) {
  Average<uint8_t> kernel;
  kernel.SetRatio(0.5, 0.5);
  const auto one = BlockOf<uint8_t>({{10, 40},
                                     {40, 40}}, kMargin);
  const auto oneMask = MaskOf(*one, {"..", ".x"});
  EXPECT_EQ((Picture<uint8_t>{{30}}), Resampled<uint8_t>(kernel, *one, oneMask.get(), 1, 1));
  const auto two = BlockOf<uint8_t>({{10, 1, 40, 1},
                                     {40, 1, 40, 1}}, {2, 1, 1, false});
  const auto twoMask = MaskOf(*two, {"..", ".x"});
  EXPECT_EQ((Picture<uint8_t>{{25, 1}}), Resampled<uint8_t>(kernel, *two, twoMask.get(), 1, 1));
}

TEST(Average, GroundCoordinatesOfAReductionTakeTheGeneralPath) {
  Average<uint8_t> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 0, 0, 2, 2);
  kernel.SetNoDataValue(99);
  const auto src = BlockOf<uint8_t>({{10, 40},
                                     {40, 80}}, kMargin);
  const auto onlyCentre = MaskOf(*src, {"xx", "x."});   // the centre of 2 x 2 is its lower right
  EXPECT_EQ((Picture<uint8_t>{{80}}), Resampled<uint8_t>(kernel, *src, onlyCentre.get(), 1, 1));
  const auto allButCentre = MaskOf(*src, {"..", ".x"});
  EXPECT_EQ((Picture<uint8_t>{{99}}), Resampled<uint8_t>(kernel, *src, allButCentre.get(), 1, 1));
}

TEST(Average, GroundCoordinatesOfAnEnlargementByTwoTakeTheExactPath) {
  Average<uint8_t> kernel;
  kernel.SetGeoReference(0, 0, 2, 2, 0, 0, 1, 1);   // ratio 0.5 by the size of a pixel
  const auto src = BlockOf<uint8_t>({{10, 20},
                                     {30, 40}});      // no margin: the general path would refuse
  EXPECT_EQ((Picture<uint8_t>{{25}}), Resampled<uint8_t>(kernel, *src, nullptr, 1, 1));
}

TEST(Average, GroundDistancesAreCutToWholeNumbersBeforeTheyAreDivided) {
  Average<uint8_t> kernel;
  // From 0.9 to 2.4: cut to 0 and 2, and divided by 0.5, that is columns 0 to 3; not 1 to 3.
  kernel.SetGeoReference(0, 0, 0.5, 1, 0.9, 0, 1.5, 1);
  const auto src = BlockOf<uint8_t>({{10, 20, 30, 40, 50, 60}}, kMargin);
  EXPECT_EQ((Picture<uint8_t>{{25}}), Resampled<uint8_t>(kernel, *src, nullptr, 1, 1));
}

TEST(Average, FootprintsOfUnevenRatiosStartAndEndRoundedDown) {
  Average<float> kernel;
  kernel.SetRatio(0.4, 1);   // 0..1, 2..4, 5..6, 7..9
  const auto src = BlockOf<float>({{1, 2, 4, 8, 16, 32, 64, 3, 6, 9}}, kMargin);
  EXPECT_EQ((Picture<float>{{1.5f, static_cast<float>(28.0 / 3), 48, 6}}),
            Resampled<float>(kernel, *src, nullptr, 4, 1));
}

TEST(Average, EnlargementWithAnEmptyFootprintGivesNoData) {
  Average<uint8_t> kernel;
  kernel.SetRatio(2, 1);
  kernel.SetNoDataValue(99);
  const auto src = BlockOf<uint8_t>({{10, 20}}, kMargin);
  EXPECT_EQ((Picture<uint8_t>{{99, 10, 99, 20}}), Resampled<uint8_t>(kernel, *src, nullptr, 4, 1));
}

TEST(Average, ClearNeighbourOfAValidCentreCountsAsTheCentre) {
  Average<uint8_t> kernel;
  kernel.SetRatio(0.25, 1);
  const auto src = BlockOf<uint8_t>({{10, 100, 20, 30}}, kMargin);
  const auto mask = MaskOf(*src, {".x.."});
  // 70 / 4
  EXPECT_EQ((Picture<uint8_t>{{18}}), Resampled<uint8_t>(kernel, *src, mask.get(), 1, 1));
}

TEST(Average, ClearCentreGivesNoDataInEveryChannel) {
  Average<short> kernel;
  kernel.SetNoDataValue(-5);
  const auto src = BlockOf<short>({{1, 2, 3, 4}}, {2, 1, 1, false});
  const auto mask = MaskOf(*src, {"x."});
  EXPECT_EQ((Picture<short>{{-5, -5}}), Resampled<short>(kernel, *src, mask.get(), 1, 1));
}

TEST(Average, WritesAsManyChannelsAsTheDestinationHas) {
  Average<uint8_t> kernel;
  const auto src = BlockOf<uint8_t>({{10, 200, 20, 100},
                                     {10, 200, 20, 100}}, {2, 1, 1, false});
  const auto one = testing::EmptyBlock<uint8_t>(1, 1, {1, 0, 0, false}, 77);
  kernel.Resample(src.get(), nullptr, one.get());
  EXPECT_EQ((Picture<uint8_t>{{15}}), testing::PictureOf<uint8_t>(*one));
  const auto three = testing::EmptyBlock<uint8_t>(1, 1, {3, 0, 0, false}, 77);
  kernel.Resample(src.get(), nullptr, three.get());   // channel 2 is the next pixel's channel 0
  EXPECT_EQ((Picture<uint8_t>{{15, 150, 20}}), testing::PictureOf<uint8_t>(*three));
}

TEST(Average, ChannelsThatTheSourceLacksNeverReadPastItsBuffer) {
  Average<uint8_t> kernel;
  const auto src = BlockOf<uint8_t>({{10}}, kMargin);
  const auto dst = testing::EmptyBlock<uint8_t>(1, 1, {40, 0, 0, false}, 77);
  kernel.Resample(src.get(), nullptr, dst.get());
  EXPECT_EQ((Picture<uint8_t>{std::vector<uint8_t>(40, 10)}), testing::PictureOf<uint8_t>(*dst));
}

/// The complex mean of a picture of (re, im) pairs in one pixel.
template <class T>
std::vector<T> ComplexMeanOf(const Picture<T>& picture, double ratio) {
  Average<T> kernel;
  kernel.SetComplex(true);
  kernel.SetRatio(ratio, ratio);
  const auto src = BlockOf<T>(picture, {1, 1, 1, true});
  return Resampled<T>(kernel, *src, nullptr, 1, 1)[0];
}

template <class T>
std::vector<std::vector<T>> BothPaths(const std::vector<T>& two) {
  const Picture<T> square = {two, two};
  std::vector<T> four = two;
  four.insert(four.end(), two.begin(), two.end());
  return {ComplexMeanOf<T>(square, 0.5), ComplexMeanOf<T>({four, four, four, four}, 0.25)};
}

TEST(AverageComplex, MeanPointsAlongTheSumAndHasTheMeanMagnitude) {
  for (const auto& mean : BothPaths<double>({3, 4, 4, 3})) {   // magnitudes 5 and 5, along (1, 1)
    EXPECT_NEAR(5 / std::sqrt(2.0), mean[0], 1e-12);
    EXPECT_NEAR(5 / std::sqrt(2.0), mean[1], 1e-12);
  }
  for (const auto& mean : BothPaths<short>({30, 0, 0, 10}))   // magnitude 20 along (3, 1)
    EXPECT_EQ((std::vector<short>{19, 6}), mean);
}

TEST(AverageComplex, SumOfZeroIsZeroInIntegersAndNoNumberInFloats) {
  for (const auto& mean : BothPaths<int>({7, -3, -7, 3})) EXPECT_EQ((std::vector<int>{0, 0}), mean);
  for (const auto& mean : BothPaths<float>({7, -3, -7, 3}))
    EXPECT_TRUE(std::isnan(mean[0]) && std::isnan(mean[1]));
}

TEST(AverageComplex, LargeIntegersWrapRoundInTheirSquares) {
  // 32768 * 32768 * 2 is 2^31 and wraps to a negative number, whose root is no number.
  for (const auto& mean : BothPaths<short>({-32768, -32768, -32768, -32768}))
    EXPECT_EQ((std::vector<short>{0, 0}), mean);
  for (const auto& mean : BothPaths<unsigned short>({65535, 0, 65535, 0}))   // as signed: < 0
    EXPECT_EQ((std::vector<unsigned short>{0, 0}), mean);
  for (const auto& mean : BothPaths<unsigned int>({65535, 0, 65535, 0}))     // unsigned: fits
    EXPECT_EQ((std::vector<unsigned int>{65535, 0}), mean);
  for (const auto& mean : BothPaths<unsigned int>({65536, 7, 65536, 7}))   // wraps to 49
    EXPECT_EQ((std::vector<unsigned int>{7, 0}), mean);
  for (const auto& mean : BothPaths<int64_t>({65536, 0, 65536, 0}))
    EXPECT_EQ((std::vector<int64_t>{65536, 0}), mean);
  for (const auto& mean : BothPaths<uint64_t>({4000000000, 0, 4000000000, 0}))   // 1.6e19 >= 2^63
    EXPECT_EQ((std::vector<uint64_t>{4000000000, 0}), mean);
}

TEST(AverageComplex, NoDataIsRealInTheExactPathAndFillsComponentsInTheGeneralOne) {
  Average<short> kernel;
  kernel.SetComplex(true);
  kernel.SetNoDataValue(-5);
  const auto one = BlockOf<short>({{1, 2, 3, 4}, {1, 2, 3, 4}}, {1, 1, 1, true});
  const auto oneMask = MaskOf(*one, {"xx", "xx"});
  EXPECT_EQ((Picture<short>{{-5, 0}}), Resampled<short>(kernel, *one, oneMask.get(), 1, 1));
  const auto two = BlockOf<short>({{1, 2, 3, 4, 1, 2, 3, 4}}, {2, 1, 1, true});
  const auto twoMask = MaskOf(*two, {"xx"});
  EXPECT_EQ((Picture<short>{{-5, -5, 0, 0}}), Resampled<short>(kernel, *two, twoMask.get(), 1, 1));
}

/// The mean of 300 x 300 equal pixels: their sum takes more than 32 bits.
template <class T>
T MeanOfManyPixels(T value) {
  constexpr uint32_t kSide = 300;
  Average<T> kernel;
  kernel.SetRatio(1.0 / kSide, 1.0 / kSide);
  const auto src = testing::EmptyBlock<T>(kSide, kSide, kMargin, value);
  return Resampled<T>(kernel, *src, nullptr, 1, 1)[0][0];
}

TEST(AverageOfManyPixels, SumsOfSmallIntegersTakeMoreThan32Bits) {
  EXPECT_EQ(65535, MeanOfManyPixels<uint16_t>(65535));
  EXPECT_EQ(-32768, MeanOfManyPixels<int16_t>(-32768));
  EXPECT_EQ(32767, MeanOfManyPixels<int16_t>(32767));
  EXPECT_EQ(255, MeanOfManyPixels<uint8_t>(255));
  EXPECT_EQ(-128, MeanOfManyPixels<int8_t>(-128));
}

/// The general path with these offsets, at origins that are equal: the offsets are the caller's.
Picture<uint8_t> AveragedAt(double offsetX, double offsetY) {
  Average<uint8_t> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 0, 0, 2, 2);
  const auto src = BlockOf<uint8_t>({{10, 12, 20, 22},
                                     {10, 12, 20, 22},
                                     {30, 32, 40, 42},
                                     {30, 32, 40, 42}}, kMargin);
  const auto dst = testing::EmptyBlock<uint8_t>(1, 1, {1, 0, 0, false}, uint8_t{77});
  kernel.ResampleGeneral(src.get(), nullptr, dst.get(), 0.5, 0.5, offsetX, offsetY);
  return testing::PictureOf<uint8_t>(*dst);
}

TEST(AverageGeneral, GoesByTheOffsetsThatItIsGivenNotByItsOwnOrigins) {
  EXPECT_EQ((Picture<uint8_t>{{11}}), AveragedAt(0, 0));
  EXPECT_EQ((Picture<uint8_t>{{21}}), AveragedAt(2, 0));
  EXPECT_EQ((Picture<uint8_t>{{31}}), AveragedAt(0, 2));
  EXPECT_EQ((Picture<uint8_t>{{41}}), AveragedAt(2, 2));
}

TEST(AverageGeneral, GoesByTheRatiosThatItIsGivenNotByItsOwn) {
  Average<uint8_t> kernel;
  kernel.SetRatio(1, 1);
  const auto src = BlockOf<uint8_t>({{10, 12, 50, 50},
                                     {30, 32, 50, 50}}, kMargin);
  const auto dst = testing::EmptyBlock<uint8_t>(1, 1, {1, 0, 0, false}, uint8_t{77});
  kernel.ResampleGeneral(src.get(), nullptr, dst.get(), 0.5, 1, 0, 0);
  EXPECT_EQ((Picture<uint8_t>{{11}}), testing::PictureOf<uint8_t>(*dst));
  kernel.ResampleGeneral(src.get(), nullptr, dst.get(), 1, 0.5, 0, 0);
  EXPECT_EQ((Picture<uint8_t>{{20}}), testing::PictureOf<uint8_t>(*dst));
}

}  // namespace
}  // namespace orin::resamplers
