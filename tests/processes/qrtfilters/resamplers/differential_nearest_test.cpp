/// Nearest neighbour against its slow twin.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "processes/qrtfilters/resamplers/factories.h"
#include "tests/processes/qrtfilters/resamplers/differential.h"
#include "tests/reference/nearest.h"

namespace orin::testing {

template <class T>
class NearestAndItsTwin : public ::testing::Test {};
TYPED_TEST_SUITE(NearestAndItsTwin, EveryPixelType, PixelTypeNames);

TYPED_TEST(NearestAndItsTwin, WriteTheSameBytes) {
  resamplers::NearestNeighbourResamplerFactory factory;
  const Abilities can{.leastMargin = 0, .complexData = true, .farAway = true};
  Differential<TypeParam>(factory, reference::Nearest<TypeParam>, reference::Nearest<double>, can,
                          NotANumber::kBitForBit)
      .CheckEveryCombination();
}

}  // namespace orin::testing
