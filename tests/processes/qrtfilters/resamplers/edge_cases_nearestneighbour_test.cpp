/// Nearest neighbour at its corners: mappings, ends of the block, no data.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <limits>

#include "host/services/exception.h"
#include "processes/qrtfilters/resamplers/nearestneighbour.h"
#include "tests/processes/qrtfilters/resamplers/blocks.h"

// Pictures keep their lines.
// clang-format off

namespace orin::resamplers {
namespace {

using testing::BlockOf;
using testing::ClearMaskOf;
using testing::EmptyBlock;
using testing::MaskOf;
using testing::Picture;
using testing::PictureOf;
using testing::Resampled;
using testing::Shape;

const Picture<uint8_t> kSquare = {{1, 2, 3, 4},
                                  {5, 6, 7, 8},
                                  {9, 10, 11, 12},
                                  {13, 14, 15, 16}};

TEST(NearestNeighbour, HalvingTakesEvenColumnsAndRows) {
  NearestNeighbour<uint8_t> kernel;
  const auto src = BlockOf<uint8_t>(kSquare);
  EXPECT_EQ((Picture<uint8_t>{{1, 3},
                              {9, 11}}), Resampled<uint8_t>(kernel, *src, nullptr, 2, 2));
}

TEST(NearestNeighbour, HalvingByGroundCoordinatesTakesOddColumnsAndRows) {
  NearestNeighbour<uint8_t> kernel;
  kernel.SetRatio(0.25, 0.25);   // loses against ground coordinates
  kernel.SetGeoReference(100, 200, 1, 1, 100, 200, 2, 2);
  kernel.ClearRatio();
  const auto src = BlockOf<uint8_t>(kSquare, {1, 1, 2, false});
  EXPECT_EQ((Picture<uint8_t>{{6, 8},
                              {14, 16}}), Resampled<uint8_t>(kernel, *src, nullptr, 2, 2));
}

TEST(NearestNeighbour, GivenRatioWinsOverSizes) {
  NearestNeighbour<uint8_t> kernel;
  kernel.SetRatio(1, 0.5);
  const auto src = BlockOf<uint8_t>(kSquare);
  EXPECT_EQ((Picture<uint8_t>{{1, 2},
                              {9, 10}}), Resampled<uint8_t>(kernel, *src, nullptr, 2, 2));
  kernel.ClearRatio();
  EXPECT_EQ((Picture<uint8_t>{{1, 3},
                              {9, 11}}), Resampled<uint8_t>(kernel, *src, nullptr, 2, 2));
}

TEST(NearestNeighbour, WiderDestinationRepeatsPixelsAndStopsAtTheLastOne) {
  NearestNeighbour<uint8_t> kernel;
  const auto src = BlockOf<uint8_t>({{7, 9}});
  EXPECT_EQ((Picture<uint8_t>{{7, 7, 7, 9, 9}}), Resampled<uint8_t>(kernel, *src, nullptr, 5, 1));
  kernel.SetRatio(1, 1);
  EXPECT_EQ((Picture<uint8_t>{{7, 9, 9, 9, 9}}), Resampled<uint8_t>(kernel, *src, nullptr, 5, 1));
}

TEST(NearestNeighbour, CoordinatesJustBelowZeroReadTheFirstPixelAndFurtherOnesTheLast) {
  NearestNeighbour<uint8_t> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, -3, 0, 1, 1);   // columns -2.5, -1.5, -0.5, 0.5
  const auto src = BlockOf<uint8_t>({{1, 2, 3, 4}});
  EXPECT_EQ((Picture<uint8_t>{{4, 4, 1, 1}}), Resampled<uint8_t>(kernel, *src, nullptr, 4, 1));
}

TEST(NearestNeighbour, ColumnNumbersStartAgainBeyondThirtyTwoBits) {
  NearestNeighbour<uint8_t> kernel;
  kernel.SetGeoReference(0, 0, 1, 1, 4294967298.0, 0, 1, 1);
  const auto src = BlockOf<uint8_t>({{1, 2, 3, 4}});
  EXPECT_EQ((Picture<uint8_t>{{3, 4, 4}}), Resampled<uint8_t>(kernel, *src, nullptr, 3, 1));
}

TEST(NearestNeighbour, CoordinatesThatNoIntegerHoldsReadInsideTheBlock) {
  const auto src = BlockOf<uint8_t>({{1, 2, 3, 4}});
  for (const double origin : {1e300, -1e300, std::numeric_limits<double>::quiet_NaN(),
                              std::numeric_limits<double>::infinity(), 9223372036854775808.0}) {
    NearestNeighbour<uint8_t> kernel;
    kernel.SetGeoReference(0, 0, 1, 1, origin, origin, 1, 1);
    const auto read = Resampled<uint8_t>(kernel, *src, nullptr, 2, 1);
    EXPECT_EQ((Picture<uint8_t>{{1, 1}}), read) << origin;
  }
}

template <class T>
T FillOf(double noData) {
  NearestNeighbour<T> kernel;
  kernel.SetNoDataValue(noData);
  const auto src = BlockOf<T>({{T{5}}});
  const auto mask = ClearMaskOf(*src);
  return Resampled<T>(kernel, *src, mask.get(), 1, 1)[0][0];
}

TEST(NearestNeighbour, NoDataValueBelowZeroStaysOnlyWhereTheTypeHoldsIt) {
  EXPECT_EQ(0, FillOf<uint8_t>(-1));
  EXPECT_EQ(0, FillOf<int64_t>(-1));
  EXPECT_EQ(-1, FillOf<short>(-1));
  EXPECT_EQ(0u, FillOf<uint64_t>(-1));
  EXPECT_EQ(-1.f, FillOf<float>(-1));
}

TEST(NearestNeighbour, NoDataValueBeyondTheTypeBecomesItsLimit) {
  EXPECT_EQ(127, FillOf<signed char>(126.5));
  EXPECT_EQ(-128, FillOf<signed char>(-1e9));
  EXPECT_EQ(-128, FillOf<signed char>(-128.4));
  EXPECT_EQ(255, FillOf<uint8_t>(254.5));
  EXPECT_EQ(254, FillOf<uint8_t>(254.4));
  EXPECT_EQ(32767, FillOf<short>(32767.4));
  EXPECT_EQ(65535, FillOf<unsigned short>(1e5));
  EXPECT_EQ(2147483647, FillOf<int>(1e10));
  EXPECT_EQ(std::numeric_limits<int>::min(), FillOf<int>(-1e10));
  EXPECT_EQ(4294967295u, FillOf<unsigned int>(1e10));
  EXPECT_EQ(std::numeric_limits<int64_t>::max(), FillOf<int64_t>(9223372036854775807.0));
  EXPECT_EQ(std::numeric_limits<uint64_t>::max(), FillOf<uint64_t>(18446744073709551616.0));
  EXPECT_EQ(9223372036854775808u, FillOf<uint64_t>(9223372036854775808.0));
}

TEST(NearestNeighbour, NoDataValueOfSixtyFourBitIntegersIsCutNotRounded) {
  EXPECT_EQ(2, FillOf<int64_t>(2.9));
  EXPECT_EQ(2u, FillOf<uint64_t>(2.9));
}

TEST(NearestNeighbour, NoDataValueThatIsNoNumberIsZeroInIntegers) {
  const double nan = std::numeric_limits<double>::quiet_NaN();
  EXPECT_EQ(0, FillOf<signed char>(nan));
  EXPECT_EQ(0u, FillOf<unsigned int>(nan));
  EXPECT_EQ(0, FillOf<int64_t>(nan));
  EXPECT_NE(FillOf<double>(nan), FillOf<double>(nan));
}

TEST(NearestNeighbour, ClearMaskFillsEveryChannelAndBothComponents) {
  NearestNeighbour<short> kernel;
  kernel.SetComplex(true);
  kernel.SetNoDataValue(-9);
  const auto src = BlockOf<short>({{1, 2, 3, 4}}, {2, 1, 1, true});
  const auto mask = ClearMaskOf(*src);
  EXPECT_EQ((Picture<short>{{-9, -9, -9, -9}}), Resampled<short>(kernel, *src, mask.get(), 1, 1));
}

TEST(NearestNeighbour, MaskIsAskedAtTheSourcePixelThatIsCopied) {
  NearestNeighbour<uint8_t> kernel;
  kernel.SetNoDataValue(200);
  const auto src = BlockOf<uint8_t>(kSquare, {1, 3, 1, false});
  const auto mask = MaskOf(*src, {".x.x",
                                  "xxxx",
                                  ".xxx",
                                  "xxxx"});
  EXPECT_EQ((Picture<uint8_t>{{1, 3},
                              {9, 200}}), Resampled<uint8_t>(kernel, *src, mask.get(), 2, 2));
}

/// A pixel of as many channels as asked for, each with a value of its own.
template <class T>
void ExpectWholePixelsCopied(uint32_t channels) {
  Picture<T> picture(2);
  for (uint32_t k = 0; k < 4 * channels; ++k)
    for (uint32_t y = 0; y < 2; ++y) picture[y].push_back(static_cast<T>(y * 60 + k + 1));
  Picture<T> expected{{picture[0].begin(), picture[0].begin() + channels}};
  expected[0].insert(expected[0].end(), picture[0].begin() + 2 * channels,
                     picture[0].begin() + 3 * channels);
  NearestNeighbour<T> kernel;
  const auto src = BlockOf<T>(picture, {channels, 0, 0, false});
  EXPECT_EQ(expected, Resampled<T>(kernel, *src, nullptr, 2, 1)) << channels << " channels";
}

TEST(NearestNeighbour, WholePixelsAreCopiedWhateverTheirSize) {
  for (const uint32_t channels : {1u, 2u, 3u, 4u, 5u, 6u, 7u, 12u}) {
    ExpectWholePixelsCopied<uint8_t>(channels);
    ExpectWholePixelsCopied<unsigned short>(channels);
    ExpectWholePixelsCopied<float>(channels);
    ExpectWholePixelsCopied<double>(channels);
  }
}

TEST(NearestNeighbour, OtherChannelCountIsRefusedAndNothingIsWritten) {
  NearestNeighbour<uint8_t> kernel;
  const auto src = BlockOf<uint8_t>(kSquare);
  const auto dst = EmptyBlock<uint8_t>(2, 2, Shape{3, 0, 0, false}, 77);
  const auto before = PictureOf<uint8_t>(*dst);
  try {
    kernel.Resample(src.get(), nullptr, dst.get());
    FAIL() << "nothing was thrown";
  } catch (const Exception& refusal) {
    EXPECT_EQ("Input and output rasters must have an equal number of channels. Aborting.",
              refusal.GetMessage());
    EXPECT_EQ("", refusal.GetSourceFile());
    EXPECT_EQ("", refusal.GetFunction());
    EXPECT_EQ(0u, refusal.GetLine());
  }
  EXPECT_EQ(before, PictureOf<uint8_t>(*dst));
}

TEST(NearestNeighbour, DestinationWithoutPixelsIsNoWork) {
  NearestNeighbour<uint8_t> kernel;
  const auto src = BlockOf<uint8_t>(kSquare);
  EXPECT_TRUE(Resampled<uint8_t>(kernel, *src, nullptr, 4, 0).empty());
  EXPECT_TRUE(Resampled<uint8_t>(kernel, *src, nullptr, 0, 1)[0].empty());
}

TEST(NearestNeighbour, SourceWithoutPixelsGivesNoData) {
  NearestNeighbour<uint8_t> kernel;
  kernel.SetNoDataValue(9);
  const auto src = EmptyBlock<uint8_t>(0, 3, {2, 0, 0, false}, 0);
  EXPECT_EQ((Picture<uint8_t>{{9, 9, 9, 9}}), Resampled<uint8_t>(kernel, *src, nullptr, 2, 1));
}

TEST(NearestNeighbour, AMaskIsAddressedByItsOwnMargins) {
  NearestNeighbour<uint8_t> kernel;
  kernel.SetNoDataValue(99);
  const auto src = BlockOf<uint8_t>(kSquare);
  gobs::Mask mask(4, 4, {2, 1, 0, 0});
  mask.SetValid(2, 0, false);
  mask.SetValid(0, 2, false);
  EXPECT_EQ((Picture<uint8_t>{{1, 99},
                              {99, 11}}), Resampled<uint8_t>(kernel, *src, &mask, 2, 2));
  const auto wide = BlockOf<uint8_t>(kSquare, {1, 3, 3, false});
  gobs::Mask narrow(4, 4, {});
  narrow.SetValid(2, 2, false);
  EXPECT_EQ((Picture<uint8_t>{{1, 3},
                              {9, 99}}), Resampled<uint8_t>(kernel, *wide, &narrow, 2, 2));
}

}  // namespace
}  // namespace orin::resamplers
