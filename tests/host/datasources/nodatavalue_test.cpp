// SPDX-License-Identifier: MIT
#include "host/datasources/nodatavalue.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace orin::datasources {
namespace {

TEST(NoDataText, IsPlainDecimalsHoweverItWasWritten) {
  EXPECT_EQ("-9999", PlainNoDataText("-9999"));
  EXPECT_EQ("5", PlainNoDataText(" +5\t\n"));
  EXPECT_EQ("-1.5", PlainNoDataText("-1,5"));
  EXPECT_EQ("1e400", PlainNoDataText("1e400"));
  EXPECT_EQ("7", PlainNoDataText(std::string("7\0\0", 3)));
  for (const char* text : {"", " ", "+", "-", "nan", "inf", "1,5,0", "1.5,0", "0x10", "7 metres"})
    EXPECT_EQ("", PlainNoDataText(text)) << text;
}

TEST(NoDataText, SpellsInfinitiesAndNaNInManyWays) {
  for (const char* text : {"inf", "+INF", "Infinity", "1.#INF", "1.#INF00", "1e999"})
    EXPECT_EQ(HUGE_VAL, ParseNoData(text)) << text;
  for (const char* text : {"-inf", "-Infinity", "-1.#inf", "-1e999"})
    EXPECT_EQ(-HUGE_VAL, ParseNoData(text)) << text;
  for (const char* text : {"nan", "-NaN", "nan(ind)", "1.#QNAN", "-1.#IND00", "1.#snan"})
    EXPECT_TRUE(std::isnan(ParseNoData(text).value_or(0))) << text;
  for (const char* text : {"", "n", "nano", "1.#", "1.#QNAN1", "infinite", "none", "--5", "+-5"})
    EXPECT_FALSE(ParseNoData(text)) << text;
}

TEST(NoDataText, ThatIsTooSmallForADoubleIsZero) {
  EXPECT_EQ(0.0, ParseNoData("1e-999"));
  EXPECT_EQ(0.0, ParseNoData("-0.0"));
}

TEST(NoDataValue, OfAFloatIsTheTextRoundedToFloat) {
  constexpr float kLowest = std::numeric_limits<float>::lowest();
  for (const char* text : {"-3.4028234663852886e+38", "-3.4028235e+38", "-3.40282346638529e+38"})
    EXPECT_EQ(kLowest, NoDataValueOf<float>(text)->stored) << text;
  EXPECT_EQ(-3.4e38f, NoDataValueOf<float>("-3.4e38")->stored);
  EXPECT_EQ(-3.40282e+38f, NoDataValueOf<float>("-3.40282e+38")->stored);
  EXPECT_FALSE(NoDataValueOf<float>("-3.40282e+38")->Matches(kLowest));
}

TEST(NoDataValue, OfAnIntegerIsExactAndNeverNaN) {
  EXPECT_EQ(9007199254740993, NoDataValueOf<int64_t>("9007199254740993")->stored);
  EXPECT_EQ(UINT64_MAX, NoDataValueOf<uint64_t>("18446744073709551615")->stored);
  EXPECT_EQ(255, NoDataValueOf<unsigned char>("255.0")->stored);
  for (const char* text : {"nan", "inf", "-1", "256", "1.5", "1e400", "1,5"})
    EXPECT_FALSE(NoDataValueOf<unsigned char>(text)) << text;
}

}  // namespace
}  // namespace orin::datasources
