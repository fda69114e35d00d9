/// A sixth method costs one small file and a factory, and works through the manager like the five.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "processes/qrtfilters/resamplers/resamplermanager.h"
#include "tests/processes/qrtfilters/resamplers/blocks.h"
#include "tests/processes/qrtfilters/resamplers/minimum.h"
#include "tests/processes/qrtfilters/resamplers/refusals.h"

namespace orin::resamplers {
namespace {

using testing::BlockOf;
using testing::Picture;

template <class T>
class AddedMethod : public ::testing::Test {};
template <class... Ts>
::testing::Types<Ts...> AsTestTypes(typedispatch::TypeList<Ts...>);
TYPED_TEST_SUITE(AddedMethod, decltype(AsTestTypes(typedispatch::PixelTypes{})));

TYPED_TEST(AddedMethod, RunsThroughTheManagerForEveryPixelType) {
  MinimumResamplerFactory factory;
  ResamplerManager manager;
  manager.factory = &factory;
  manager.xRatio = manager.yRatio = 0.5;
  // clang-format off
  const auto src = BlockOf<TypeParam>({{9, 8, 7, 6},
                                       {9, 3, 7, 6},
                                       {9, 8, 7, 2},
                                       {9, 8, 1, 6}}, {1, 1, 1, false});
  // clang-format on
  const auto dst = testing::EmptyBlock<TypeParam>(2, 2, {1, 0, 0, false}, TypeParam{77});
  manager.ProcessBlock(src.get(), dst.get());
  const Picture<TypeParam> expected{{3, 3}, {3, 1}};
  EXPECT_EQ(expected, testing::PictureOf<TypeParam>(*dst));
}

TEST(AddedMethodWithAMask, GetsTheMaskRuleForNothing) {
  Minimum<int> kernel;
  kernel.SetRatio(1, 1);
  kernel.SetNoDataValue(-5);
  const auto src = BlockOf<int>({{1, 4, 9}}, {1, 1, 1, false});
  const auto mask = testing::MaskOf(*src, {"x.."});
  for (int64_t y = -1; y < 2; ++y) mask->SetValid(0, y, false);
  EXPECT_EQ((Picture<int>{{-5, 4, 4}}), testing::Resampled<int>(kernel, *src, mask.get(), 3, 1));
}

TEST(AddedMethodWithoutAMargin, IsRefusedLikeTheOthers) {
  Minimum<int> kernel;
  const auto src = BlockOf<int>({{1, 4}, {2, 3}});
  testing::ExpectRefusal(testing::kOnePixelMargin, "", "", 0,
                         [&] { testing::Resampled<int>(kernel, *src, nullptr, 1, 1); });
}

}  // namespace
}  // namespace orin::resamplers
