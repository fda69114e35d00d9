// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfarecord.h"

#include <gtest/gtest.h>

namespace orin::drivers {
namespace {

TEST(HfaRecord, IsReadBackAsItWasWritten) {
  const HfaRecord record{"NEAREST", 2, "Orin Overviews 1.2.3", "1-0"};
  EXPECT_EQ("NEAREST;2;Orin Overviews 1.2.3;1-0", ComposeHfaRecord(record));
  const auto read = ParseHfaRecord(ComposeHfaRecord(record), 3);
  ASSERT_TRUE(read);
  EXPECT_EQ(record.method, read->method);
  EXPECT_EQ(record.sourceLevel, read->sourceLevel);
  EXPECT_EQ(record.program, read->program);
  EXPECT_EQ(record.validity, read->validity);
}

TEST(HfaRecord, IsNoneWhenItIsOfAnotherNumberOfChannelsOrDamaged) {
  EXPECT_FALSE(ParseHfaRecord("NEAREST;1;program;11", 3));
  EXPECT_FALSE(ParseHfaRecord("NEAREST;1;program;1x1", 3));
  EXPECT_FALSE(ParseHfaRecord("NEAREST;1;111", 3));
  EXPECT_FALSE(ParseHfaRecord("", 3));
}

}  // namespace
}  // namespace orin::drivers
