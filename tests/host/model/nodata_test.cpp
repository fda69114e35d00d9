// SPDX-License-Identifier: MIT
#include "host/model/nodata.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace orin::model {
namespace {

std::optional<NoData> Parse(const std::string& text) {
  return NoData::Parse(text, NoDataOrigin::kTag);
}

std::string DecimalOf(const std::string& text) {
  const auto noData = Parse(text);
  return noData ? noData->Decimal() : "";
}

std::optional<double> NumberOf(const std::string& text) {
  const auto noData = Parse(text);
  return noData ? std::optional(noData->Number()) : std::nullopt;
}

template <class T>
std::optional<NoDataValue<T>> ValueOf(const std::string& text) {
  const auto noData = Parse(text);
  return noData ? noData->As<T>() : std::nullopt;
}

TEST(NoDataText, IsPlainDecimalsHoweverItWasWritten) {
  EXPECT_EQ("-9999", DecimalOf("-9999"));
  EXPECT_EQ("5", DecimalOf(" +5\t\n"));
  EXPECT_EQ("-1.5", DecimalOf("-1,5"));
  EXPECT_EQ("1e400", DecimalOf("1e400"));
  EXPECT_EQ("7", DecimalOf(std::string("7\0\0", 3)));
  for (const char* text : {"", " ", "+", "-", "nan", "inf", "1,5,0", "1.5,0", "0x10", "7 metres"})
    EXPECT_EQ("", DecimalOf(text)) << text;
}

TEST(NoDataText, SpellsInfinitiesAndNaNInManyWays) {
  for (const char* text : {"inf", "+INF", "Infinity", "1.#INF", "1.#INF00", "1e999"})
    EXPECT_EQ(HUGE_VAL, NumberOf(text)) << text;
  for (const char* text : {"-inf", "-Infinity", "-1.#inf", "-1e999"})
    EXPECT_EQ(-HUGE_VAL, NumberOf(text)) << text;
  for (const char* text : {"nan", "-NaN", "nan(ind)", "1.#QNAN", "-1.#IND00", "1.#snan"})
    EXPECT_TRUE(std::isnan(NumberOf(text).value_or(0))) << text;
  for (const char* text : {"", "n", "nano", "1.#", "1.#QNAN1", "infinite", "none", "--5", "+-5"})
    EXPECT_FALSE(NumberOf(text)) << text;
}

TEST(NoDataText, ThatIsTooSmallForADoubleIsZero) {
  EXPECT_EQ(0.0, NumberOf("1e-999"));
  EXPECT_EQ(0.0, NumberOf("-0.0"));
}

TEST(NoDataValue, OfAFloatIsTheTextRoundedToFloat) {
  constexpr float kLowest = std::numeric_limits<float>::lowest();
  for (const char* text : {"-3.4028234663852886e+38", "-3.4028235e+38", "-3.40282346638529e+38"})
    EXPECT_EQ(kLowest, ValueOf<float>(text)->stored) << text;
  EXPECT_EQ(-3.4e38f, ValueOf<float>("-3.4e38")->stored);
  EXPECT_EQ(-3.40282e+38f, ValueOf<float>("-3.40282e+38")->stored);
  EXPECT_FALSE(ValueOf<float>("-3.40282e+38")->Matches(kLowest));
}

TEST(NoDataValue, OfAnIntegerIsExactAndNeverNaN) {
  EXPECT_EQ(9007199254740993, ValueOf<int64_t>("9007199254740993")->stored);
  EXPECT_EQ(UINT64_MAX, ValueOf<uint64_t>("18446744073709551615")->stored);
  EXPECT_EQ(255, ValueOf<unsigned char>("255.0")->stored);
  for (const char* text : {"nan", "inf", "-1", "256", "1.5", "1e400", "1,5"})
    EXPECT_FALSE(ValueOf<unsigned char>(text)) << text;
}

TEST(NoDataValue, OfAnIntegerKeepsEveryDigitUpToTheLimitsOfItsType) {
  EXPECT_EQ(INT64_MIN, ValueOf<int64_t>("-9223372036854775808")->stored);
  EXPECT_EQ(INT64_MAX, ValueOf<int64_t>("9223372036854775807")->stored);
  EXPECT_FALSE(ValueOf<int64_t>("9223372036854775808"));
  EXPECT_FALSE(ValueOf<int64_t>("-9223372036854775809"));
  EXPECT_EQ(uint64_t{1} << 63, ValueOf<uint64_t>("9223372036854775808")->stored);
  EXPECT_FALSE(ValueOf<uint64_t>("18446744073709551616"));
  EXPECT_FALSE(ValueOf<uint64_t>("-1"));
  EXPECT_EQ(-128, ValueOf<signed char>("-128")->stored);
  EXPECT_FALSE(ValueOf<signed char>("-129"));
}

TEST(NoData, KeepsItsTextAndWhereItWasDeclared) {
  const auto noData = NoData::Parse(" +1,50 ", NoDataOrigin::kAuxFile);
  ASSERT_TRUE(noData);
  EXPECT_EQ(" +1,50 ", noData->Text());
  EXPECT_EQ("1.50", noData->Decimal());
  EXPECT_EQ(1.5, noData->Number());
  EXPECT_STREQ("aux.xml", NameOf(noData->Origin()));
}

TEST(NoData, OriginsHaveNames) {
  EXPECT_STREQ("item", NameOf(NoDataOrigin::kItem));
  EXPECT_STREQ("tag", NameOf(NoDataOrigin::kTag));
  EXPECT_STREQ("channel", NameOf(NoDataOrigin::kChannel));
  EXPECT_STREQ("", NameOf(NoDataOrigin::kNowhere));
}

}  // namespace
}  // namespace orin::model
