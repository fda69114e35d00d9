// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfarecord.h"

#include <gtest/gtest.h>

#include <string>

namespace orin::drivers {
namespace {

constexpr char kNoImage[] =
    "----------------------------------------------------------------------------------------"
    "---";

TEST(HfaRecord, IsReadBackAsItWasWritten) {
  HfaRecord record{"NEAREST", 2, "Orin Overviews 1.2.3", "1-0"};
  EXPECT_EQ(std::string("NEAREST ;2    ;Orin Overviews 1.2.3;1-0;") + kNoImage,
            ComposeHfaRecord(record));
  const size_t length = ComposeHfaRecord(record).size();
  record.image = {"0123456789abcdef0123456789abcdef", {5, -6, 7}};
  EXPECT_EQ(length, ComposeHfaRecord(record).size());
  const auto read = ParseHfaRecord(ComposeHfaRecord(record), 3);
  ASSERT_TRUE(read);
  EXPECT_EQ(record.method, read->method);
  EXPECT_EQ(record.sourceLevel, read->sourceLevel);
  EXPECT_EQ(record.program, read->program);
  EXPECT_EQ(record.validity, read->validity);
  EXPECT_EQ(record.image, read->image);
}

TEST(HfaRecord, HasTheSameLengthForEveryMethodAndSource) {
  const size_t length = ComposeHfaRecord({"MODE", 1, "program", "11"}).size();
  EXPECT_EQ(length, ComposeHfaRecord({"BILINEAR", 16384, "program", "00"}).size());
}

TEST(HfaRecord, WithoutPaddingIsReadAsWell) {
  const auto read = ParseHfaRecord(std::string("MODE;2;program;11;") + kNoImage, 2);
  ASSERT_TRUE(read);
  EXPECT_EQ("MODE", read->method);
  EXPECT_EQ(2u, read->sourceLevel);
}

TEST(HfaRecord, WhoseImageIsDamagedRemembersNone) {
  const auto read = ParseHfaRecord("NEAREST;1;program;11;0123 5 6 7", 2);
  ASSERT_TRUE(read);
  EXPECT_TRUE(read->image.IsBlank());
}

TEST(HfaRecord, IsNoneWhenItIsOfAnotherNumberOfChannelsOrDamaged) {
  const std::string image = kNoImage;
  EXPECT_FALSE(ParseHfaRecord("NEAREST;1;program;11;" + image, 3));
  EXPECT_FALSE(ParseHfaRecord("NEAREST;1;program;1x1;" + image, 3));
  EXPECT_FALSE(ParseHfaRecord("NEAREST;1;program;111", 3));
  EXPECT_FALSE(ParseHfaRecord("", 3));
}

TEST(HfaRecord, OfChannelsThatWaitSaysWhereTheyStand) {
  const HfaPendingLevel pending{{"NEAREST", 2, "program", "1-0"}, {0x12ab, 0, 0xffffffff}};
  const std::string text = ComposeHfaPending(pending);
  EXPECT_EQ("000012ab00000000ffffffff;" + ComposeHfaRecord(pending.record), text);
  const auto read = ParseHfaPending(text, 3);
  ASSERT_TRUE(read);
  EXPECT_EQ(pending.parts, read->parts);
  EXPECT_EQ("1-0", read->record.validity);
  EXPECT_FALSE(ParseHfaPending(text, 2));
  EXPECT_FALSE(ParseHfaPending(text, 4));
  EXPECT_FALSE(ParseHfaPending("-" + text.substr(1), 3));
  EXPECT_FALSE(ParseHfaPending(text.substr(0, 24), 3));
}

}  // namespace
}  // namespace orin::drivers
