/// Bilinear against its slow twin.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "processes/qrtfilters/resamplers/factories.h"
#include "tests/processes/qrtfilters/resamplers/differential.h"
#include "tests/reference/bilinear.h"

namespace orin::testing {

template <class T>
class BilinearAndItsTwin : public ::testing::Test {};
TYPED_TEST_SUITE(BilinearAndItsTwin, EveryPixelType, PixelTypeNames);

TYPED_TEST(BilinearAndItsTwin, WriteTheSameBytes) {
  resamplers::BilinearResamplerFactory factory;
  const Abilities can{.leastMargin = 1};
  Differential<TypeParam>(factory, reference::Bilinear<TypeParam>, reference::Bilinear<double>, can,
                          NotANumber::kAnyPayload)
      .CheckEveryCombination();
}

}  // namespace orin::testing
