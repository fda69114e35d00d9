// SPDX-License-Identifier: MIT
#include "host/datasources/nodatamask.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <memory>
#include <vector>

#include "tests/testing/fakeraster.h"
#include "tests/testing/randomvalues.h"

namespace {

using orin::datasources::AuxiliaryData;
using orin::gobs::DataTypeOf;
using orin::gobs::IMaskDecision;
using orin::gobs::Mask;
using orin::gobs::Raster;
using orin::testing::FakeRaster;
using ::testing::Each;
using ::testing::ElementsAre;

/// The decision of a raster whose file declares `file` and whose channels declare `channels`.
std::unique_ptr<IMaskDecision> DecisionOf(const orin::gobs::DataType& type, const std::string& file,
                                          const std::vector<std::string>& channels) {
  FakeRaster raster;
  raster.type = type;
  raster.channels = static_cast<unsigned>(channels.size());
  AuxiliaryData::Items items;
  if (!file.empty()) items["NO_DATA_VALUE"] = file;
  std::vector<AuxiliaryData::Items> own(channels.size());
  for (size_t i = 0; i < channels.size(); ++i)
    if (!channels[i].empty()) own[i]["NO_DATA_VALUE"] = channels[i];
  raster.metadata = AuxiliaryData(items, own);
  return std::unique_ptr<IMaskDecision>(GetFileMetadataSrcMask(&raster));
}

/// Validity of each pixel of a row, given all its values one after another.
template <class T>
std::vector<bool> ValidityOf(const IMaskDecision& decision, const std::vector<T>& values,
                             unsigned channels = 1, bool isComplex = false) {
  const unsigned perPixel = channels * (isComplex ? 2 : 1);
  const auto width = static_cast<unsigned>(values.size() / perPixel);
  Raster block({width, 1, channels, DataTypeOf<T>(isComplex)}, {});
  std::memcpy(block.data, values.data(), block.byteSize);
  Mask mask(width, 1, {});
  decision.Decide(block, mask);
  std::vector<bool> valid;
  for (unsigned x = 0; x < width; ++x) valid.push_back(mask.IsValid(x, 0));
  return valid;
}

template <class T>
std::vector<bool> ValidityOf(const std::string& noData, const std::vector<T>& values) {
  const auto decision = DecisionOf(DataTypeOf<T>(), noData, {""});
  if (!decision) throw std::runtime_error("there is no decision for " + noData);
  return ValidityOf(*decision, values);
}

TEST(NoDataMask, ThereIsNoDecisionWithoutANumber) {
  for (const char* text : {"", "none", "12abc", "1,5,0", "1 5", "0x10", "--1", "+-5", "+", " "})
    EXPECT_EQ(nullptr, DecisionOf(DataTypeOf<float>(), text, {""})) << text;
  EXPECT_EQ(nullptr, DecisionOf(orin::gobs::eDT_BIT, "0", {""}));
}

using AuxiliaryItems = std::vector<AuxiliaryData::Items>;

/// The decision of a raster with masks or alpha. \param alpha  1-based channel, 0 for none
std::unique_ptr<IMaskDecision> DecisionWithValidity(const std::string& noData, bool isFillOnly,
                                                    unsigned channels, unsigned alpha) {
  FakeRaster raster;
  raster.channels = channels;
  raster.metadata = AuxiliaryData({{"NO_DATA_VALUE", noData}}, AuxiliaryItems(channels));
  orin::model::SourceFacts& facts = raster.metadata.Facts();
  facts.carriesValidity = true;
  facts.noDataIsFill = isFillOnly;
  if (alpha != 0) facts.channels[alpha - 1].isAlpha = true;
  return std::unique_ptr<IMaskDecision>(GetFileMetadataSrcMask(&raster));
}

/// Validity of a row of bytes whose block calls pixel 0 no data.
std::vector<bool> ValidityOfMasked(const IMaskDecision& decision,
                                   const std::vector<uint8_t>& values, unsigned channels) {
  const auto width = static_cast<unsigned>(values.size() / channels);
  Raster block({width, 1, channels, DataTypeOf<uint8_t>()}, {});
  std::memcpy(block.data, values.data(), block.byteSize);
  block.validity = std::make_unique<Mask>(width, 1, block.Window());
  block.validity->SetValid(0, 0, false);
  Mask mask(width, 1, {});
  decision.Decide(block, mask);
  std::vector<bool> valid;
  for (unsigned x = 0; x < width; ++x) valid.push_back(mask.IsValid(x, 0));
  return valid;
}

TEST(NoDataMask, APixelIsNoDataWhereTheValueOrTheBlocksValiditySaysSo) {
  const auto decision = DecisionWithValidity("7", false, 1, 0);
  EXPECT_THAT(ValidityOfMasked(*decision, {5, 7, 0, 5}, 1), ElementsAre(false, false, true, true));
}

TEST(NoDataMask, AValueThatIsAFillOnlyMasksNothing) {
  const auto decision = DecisionWithValidity("0", true, 1, 0);
  EXPECT_THAT(ValidityOfMasked(*decision, {5, 0, 0, 5}, 1), ElementsAre(false, true, true, true));
}

TEST(NoDataMask, AlphaIsNotComparedWithTheValue) {
  const auto decision = DecisionWithValidity("7", false, 3, 3);
  EXPECT_THAT(ValidityOfMasked(*decision, {1, 1, 1, 7, 7, 200, 7, 1, 7, 1, 7, 7}, 3),
              ElementsAre(false, false, true, true));
}

TEST(NoDataMask, AlphaAloneIsMaskedByItsValidityAlone) {
  const auto decision = DecisionWithValidity("7", false, 1, 1);
  EXPECT_THAT(ValidityOfMasked(*decision, {7, 7, 1}, 1), ElementsAre(false, true, true));
}

TEST(NoDataMask, ItemsOfAUserChangeNothing) {
  FakeRaster raster;
  raster.metadata = AuxiliaryData({{"NO_DATA_VALUE", "7"},
                                   {"NO_DATA_VALUE_IS_FILL", "YES"},
                                   {"DECLARED_NO_DATA_VALUE", "5"},
                                   {"VALIDITY", "YES"}},
                                  {{{"ALPHA", "YES"}}});
  const std::unique_ptr<IMaskDecision> decision(GetFileMetadataSrcMask(&raster));
  ASSERT_NE(nullptr, decision);
  EXPECT_THAT(ValidityOfMasked(*decision, {1, 7, 5}, 1), ElementsAre(true, false, true));
}

template <class T>
class NoDataMaskOfType : public ::testing::Test {};
using PixelTypes = ::testing::Types<signed char, unsigned char, short, unsigned short, int,
                                    unsigned int, float, double, int64_t, uint64_t>;
TYPED_TEST_SUITE(NoDataMaskOfType, PixelTypes);

TYPED_TEST(NoDataMaskOfType, ThePixelThatEqualsTheValueIsNoDataInEveryWayOfWritingIt) {
  using T = TypeParam;
  for (const char* text : {"7", "7.0", "7e0", "0.7e1", "7.000000000"})
    EXPECT_THAT(ValidityOf<T>(text, {T(6), T(7), T(8)}), ElementsAre(true, false, true)) << text;
}

TYPED_TEST(NoDataMaskOfType, TheLimitsOfTheTypeAreExact) {
  using T = TypeParam;
  if constexpr (std::is_integral_v<T>) {
    constexpr T kMin = std::numeric_limits<T>::min();
    constexpr T kMax = std::numeric_limits<T>::max();
    EXPECT_THAT(ValidityOf<T>(std::to_string(kMax), {kMax, T(kMax - 1), kMin}),
                ElementsAre(false, true, true));
    EXPECT_THAT(ValidityOf<T>(std::to_string(kMin), {kMin, T(kMin + 1), kMax}),
                ElementsAre(false, true, true));
  } else {
    constexpr T kLowest = std::numeric_limits<T>::lowest();
    EXPECT_THAT(ValidityOf<T>("-3.4028234663852886e+38", {T(-3.4028234663852886e+38), T(0)}),
                ElementsAre(false, true));
    EXPECT_THAT(ValidityOf<T>(
                    std::is_same_v<T, float> ? "-3.40282346638529e+38" : "-1.7976931348623157e308",
                    {kLowest, T(0)}),
                ElementsAre(false, true));
  }
}

TYPED_TEST(NoDataMaskOfType, AValueThatTheTypeCannotHoldMatchesNoPixel) {
  using T = TypeParam;
  const std::vector<T> values{std::numeric_limits<T>::lowest(), T(0), T(1),
                              std::numeric_limits<T>::max()};
  if constexpr (std::is_integral_v<T>) {
    for (const char* text :
         {"0.5", "1.25", "1e30", "-1e30", "1e400", "18446744073709551616", "nan"})
      EXPECT_THAT(ValidityOf<T>(text, values), Each(true)) << text;
    if (std::is_unsigned_v<T>) {
      EXPECT_THAT(ValidityOf<T>("-1", values), Each(true));
    }
  }
}

TEST(NoDataMask, ValuesBesideTheRangeOfSmallTypesDoNotWrap) {
  EXPECT_THAT(ValidityOf<unsigned char>("256", {0, 255}), Each(true));
  EXPECT_THAT(ValidityOf<unsigned char>("-1", {0, 255}), Each(true));
  EXPECT_THAT(ValidityOf<signed char>("128", {-128, 127}), Each(true));
  EXPECT_THAT(ValidityOf<short>("-9999", {-9999, 9999}), ElementsAre(false, true));
  EXPECT_THAT(ValidityOf<unsigned short>("-9999", {55537, 9999}), Each(true));
  EXPECT_THAT(ValidityOf<int64_t>("9223372036854775808", {INT64_MIN, INT64_MAX}), Each(true));
}

TEST(NoDataMask, BeyondTheRangeOfAFloatTheInfinityAndTheLastFiniteValueAreNoData) {
  constexpr float kMax = std::numeric_limits<float>::max();
  EXPECT_THAT(ValidityOf<float>("-1.7976931348623157e+308", {-HUGE_VALF, -kMax, -3.4e38f, kMax}),
              ElementsAre(false, false, true, true));
  EXPECT_THAT(ValidityOf<float>("1e300", {HUGE_VALF, kMax, 3.4e38f}),
              ElementsAre(false, false, true));
  EXPECT_THAT(ValidityOf<double>("1e400", {HUGE_VAL, std::numeric_limits<double>::max(), 1e308}),
              ElementsAre(false, false, true));
  EXPECT_THAT(ValidityOf<float>("inf", {HUGE_VALF, kMax}), ElementsAre(false, true));
}

TEST(NoDataMask, WhenNaNIsDeclaredEveryNaNIsNoData) {
  for (const char* text : {"nan", "NaN", " -nan", "1.#QNAN", "-1.#IND00"})
    EXPECT_THAT(ValidityOf<float>(text, {NAN, -NAN, 0.0f, HUGE_VALF}),
                ElementsAre(false, false, true, true))
        << text;
  EXPECT_THAT(ValidityOf<double>("nan", {std::nan("7"), 1.0}), ElementsAre(false, true));
}

TEST(NoDataMask, OfAComplexSampleEitherPartCanBeNaN) {
  const auto decision = DecisionOf(DataTypeOf<float>(true), "nan", {""});
  EXPECT_THAT(ValidityOf<float>(*decision, {NAN, 0, 1, NAN, NAN, NAN, 1, 2}, 1, true),
              ElementsAre(false, false, false, true));
}

TEST(NoDataMask, ADecimalCommaIsAPointAsOtherProgramsReadIt) {
  EXPECT_THAT(ValidityOf<float>("-1,5", {-1.5f, -1.0f}), ElementsAre(false, true));
}

TEST(NoDataMask, TheDeclaredValueDecidesWhereAnotherOneIsAnswered) {
  FakeRaster raster;
  raster.type = DataTypeOf<float>();
  raster.metadata = AuxiliaryData({{"NO_DATA_VALUE", "nan"}}, {{}});
  raster.metadata.SetFileMetadataValue("NO_DATA_VALUE", "-3");
  const std::unique_ptr<IMaskDecision> decision(GetFileMetadataSrcMask(&raster));
  EXPECT_THAT(ValidityOf<float>(*decision, {-3.0f, NAN}), ElementsAre(true, false));
}

TEST(NoDataMask, SixtyFourBitIntegersAreComparedExactly) {
  EXPECT_THAT(ValidityOf<int64_t>("9007199254740993",
                                  {9007199254740992, 9007199254740993, 9007199254740994}),
              ElementsAre(true, false, true));
  EXPECT_THAT(ValidityOf<uint64_t>("18446744073709551615", {UINT64_MAX, UINT64_MAX - 1}),
              ElementsAre(false, true));
}

TEST(NoDataMask, AFloatIsComparedAfterTheTextWasRoundedToFloat) {
  EXPECT_THAT(ValidityOf<float>("0.1", {0.1f, std::nextafter(0.1f, 1.0f)}),
              ElementsAre(false, true));
  EXPECT_THAT(ValidityOf<double>("0.1", {0.1, double(0.1f)}), ElementsAre(false, true));
  EXPECT_THAT(ValidityOf<float>("0", {0.0f, -0.0f, NAN, 1.0f}),
              ElementsAre(false, false, true, true));
}

TEST(NoDataMask, OfSeveralChannelsAllMustEqualTheirValue) {
  const auto same = DecisionOf(orin::gobs::eDT_8U, "0", {"", "", ""});
  EXPECT_THAT(ValidityOf<unsigned char>(*same, {0, 0, 0, 0, 0, 1, 5, 5, 5}, 3),
              ElementsAre(false, true, true));
  const auto each = DecisionOf(orin::gobs::eDT_8U, "0", {"1", "", "3"});
  EXPECT_THAT(ValidityOf<unsigned char>(*each, {1, 0, 3, 0, 0, 0, 1, 2, 3}, 3),
              ElementsAre(false, true, true));
}

TEST(NoDataMask, AChannelWithoutAPossibleValueKeepsEveryPixelValid) {
  const auto missing = DecisionOf(orin::gobs::eDT_8U, "", {"0", ""});
  ASSERT_NE(nullptr, missing);
  EXPECT_THAT(ValidityOf<unsigned char>(*missing, {0, 0, 0, 1}, 2), Each(true));
  const auto outside = DecisionOf(orin::gobs::eDT_8U, "", {"0", "300"});
  EXPECT_THAT(ValidityOf<unsigned char>(*outside, {0, 44, 0, 0}, 2), Each(true));
}

TEST(NoDataMask, TheChannelsOwnValueGoesBeforeTheFiles) {
  const auto decision = DecisionOf(orin::gobs::eDT_8U, "9", {"4"});
  EXPECT_THAT(ValidityOf<unsigned char>(*decision, {9, 4}), ElementsAre(true, false));
}

TEST(NoDataMask, OfAComplexSampleTheRealPartCountsAndTheImaginaryPartMustBeZero) {
  const auto decision = DecisionOf(DataTypeOf<short>(true), "-1", {""});
  EXPECT_THAT(ValidityOf<short>(*decision, {-1, 0, -1, 5, 0, -1, 0, 0}, 1, true),
              ElementsAre(false, true, true, true));
}

/// Runs of pixels without data and of others, in samples of 7 and 8, one channel after another.
template <class T>
std::vector<T> RunsOfPixels(orin::testing::Random& random, unsigned pixels, unsigned perPixel) {
  std::vector<T> values;
  while (values.size() < size_t{pixels} * perPixel) {
    const bool isRun = random.OneIn(2);
    const auto length = static_cast<unsigned>(random.Between(1, 80));
    for (unsigned i = 0; i < length * perPixel && values.size() < size_t{pixels} * perPixel; ++i)
      values.push_back(isRun || random.OneIn(2) ? T(7) : T(8));
  }
  return values;
}

TYPED_TEST(NoDataMaskOfType, EveryPixelOfARowIsDecidedByItselfHoweverLongTheRow) {
  using T = TypeParam;
  orin::testing::Random random(7);
  for (unsigned pixels = 1; pixels <= 200; ++pixels)
    for (unsigned channels = 1; channels <= 4; ++channels) {
      const auto values = RunsOfPixels<T>(random, pixels, channels);
      std::vector<bool> expected;
      for (unsigned x = 0; x < pixels; ++x) {
        const auto first = values.begin() + x * channels;
        expected.push_back(std::count(first, first + channels, T(7)) < int(channels));
      }
      const auto decision =
          DecisionOf(DataTypeOf<T>(), "7", std::vector<std::string>(channels, ""));
      ASSERT_EQ(expected, ValidityOf<T>(*decision, values, channels))
          << pixels << " pixels of " << channels << " channels";
    }
}

TEST(NoDataMask, MarginsAreDecidedToo) {
  const auto decision = DecisionOf(orin::gobs::eDT_8U, "0", {""});
  Raster block({1, 1, 1, orin::gobs::eDT_8U}, {1, 1, 0, 0});
  const uint8_t pixels[] = {0, 1, 1,  //
                            1, 1, 1,  //
                            1, 1, 0};
  std::copy_n(pixels, 9, block.data);
  Mask mask(1, 1, {1, 1, 0, 0});
  decision->Decide(block, mask);
  EXPECT_FALSE(mask.IsValid(-1, -1));
  EXPECT_FALSE(mask.IsValid(1, 1));
  EXPECT_TRUE(mask.IsValid(0, 0));
}

}  // namespace
