// SPDX-License-Identifier: MIT
#include "host/services/ompnested.h"

#include <gtest/gtest.h>
#include <omp.h>

namespace {

/// Threads of a team that one of three outer threads forks.
int InnerTeamSize() {
  int size = 0;
#pragma omp parallel num_threads(3)
  {
#pragma omp single
    {
#pragma omp parallel num_threads(2)
      {
#pragma omp single
        size = omp_get_num_threads();
      }
    }
  }
  return size;
}

class OMPNestedTest : public ::testing::Test {
 protected:
  void SetUp() override { omp_set_max_active_levels(1); }
  void TearDown() override { omp_set_max_active_levels(former_); }
  const int former_ = omp_get_max_active_levels();
};

TEST_F(OMPNestedTest, InnerRegionsForkWhileItLives) {
  EXPECT_EQ(1, InnerTeamSize());
  {
    const OMPNested nested(true);
    EXPECT_EQ(2, InnerTeamSize());
  }
  EXPECT_EQ(1, InnerTeamSize());
}

TEST_F(OMPNestedTest, RestoresTheStateThatItFoundAlsoWhenGuardsNest) {
  omp_set_max_active_levels(4);
  {
    const OMPNested off(false);
    EXPECT_EQ(1, omp_get_max_active_levels());
    {
      const OMPNested on(true);
      EXPECT_LT(1, omp_get_max_active_levels());
    }
    EXPECT_EQ(1, omp_get_max_active_levels());
  }
  EXPECT_EQ(4, omp_get_max_active_levels());
}

TEST_F(OMPNestedTest, IsRestoredWhenAnExceptionPasses) {
  try {
    const OMPNested nested(true);
    throw 1;
  } catch (int) {
  }
  EXPECT_EQ(1, omp_get_max_active_levels());
}

}  // namespace
