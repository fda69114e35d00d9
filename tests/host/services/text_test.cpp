// SPDX-License-Identifier: MIT
#include "host/services/text.h"

#include <gtest/gtest.h>

#include <clocale>

namespace {

TEST(Text, FormatsAsPrintfDoes) {
  EXPECT_EQ("OLEVELS[2] = 1  - Levels must be 2 or greater.\n",
            FormatString("OLEVELS[%d] = %d  - Levels must be 2 or greater.\n", 2, 1));
  EXPECT_EQ("no arguments, 100%", FormatString("no arguments, 100%%"));
  EXPECT_EQ("", FormatString("%s", ""));
}

TEST(Text, LongTextsAreNotCut) {
  const std::string path(100000, 'x');
  const std::string text = FormatString("%s: level %u", path.c_str(), 4294967295u);
  EXPECT_EQ(path + ": level 4294967295", text);
}

TEST(Text, BothNamesFormatAlike) {
  const std::string path(5000, 'y');
  EXPECT_EQ(FormatString("%s|%d|%g", path.c_str(), -7, 0.25),
            MkString("%s|%d|%g", path.c_str(), -7, 0.25));
}

TEST(Text, ATextWithoutTranslationIsReturnedItself) {
  const char* text = "a text that no catalogue holds";
  EXPECT_EQ(text, _(text));
}

TEST(Text, ADirectoryWithoutCataloguesLeavesTheTextsAsTheyAre) {
  orin::BindTranslations("/nonexistent/locale");
  ASSERT_NE(nullptr, std::setlocale(LC_ALL, "C.UTF-8"));
  EXPECT_STREQ("Failed to create overviews.\n", _("Failed to create overviews.\n"));
  std::setlocale(LC_ALL, "C");
}

TEST(Text, TheEmptyTextStaysEmpty) { EXPECT_STREQ("", _("")); }

}  // namespace
