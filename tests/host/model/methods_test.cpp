/// Every row of the table of methods can be told from every other.
// SPDX-License-Identifier: MIT
#include "host/model/methods.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

namespace orin::model {
namespace {

TEST(Methods, StandInTheOrderOfTheirEnumerators) {
  for (size_t row = 0; row < kMethods.size(); ++row)
    EXPECT_EQ(row, static_cast<size_t>(kMethods[row].type)) << kMethods[row].name;
}

TEST(Methods, AreStoredUnderTheseNames) {
  const std::vector<std::string> expected = {"NEAREST", "AVERAGE", "MODE", "BILINEAR", "BICUBIC"};
  std::vector<std::string> names;
  for (const Method& method : kMethods) names.emplace_back(method.name);
  EXPECT_EQ(expected, names);
}

TEST(Methods, HavePrefixesThatNoOtherMethodsNameOrPrefixStartsWith) {
  for (const Method& method : kMethods) {
    EXPECT_TRUE(method.name.starts_with(method.prefixes[0])) << method.name;
    for (const std::string_view prefix : method.prefixes)
      for (const Method& other : kMethods) {
        if (prefix.empty() || other.type == method.type) continue;
        EXPECT_FALSE(other.name.starts_with(prefix)) << other.name << ' ' << prefix;
        for (const std::string_view second : other.prefixes)
          EXPECT_FALSE(second.starts_with(prefix)) << second << ' ' << prefix;
      }
  }
}

TEST(FindMethod, KnowsEachByItsTypeAndItsStoredName) {
  for (const Method& method : kMethods) {
    EXPECT_EQ(&method, FindMethod(method.type));
    EXPECT_EQ(&method, FindMethod(method.name));
  }
}

TEST(FindMethod, KnowsNothingElse) {
  EXPECT_EQ(nullptr, FindMethod(ResampleInvalid));
  EXPECT_EQ(nullptr, FindMethod(static_cast<QRTOverviewResampleType>(kMethods.size())));
  for (const char* name : {"", "nearest", "CUBIC", "AVERAGED"})
    EXPECT_EQ(nullptr, FindMethod(std::string_view(name))) << name;
}

}  // namespace
}  // namespace orin::model
