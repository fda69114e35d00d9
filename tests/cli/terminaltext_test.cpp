// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/terminaltext.h"

#include <gtest/gtest.h>

namespace orin::app {
namespace {

TEST(Printable, LeavesTextOfAnyLanguageAsItIs) {
  EXPECT_EQ("scene 1.tif", Printable("scene 1.tif"));
  EXPECT_EQ("caf\xC3\xA9 \xE2\x82\xAC \xF0\x9F\x97\xBA.tif",
            Printable("caf\xC3\xA9 \xE2\x82\xAC \xF0\x9F\x97\xBA.tif"));
}

TEST(Printable, ShowsWhatSteersATerminalOrBeginsALine) {
  EXPECT_EQ("a\\x1b[31mb", Printable("a\x1b[31mb"));
  EXPECT_EQ("a\\x07b\\nc\\td\\x7f", Printable("a\x07"
                                              "b\nc\td\x7f"));
  EXPECT_EQ("\\xc2\\x9b", Printable("\xC2\x9B"));  // CSI as one character
  EXPECT_EQ("a\\xe2\\x80\\xaeb", Printable("a\xE2\x80\xAE"
                                           "b"));                    // the line runs backwards
  EXPECT_EQ("\\x9b[2J", Printable("\x9B[2J"));                       // no UTF-8
  EXPECT_EQ("\\xc0\\xaf\\xe2\\x82", Printable("\xC0\xAF\xE2\x82"));  // too long, cut off
}

TEST(AfterFileName, EveryLineNamesTheFileOnce) {
  EXPECT_EQ("a.tif: Failed.\na.tif: disk full",
            AfterFileName("a.tif", "Failed.\na.tif: disk full"));
  EXPECT_EQ("a.tif: one\na.tif: two", AfterFileName("a.tif", "one\n\ntwo\n"));
  EXPECT_EQ("", AfterFileName("a.tif", ""));
}

TEST(AfterFileName, ANameOfTwoLinesStandsInOne) {
  const std::string name = "a\norin-overviews: b.tif: levels built";
  const std::string shown = "a\\norin-overviews: b.tif: levels built";
  EXPECT_EQ(shown + ": cannot be read", AfterFileName(name, name + ": cannot be read"));
  EXPECT_EQ(shown + ": in " + shown + ".ovr", AfterFileName(name, "in " + name + ".ovr"));
}

}  // namespace
}  // namespace orin::app
