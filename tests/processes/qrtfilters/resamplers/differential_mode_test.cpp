/// Mode against its slow twin.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "processes/qrtfilters/resamplers/factories.h"
#include "tests/processes/qrtfilters/resamplers/differential.h"
#include "tests/reference/mode.h"

namespace orin::testing {

template <class T>
class ModeAndItsTwin : public ::testing::Test {};
TYPED_TEST_SUITE(ModeAndItsTwin, EveryPixelType, PixelTypeNames);

TYPED_TEST(ModeAndItsTwin, WriteTheSameBytes) {
  resamplers::ModeResamplerFactory factory;
  const Abilities can{.leastMargin = 1};
  Differential<TypeParam>(factory, reference::Mode<TypeParam>, reference::Mode<double>, can,
                          NotANumber::kBitForBit)
      .CheckEveryCombination();
}

}  // namespace orin::testing
