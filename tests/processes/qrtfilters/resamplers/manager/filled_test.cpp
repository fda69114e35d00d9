/// The validity of a computed block is exactly where its method wrote the no-data value.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <memory>
#include <random>
#include <string>
#include <vector>

#include "basic/gobs/mask/mask.h"
#include "processes/qrtfilters/resamplers/factories.h"
#include "processes/qrtfilters/resamplers/resamplermanager.h"

namespace orin::resamplers {
namespace {

using gobs::DataType;
using gobs::DataTypeOf;
using gobs::Mask;
using gobs::Raster;

constexpr uint32_t kSize = 36;  // divisible by 2, 3 and 4

/// Takes a block's own validity for its mask.
class OwnValidity final : public gobs::IMaskDecision {
 public:
  void Decide(const Raster& block, Mask& mask) const override { mask.Intersect(*block.validity); }
};

std::vector<std::unique_ptr<IResamplerFactory>> Methods(bool isComplex) {
  std::vector<std::unique_ptr<IResamplerFactory>> methods;
  for (const model::Method& method : model::kMethods)
    if (!isComplex || method.takesComplex) methods.push_back(MakeResamplerFactory(method.type));
  return methods;
}

/// A block of value 5 in every component, of which `share` of the pixels are no data.
template <class T>
std::unique_ptr<Raster> Source(const DataType& type, uint32_t channels, uint32_t margin,
                               double share) {
  auto block = std::make_unique<Raster>(gobs::RasterInfo(kSize, kSize, channels, type),
                                        parallelio::ProcessWindow{margin, margin, 0, 0});
  std::fill_n(reinterpret_cast<T*>(block->data), block->byteSize / sizeof(T), T{5});
  block->validity = std::make_unique<Mask>(kSize, kSize, block->Window());
  std::mt19937 random(3);
  for (int64_t y = -int64_t{margin}; y < int64_t{kSize} + margin; ++y)
    for (int64_t x = -int64_t{margin}; x < int64_t{kSize} + margin; ++x)
      block->validity->SetValid(x, y, std::bernoulli_distribution(1 - share)(random));
  return block;
}

template <class T>
void Check(uint32_t channels, bool isComplex, unsigned from, unsigned to, double share) {
  const DataType type = DataTypeOf<T>(isComplex);
  for (const auto& factory : Methods(isComplex)) {
    const auto in = Source<T>(type, channels, factory->GetMargin(), share);
    Raster out({kSize * from / to, kSize * from / to, channels, type}, {});
    const OwnValidity decision;
    gobs::MaskDecisionBuilder builder(&decision);
    ResamplerManager manager;
    manager.factory = factory.get();
    manager.xRatio = manager.yRatio = double(from) / to;
    manager.maskBuilder = &builder;
    manager.noDataValue = 9;
    manager.complex = isComplex;
    manager.ProcessBlock(in.get(), &out);
    ASSERT_NE(nullptr, out.validity);
    unsigned filled = 0;
    for (uint32_t y = 0; y < out.height; ++y)
      for (uint32_t x = 0; x < out.width; ++x) {
        const bool isFilled = *reinterpret_cast<const T*>(PixelAddress(out, x, y)) == T{9};
        filled += isFilled ? 1 : 0;
        ASSERT_EQ(!isFilled, out.validity->IsValid(x, y))
            << typeid(*factory).name() << ' ' << channels << " channels, " << from << " to " << to
            << " at " << x << ", " << y;
      }
    const unsigned pixels = out.width * out.height;
    if (share == 0) EXPECT_EQ(0u, filled);
    else if (share == 1) EXPECT_EQ(pixels, filled);
    else EXPECT_TRUE(filled > 0 && filled < pixels);
  }
}

TEST(FilledPixels, AreThoseWithoutValidityWithEveryMethodRatioAndNumberOfChannels) {
  for (const auto& [from, to] : {std::pair{1u, 2u}, {1u, 3u}, {2u, 3u}, {1u, 4u}})
    for (const uint32_t channels : {1u, 2u, 3u, 5u})
      for (const double share : {0.0, 0.4, 0.6, 1.0}) {
        Check<uint8_t>(channels, false, from, to, share);
        Check<float>(channels, false, from, to, share);
      }
}

TEST(FilledPixels, AreThoseWithoutValidityInEveryType) {
  Check<int8_t>(3, false, 1, 2, 0.5);
  Check<int16_t>(3, false, 1, 2, 0.5);
  Check<uint16_t>(1, false, 1, 2, 0.5);
  Check<int32_t>(1, false, 1, 3, 0.5);
  Check<uint32_t>(3, false, 1, 3, 0.5);
  Check<int64_t>(1, false, 1, 2, 0.5);
  Check<uint64_t>(3, false, 1, 2, 0.5);
  Check<double>(1, false, 2, 3, 0.5);
}

TEST(FilledPixels, AreThoseWithoutValidityInComplexSamples) {
  for (const uint32_t channels : {1u, 2u})
    for (const unsigned to : {2u, 3u, 4u}) {
      Check<int16_t>(channels, true, 1, to, 0.5);
      Check<float>(channels, true, 1, to, 0.5);
    }
}

TEST(FilledPixels, ABlockWithoutValidityGivesOneWithout) {
  const auto in = Source<uint8_t>(DataTypeOf<uint8_t>(), 1, 1, 0.5);
  Raster out({kSize / 2, kSize / 2, 1, DataTypeOf<uint8_t>()}, {});
  AverageResamplerFactory factory;
  ResamplerManager manager;
  manager.factory = &factory;
  manager.xRatio = manager.yRatio = 0.5;
  manager.ProcessBlock(in.get(), &out);  // there is no mask builder
  EXPECT_EQ(nullptr, out.validity);
}

}  // namespace
}  // namespace orin::resamplers
