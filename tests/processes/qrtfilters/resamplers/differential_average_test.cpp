/// The average against its slow twin.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "processes/qrtfilters/resamplers/factories.h"
#include "tests/processes/qrtfilters/resamplers/differential.h"
#include "tests/reference/average.h"

namespace orin::testing {

template <class T>
class AverageAndItsTwin : public ::testing::Test {};
TYPED_TEST_SUITE(AverageAndItsTwin, EveryPixelType, PixelTypeNames);

TYPED_TEST(AverageAndItsTwin, WriteTheSameBytes) {
  resamplers::AverageResamplerFactory factory;
  const Abilities can{.leastMargin = 0, .complexData = true, .fewerChannelsOut = true};
  Differential<TypeParam>(factory, reference::Average<TypeParam>, reference::Average<double>, can,
                          NotANumber::kAnyPayload)
      .CheckEveryCombination();
}

}  // namespace orin::testing
