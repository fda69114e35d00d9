// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/progressdisplay.h"

#include <gtest/gtest.h>

namespace orin::app {
namespace {

TEST(ProgressLine, ShowsFileLevelBarAndPerCent) {
  EXPECT_EQ("scene.tif: level 4 [=====     ]  50%",
            ProgressLine("some/folder/scene.tif", 4, 0.5, 36));
}

TEST(ProgressLine, FillsTheColumnsAndNeverMore) {
  for (unsigned columns = 0; columns < 200; ++columns) {
    const std::string line = ProgressLine("scene.tif", 16, 1.0, columns);
    EXPECT_LE(line.size(), columns);
    if (columns > 40) {
      EXPECT_EQ(columns, line.size());
    }
  }
}

TEST(ProgressLine, ANarrowTerminalGetsThePerCentAlone) {
  EXPECT_EQ(" 42%", ProgressLine("scene.tif", 4, 0.42, 20));
  EXPECT_EQ("", ProgressLine("scene.tif", 4, 0.42, 3));
}

TEST(ProgressLine, ALongNameShowsItsEndWithoutCuttingACharacter) {
  const std::string line = ProgressLine(
      "\xC3\xA9\xC3\xA9\xC3\xA9\xC3\xA9"
      "123456789012345678901234567.tif",
      2, 0, 80);
  EXPECT_EQ(0u, line.find("...567890123456")) << line;
  const std::string accents = ProgressLine(std::string(40, 'a') +
                                               "\xC3\xA9"
                                               "23456789012345678901234567",
                                           2, 0, 80);
  EXPECT_EQ(0u, accents.find("...\xC3\xA9"
                             "2345"))
      << accents;
}

TEST(ProgressLine, HundredPerCentIsForTheEndAlone) {
  EXPECT_NE(std::string::npos, ProgressLine("a.tif", 2, 0.9999, 60).find(" 99%"));
  EXPECT_NE(std::string::npos, ProgressLine("a.tif", 2, 1.0, 60).find("100%"));
}

}  // namespace
}  // namespace orin::app
