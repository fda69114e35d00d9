// SPDX-License-Identifier: MIT
#include "host/services/environment.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace orin::core {
namespace {

TEST(Environment, AnUnsetVariableReadsAsTheEmptyText) {
  ::unsetenv("ORIN_TEST_VARIABLE");
  EXPECT_EQ("", QRTGetEnvironmentVariable("ORIN_TEST_VARIABLE"));
}

TEST(Environment, AValueIsReadAsItStandsAtEveryCall) {
  ::setenv("ORIN_TEST_VARIABLE", " Cpu ", 1);
  EXPECT_EQ(" Cpu ", QRTGetEnvironmentVariable("ORIN_TEST_VARIABLE"));
  ::setenv("ORIN_TEST_VARIABLE", "gpu", 1);
  EXPECT_EQ("gpu", QRTGetEnvironmentVariable("ORIN_TEST_VARIABLE"));
  ::unsetenv("ORIN_TEST_VARIABLE");
}

}  // namespace
}  // namespace orin::core
