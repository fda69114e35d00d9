// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/nearestword.h"

#include <gtest/gtest.h>

namespace orin::app {
namespace {

const std::vector<std::string> kWords = {"build", "info", "clean", "--method", "--levels"};

TEST(NearestWord, IsTheOneThatDiffersLeast) {
  EXPECT_EQ("build", NearestWord("bulid", kWords));
  EXPECT_EQ("build", NearestWord("BUILT", kWords));
  EXPECT_EQ("--method", NearestWord("--metod", kWords));
  EXPECT_EQ("--levels", NearestWord("--level", kWords));
}

TEST(NearestWord, IsNoneForAWordThatResemblesNothing) {
  EXPECT_EQ("", NearestWord("--fast", kWords));
  EXPECT_EQ("", NearestWord("scene.tif", kWords));
  EXPECT_EQ("", NearestWord("", kWords));
  EXPECT_EQ("", NearestWord(std::string(100000, 'b'), kWords));
}

}  // namespace
}  // namespace orin::app
