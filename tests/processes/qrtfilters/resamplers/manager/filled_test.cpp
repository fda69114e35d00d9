/// The validity of a computed block is exactly where its method wrote the no-data value; of methods
/// from elsewhere, what has a valid source pixel within reach.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <optional>
#include <random>
#include <string>
#include <vector>

#include "basic/gobs/mask/mask.h"
#include "processes/qrtfilters/resamplers/factories.h"
#include "processes/qrtfilters/resamplers/resamplermanager.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

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

/// Counts the kernels that another factory makes.
class CountingFactory final : public IResamplerFactory {
 public:
  explicit CountingFactory(IResamplerFactory& factory) : factory_(factory) {}
  IRasterResampler* CreateResampler(const DataType& type) override {
    ++made;
    return factory_.CreateResampler(type);
  }
  uint32_t GetMargin() override { return factory_.GetMargin(); }

  int made = 0;

 private:
  IResamplerFactory& factory_;
};

TEST(FilledPixels, CostNoSecondKernel) {
  for (const auto& factory : Methods(false)) {
    const auto in = Source<uint8_t>(DataTypeOf<uint8_t>(), 1, factory->GetMargin(), 0.5);
    Raster out({kSize / 2, kSize / 2, 1, DataTypeOf<uint8_t>()}, {});
    const OwnValidity decision;
    gobs::MaskDecisionBuilder builder(&decision);
    CountingFactory counting(*factory);
    ResamplerManager manager;
    manager.factory = &counting;
    manager.xRatio = manager.yRatio = 0.5;
    manager.maskBuilder = &builder;
    manager.ProcessBlock(in.get(), &out);
    EXPECT_NE(nullptr, out.validity);
    EXPECT_EQ(1, counting.made);
  }
}

/// A method from elsewhere, for float pixels only: the difference between the largest and the
/// smallest of the valid pixels of a square of 3 x 3, 0 over a plain. Knows of no validity.
class Range final : public Resampler {
 public:
  explicit Range(int& runs) : runs_(runs) {}
  void Resample(Raster* src, Mask* srcMask, Raster* dst) override {
    ++runs_;
    const auto in = gobs::ViewOf<const float>(*src, 1);
    for (uint32_t y = 0; y < dst->height; ++y)
      for (uint32_t x = 0; x < dst->width; ++x) {
        float least = 1e9f, most = -1e9f;
        const auto centreX = static_cast<int64_t>(x / state_.ratioX);
        const auto centreY = static_cast<int64_t>(y / state_.ratioY);
        for (int64_t j = centreY - 1; j <= centreY + 1; ++j)
          for (int64_t i = centreX - 1; i <= centreX + 1; ++i)
            if (!srcMask || srcMask->IsValid(i, j)) {
              least = std::min(least, *in.At(i, j));
              most = std::max(most, *in.At(i, j));
            }
        *gobs::ViewOf<float>(*dst, 1).At(x, y) =
            least <= most ? most - least : static_cast<float>(state_.noDataValue);
      }
  }
  uint32_t GetMargin() override { return 1; }

 private:
  int& runs_;
};

class RangeFactory final : public IResamplerFactory {
 public:
  IRasterResampler* CreateResampler(const DataType& type) override {
    return type == DataTypeOf<float>() ? new Range(runs) : nullptr;
  }
  uint32_t GetMargin() override { return 1; }

  int runs = 0;
};

/// The level of a plain of 5 by `Range`, of which `share` is no data, filled with 9.
struct RangeLevel {
  explicit RangeLevel(double share, unsigned factor)
      : in(Source<float>(DataTypeOf<float>(), 1, 1, share)),
        out({kSize / factor, kSize / factor, 1, DataTypeOf<float>()}, {}) {
    const OwnValidity decision;
    gobs::MaskDecisionBuilder builder(&decision);
    ResamplerManager manager;
    manager.factory = &factory;
    manager.xRatio = manager.yRatio = 1.0 / factor;
    manager.maskBuilder = &builder;
    manager.noDataValue = 9;
    manager.ProcessBlock(in.get(), &out);
  }

  RangeFactory factory;
  std::unique_ptr<Raster> in;
  Raster out;
};

TEST(FilledPixelsOfAMethodFromElsewhere, NeverHoldDataAndCostNoSecondRun) {
  for (const unsigned factor : {1u, 2u, 3u, 4u}) {
    RangeLevel level(0.97, factor);
    ASSERT_NE(nullptr, level.out.validity);
    EXPECT_EQ(1, level.factory.runs);
    int noData = 0, data = 0;
    for (uint32_t y = 0; y < level.out.height; ++y)
      for (uint32_t x = 0; x < level.out.width; ++x) {
        const bool isFilled = *gobs::ViewOf<float>(level.out, 1).At(x, y) == 9;
        const bool isValid = level.out.validity->IsValid(x, y);
        EXPECT_FALSE(!isFilled && !isValid) << "lost data at " << x << ", " << y;
        (isValid ? data : noData) += 1;
      }
    EXPECT_TRUE(data > 0) << factor;
    EXPECT_TRUE(noData > 0 || factor > 2) << factor;
  }
}

TEST(FilledPixelsOfAMethodFromElsewhere, AreThoseWithoutAValidPixelWithinReach) {
  RangeLevel level(1, 2);
  Mask& sources = *level.in->validity;
  sources.SetValid(12, 20, true);
  RangeFactory factory;
  const OwnValidity decision;
  gobs::MaskDecisionBuilder builder(&decision);
  ResamplerManager manager;
  manager.factory = &factory;
  manager.xRatio = manager.yRatio = 0.5;
  manager.maskBuilder = &builder;
  manager.ProcessBlock(level.in.get(), &level.out);
  for (uint32_t y = 0; y < level.out.height; ++y)
    for (uint32_t x = 0; x < level.out.width; ++x) {
      const bool isInReach = x >= 5 && x <= 6 && y >= 9 && y <= 10;  // 11..14 and 19..22, 9..12 ...
      EXPECT_EQ(isInReach, level.out.validity->IsValid(x, y)) << x << ", " << y;
    }
}

TEST(FilledPixelsOfAMethodFromElsewhere, AreNoneOfAPlainAndAllWithoutAnyData) {
  const RangeLevel all(0, 2);
  EXPECT_EQ(std::optional(true), all.out.validity->Uniform());
  const RangeLevel none(1, 2);
  EXPECT_EQ(std::optional(false), none.out.validity->Uniform());
}

}  // namespace
}  // namespace orin::resamplers
