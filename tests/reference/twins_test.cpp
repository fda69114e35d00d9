/// The slow twins against answers worked out by hand.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <vector>

#include "tests/reference/average.h"
#include "tests/reference/bicubic.h"
#include "tests/reference/bilinear.h"
#include "tests/reference/mode.h"
#include "tests/reference/nearest.h"

namespace orin::reference {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// A block that owns its values, drawn with its margin.
template <class T>
struct Drawn {
  std::vector<T> values;
  Block<T> block;
};

template <class T>
Drawn<T> Draw(std::vector<std::vector<T>> rows, int64_t margin, int64_t components = 1) {
  Drawn<T> drawn;
  for (const auto& row : rows) drawn.values.insert(drawn.values.end(), row.begin(), row.end());
  const auto width = static_cast<int64_t>(rows[0].size()) / components - 2 * margin;
  const auto height = static_cast<int64_t>(rows.size()) - 2 * margin;
  drawn.block = {width, height, margin, margin, 1, components, nullptr};
  return drawn;
}

template <class T>
using Method = void (*)(const Block<T>&, const Bits*, const Block<T>&, const Settings&);

/// The destination's values, its margin 0.
template <class T>
std::vector<T> Apply(Method<T> method, Drawn<T> src, int64_t width, int64_t height,
                     const Settings& s, const std::vector<uint8_t>& maskBytes = {}) {
  src.block.values = src.values.data();
  const Block<T>& b = src.block;
  std::vector<T> out(static_cast<size_t>(width * height * b.components), T(99));
  const Block<T> dst{width, height, 0, 0, 1, b.components, out.data()};
  const Bits bits{b.width, b.height, b.marginX, b.marginY, maskBytes.data()};
  method(b, maskBytes.empty() ? nullptr : &bits, dst, s);
  return out;
}

Settings Ratio(double ratio) {
  Settings s;
  s.ratioGiven = true;
  s.ratioX = s.ratioY = ratio;
  return s;
}

Settings Ground(double dstOrigin, double dstPixelSize) {
  Settings s;
  s.georeferenced = true;
  s.dstOriginX = s.dstOriginY = dstOrigin;
  s.dstPixelSizeX = s.dstPixelSizeY = dstPixelSize;
  return s;
}

template <class T>
using V = std::vector<T>;

TEST(Conversion, RoundsSignedValuesAwayFromZeroAndClampsThem) {
  EXPECT_EQ(-1, Convert<int8_t>(-0.5));
  EXPECT_EQ(-4, Convert<int8_t>(-3.5));
  EXPECT_EQ(127, Convert<int8_t>(126.5));
  EXPECT_EQ(-128, Convert<int8_t>(-1000));
  EXPECT_EQ(INT32_MIN, Convert<int32_t>(-2147483648.4));
  EXPECT_EQ(1, Convert<int16_t>(0.49999999999999994));  // a half is added in double
}

TEST(Conversion, RoundsUnsignedValuesUpAndClampsThem) {
  EXPECT_EQ(255, Convert<uint8_t>(254.5));
  EXPECT_EQ(254, Convert<uint8_t>(254.4));
  EXPECT_EQ(0, Convert<uint8_t>(-3.2));
  EXPECT_EQ(4294967295u, Convert<uint32_t>(1e300));
}

TEST(Conversion, NeverGivesANegativeSixtyFourBitIntegerAndDoesNotRound) {
  EXPECT_EQ(0, Convert<int64_t>(-7));
  EXPECT_EQ(7, Convert<int64_t>(7.9));
  EXPECT_EQ(INT64_MAX, Convert<int64_t>(1e19));
  EXPECT_EQ(9223372036854774784, Convert<int64_t>(9223372036854774784.0));
  EXPECT_EQ(uint64_t{1} << 63, Convert<uint64_t>(9223372036854775808.0));
  EXPECT_EQ(18446744073709549568u, Convert<uint64_t>(18446744073709549568.0));
  EXPECT_EQ(UINT64_MAX, Convert<uint64_t>(18446744073709551616.0));
}

TEST(Conversion, TurnsNotANumberIntoZero) {
  EXPECT_EQ(0, Convert<int16_t>(kNaN));
  EXPECT_EQ(0u, Convert<uint32_t>(kNaN));
  EXPECT_EQ(0, Convert<int64_t>(kNaN));
  EXPECT_EQ(0u, Convert<uint64_t>(kNaN));
}

TEST(Bits, CountFromTheTopBitOfAByte) {
  const uint8_t bytes[] = {0x80, 0x01};
  const Bits bits{8, 2, 0, 0, bytes};
  EXPECT_TRUE(bits.Valid(0, 0));
  EXPECT_FALSE(bits.Valid(7, 0));
  EXPECT_FALSE(bits.Valid(0, 1));
  EXPECT_TRUE(bits.Valid(7, 1));
  EXPECT_THROW(bits.Valid(8, 0), NotDefined);
}

const V<V<int16_t>> kRamp = {{0, 1, 2, 3}, {10, 11, 12, 13}, {20, 21, 22, 23}, {30, 31, 32, 33}};

TEST(NearestTwin, TakesTheCornerByRatioAndTheCentreByGround) {
  EXPECT_EQ((V<int16_t>{0, 2, 20, 22}), Apply(Nearest<int16_t>, Draw(kRamp, 0), 2, 2, Settings{}));
  EXPECT_EQ((V<int16_t>{11, 13, 31, 33}),
            Apply(Nearest<int16_t>, Draw(kRamp, 0), 2, 2, Ground(0, 2)));
}

TEST(NearestTwin, SendsACoordinateOfMinusOneOrLessToTheLastPixel) {
  EXPECT_EQ((V<int16_t>{0}), Apply(Nearest<int16_t>, Draw(kRamp, 0), 1, 1, Ground(-1, 1)));
  EXPECT_EQ((V<int16_t>{33}), Apply(Nearest<int16_t>, Draw(kRamp, 0), 1, 1, Ground(-1.5, 1)));
}

TEST(NearestTwin, KeepsTheLowThirtyTwoBitsOfACoordinate) {
  EXPECT_EQ((V<int16_t>{22}),
            Apply(Nearest<int16_t>, Draw(kRamp, 0), 1, 1, Ground(4294967298.0, 1)));
}

TEST(NearestTwin, FillsEveryComponentOfAnInvalidPixel) {
  Settings s;
  s.isComplex = true;
  s.noDataValue = -1;
  EXPECT_EQ((V<uint8_t>{0, 0}),
            Apply(Nearest<uint8_t>, Draw<uint8_t>({{5, 6, 7, 8}}, 0, 2), 1, 1, s, {0x7F}));
  EXPECT_EQ((V<int16_t>{-1, -1}),
            Apply(Nearest<int16_t>, Draw<int16_t>({{5, 6, 7, 8}}, 0, 2), 1, 1, s, {0x7F}));
}

TEST(AverageTwin, NeedsTwoValidSamplesOfFour) {
  Settings s = Ratio(0.5);
  s.noDataValue = 9;
  const V<V<uint8_t>> four = {{1, 2}, {3, 4}};
  EXPECT_EQ((V<uint8_t>{3}), Apply(Average<uint8_t>, Draw(four, 0), 1, 1, s));          // 2.5
  EXPECT_EQ((V<uint8_t>{3}), Apply(Average<uint8_t>, Draw(four, 0), 1, 1, s, {0x50}));  // 2 and 4
  EXPECT_EQ((V<uint8_t>{9}), Apply(Average<uint8_t>, Draw(four, 0), 1, 1, s, {0x40}));
}

TEST(AverageTwin, NeedsFiveValidSamplesOfNine) {
  Settings s = Ratio(1.0 / 3);
  s.noDataValue = 77;
  const V<V<int8_t>> nine = {{-1, -2, -1}, {-2, -1, -2}, {-1, -2, 0}};
  EXPECT_EQ((V<int8_t>{77}), Apply(Average<int8_t>, Draw(nine, 0), 1, 1, s, {0xF0, 0x00}));
  EXPECT_EQ((V<int8_t>{-1}), Apply(Average<int8_t>, Draw(nine, 0), 1, 1, s, {0xF8, 0x00}));  // -7/5
}

TEST(AverageTwin, RepeatsTheLastRowOfAnOddHeight) {
  EXPECT_EQ((V<uint8_t>{6}), Apply(Average<uint8_t>, Draw<uint8_t>({{4, 8}}, 0), 1, 1, Ratio(0.5)));
}

TEST(AverageTwin, GivesTheCentresValueToAnInvalidPixelOfItsFootprint) {
  const V<V<uint8_t>> drawn = {{0, 0, 0, 0}, {0, 10, 90, 0}, {0, 30, 40, 0}, {0, 0, 0, 0}};
  Settings s = Ratio(0.4);  // pixels 0 and 1 of each axis
  const V<uint8_t> all(2, 0xFF);
  EXPECT_EQ((V<uint8_t>{43}), Apply(Average<uint8_t>, Draw(drawn, 1), 1, 1, s, all));  // 42.5
  EXPECT_EQ((V<uint8_t>{23}), Apply(Average<uint8_t>, Draw(drawn, 1), 1, 1, s, {0xFD, 0xFF}));
}

TEST(AverageTwin, FillsAnEmptyFootprint) {
  Settings s = Ratio(2);
  s.noDataValue = 5;
  const V<V<uint8_t>> drawn = {{0, 0, 0, 0}, {0, 7, 8, 0}, {0, 0, 0, 0}};
  EXPECT_EQ((V<uint8_t>{5, 5, 5, 5, 5, 7, 5, 8}),  // odd columns of odd rows cover a pixel
            Apply(Average<uint8_t>, Draw(drawn, 1), 4, 2, s));
}

TEST(AverageTwin, KeepsTheMeanLengthOfComplexSamples) {
  Settings s = Ratio(0.5);
  s.isComplex = true;  // lengths 5, 5, 5 and the root of 17, vector sum (8, 16)
  const auto out =
      Apply(Average<double>, Draw<double>({{3, 4, 3, 4}, {3, 4, -1, 4}}, 0, 2), 1, 1, s);
  const double mean = (15 + std::sqrt(17.0)) / 4;
  EXPECT_NEAR(mean, std::hypot(out[0], out[1]), 1e-14);
  EXPECT_NEAR(2, out[1] / out[0], 1e-14);
}

TEST(AverageTwin, WrapsTheSquaresOfLargeIntegers) {
  EXPECT_TRUE(std::isnan(Magnitude(Sample<uint16_t>{65535, 0})));  // 4294836225 is negative
  EXPECT_EQ(4294836225.0, std::pow(Magnitude(Sample<uint32_t>{65535, 0}), 2));
  EXPECT_EQ(0, Magnitude(Sample<int32_t>{65536, 0}));  // 2 to the 32nd
  EXPECT_EQ(2, Magnitude(Sample<int32_t>{65536, 2}));
  EXPECT_EQ(0, Magnitude(Sample<uint64_t>{uint64_t{1} << 32, 0}));
  EXPECT_TRUE(std::isnan(Magnitude(Sample<int64_t>{3037000500, 0})));  // just over 2 to the 63rd
}

TEST(ModeTwin, GivesATieToTheValueMetFirstColumnByColumn) {
  const V<V<uint8_t>> tie = {{7, 9, 9}, {7, 5, 9}, {7, 7, 9}};
  EXPECT_EQ((V<uint8_t>{7}), Apply(Mode<uint8_t>, Draw(tie, 1), 1, 1, Settings{}));
  const V<V<uint8_t>> distinct = {{1, 2, 3}, {4, 5, 6}, {7, 8, 9}};
  EXPECT_EQ((V<uint8_t>{1}), Apply(Mode<uint8_t>, Draw(distinct, 1), 1, 1, Settings{}));
  const V<V<uint8_t>> rowsWouldSayTwo = {{1, 2, 2}, {3, 4, 5}, {3, 6, 8}};
  EXPECT_EQ((V<uint8_t>{3}), Apply(Mode<uint8_t>, Draw(rowsWouldSayTwo, 1), 1, 1, Settings{}));
}

TEST(ModeTwin, LetsInvalidNeighboursVoteForTheCentre) {
  const V<V<uint8_t>> drawn = {{7, 7, 7}, {7, 5, 7}, {7, 7, 7}};
  EXPECT_EQ((V<uint8_t>{5}), Apply(Mode<uint8_t>, Draw(drawn, 1), 1, 1, Settings{}, {0x08, 0x00}));
  Settings s;
  s.noDataValue = 255.4;
  EXPECT_EQ((V<uint8_t>{255}), Apply(Mode<uint8_t>, Draw(drawn, 1), 1, 1, s, {0xF7, 0xFF}));
}

TEST(ModeTwin, HasAnAbsoluteToleranceAndNoVoteForNotANumber) {
  EXPECT_TRUE(SameValue(0.1 + 0.2, 0.3));
  EXPECT_FALSE(SameValue(1.0f, 1.0000001f));
  EXPECT_FALSE(SameValue(kNaN, kNaN));
  EXPECT_EQ(1, MostFrequent<double>({kNaN, kNaN, kNaN, 1, 2, 3, 4, 5, 6}));
}

TEST(BilinearTwin, HalvesToTheMeanOfFour) {
  const V<V<uint8_t>> drawn = {{0, 0, 0, 0}, {0, 1, 2, 0}, {0, 3, 4, 0}, {0, 0, 0, 0}};
  EXPECT_EQ((V<uint8_t>{3}), Apply(Bilinear<uint8_t>, Draw(drawn, 1), 1, 1, Settings{}));
  EXPECT_EQ((V<uint8_t>{2}),  // (1 + 2 + 3 + 1) / 4: the invalid 4 counts as 1
            Apply(Bilinear<uint8_t>, Draw(drawn, 1), 1, 1, Settings{}, {0xFF, 0xDF}));
  EXPECT_EQ((V<uint8_t>{0}),
            Apply(Bilinear<uint8_t>, Draw(drawn, 1), 1, 1, Settings{}, {0xFB, 0xFF}));
}

TEST(BilinearTwin, IsTheIdentityAtRatioOneButForNegativeSixtyFourBitIntegers) {
  const V<V<int64_t>> drawn = {{0, 0, 0, 0}, {0, -7, 8, 0}, {0, 0, 0, 0}};
  EXPECT_EQ((V<int64_t>{0, 8}), Apply(Bilinear<int64_t>, Draw(drawn, 1), 2, 1, Settings{}));
}

TEST(BicubicTwin, InterpolatesBetweenTheMiddleSamplesAndOvershoots) {
  EXPECT_EQ(127.5, CubicOfFloats({0, 0, 255, 255}, 0.5));
  EXPECT_EQ(143.4375, CubicOfFloats({0, 255, 0, 0}, 0.5));
  EXPECT_EQ(286.875, CubicOfFloats({0, 255, 255, 0}, 0.5));
  EXPECT_EQ(255, CubicOfFloats({3, 255, 9, 1}, 0));
}

TEST(BicubicTwin, PassesSamplesThroughSinglePrecision) {
  const V<V<uint32_t>> large(7, V<uint32_t>(7, 16777217));
  EXPECT_EQ((V<uint32_t>{16777216}), Apply(Bicubic<uint32_t>, Draw(large, 3), 1, 1, Settings{}));
  const V<V<double>> tenth(7, V<double>(7, 0.1));
  EXPECT_EQ((V<double>{0.10000000149011612}),
            Apply(Bicubic<double>, Draw(tenth, 3), 1, 1, Settings{}));
}

}  // namespace
}  // namespace orin::reference
