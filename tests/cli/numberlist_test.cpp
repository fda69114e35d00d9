// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/numberlist.h"

#include <gtest/gtest.h>

namespace orin::app {
namespace {

using Numbers = std::vector<unsigned>;

TEST(NumberList, LevelsKeepTheirOrderAndRepetitions) {
  EXPECT_EQ((Numbers{8, 2, 2, 4}), ParseLevels("8,2,2,4").numbers);
  EXPECT_EQ("", ParseLevels("8,2,2,4").problem);
}

TEST(NumberList, LevelsMayBeAsLargeAsANumberGets) {
  EXPECT_EQ((Numbers{0, 4294967295}), ParseLevels("0,4294967295").numbers);
}

TEST(NumberList, AChannelRangeNamesAllInIt) {
  EXPECT_EQ((Numbers{1, 3, 4, 5}), ParseChannels("1,3-5").numbers);
  EXPECT_EQ((Numbers{7}), ParseChannels("7-7").numbers);
}

TEST(NumberList, AChannelNamedTwiceCountsOnceWhereItStoodFirst) {
  EXPECT_EQ((Numbers{3, 1, 2, 4}), ParseChannels("3,1-4").numbers);
}

TEST(NumberList, WhatIsNoListIsNamedInTheProblem) {
  for (const char* const text :
       {"", "2,", ",2", "2;4", "two", "2 ,4", "-2", "+2", "4294967296", "0x2"}) {
    const NumberList list = ParseLevels(text);
    EXPECT_TRUE(list.numbers.empty()) << text;
    EXPECT_NE(std::string::npos, list.problem.find("\"" + std::string(text) + "\""))
        << list.problem;
  }
  for (const char* const text : {"", "1,", "5-3", "1-", "-1", "1-2-3", "a-b"}) {
    const NumberList list = ParseChannels(text);
    EXPECT_TRUE(list.numbers.empty()) << text;
    EXPECT_NE(std::string::npos, list.problem.find("\"" + std::string(text) + "\""))
        << list.problem;
  }
}

TEST(NumberList, AnEndlessChannelRangeIsRefusedBeforeItIsCounted) {
  EXPECT_EQ("no raster has a channel 4000000000", ParseChannels("1-4000000000").problem);
}

TEST(NumberList, NumbersAreJoinedForReading) {
  EXPECT_EQ("", JoinNumbers({}));
  EXPECT_EQ("2, 4, 8", JoinNumbers({2, 4, 8}));
}

}  // namespace
}  // namespace orin::app
