/// Bicubic against its slow twin.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "processes/qrtfilters/resamplers/factories.h"
#include "tests/processes/qrtfilters/resamplers/differential.h"
#include "tests/reference/bicubic.h"

namespace orin::testing {

template <class T>
class BicubicAndItsTwin : public ::testing::Test {};
TYPED_TEST_SUITE(BicubicAndItsTwin, EveryPixelType, PixelTypeNames);

TYPED_TEST(BicubicAndItsTwin, WriteTheSameBytes) {
  resamplers::BicubicResamplerFactory factory;
  const Abilities can{.leastMargin = 3};
  Differential<TypeParam>(factory, reference::Bicubic<TypeParam>, reference::Bicubic<double>, can,
                          NotANumber::kAnyPayload)
      .CheckEveryCombination();
}

}  // namespace orin::testing
