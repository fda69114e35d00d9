/// What the table says of each method is what its kernels do.
// SPDX-License-Identifier: MIT
#include "host/model/methods.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <random>
#include <set>

#include "basic/core/typedispatch/pixeltypes.h"
#include "host/services/exception.h"
#include "processes/qrtfilters/resamplers/factories.h"

namespace orin::resamplers {
namespace {

using model::kMethods;
using model::Method;

constexpr uint32_t kSize = 24;  // divisible by 2, 3 and 4

template <class Visit>
void ForEachType(Visit&& visit) {
  const auto all = [&]<class... Ts>(typedispatch::TypeList<Ts...>) {
    (visit(gobs::DataTypeOf<Ts>()), ...);
  };
  all(typedispatch::PixelTypes{});
}

bool TakesComplex(IRasterResampler& kernel) {
  try {
    kernel.SetComplex(true);
    return true;
  } catch (const Exception&) {
    return false;
  }
}

/// Random whole numbers from 0 to 9, and the level that the method makes of them.
struct Reduction {
  explicit Reduction(const Method& method, double ratio) {
    const auto factory = MakeResamplerFactory(method.type);
    const uint32_t margin = factory->GetMargin();
    const gobs::DataType type = gobs::DataTypeOf<double>();
    const auto size = static_cast<uint32_t>(std::lround(kSize * ratio));
    gobs::Raster src({kSize, kSize, 1, type}, {margin, margin, 0, 0});
    gobs::Raster dst({size, size, 1, type}, {});
    std::mt19937 random(1);
    for (double *at = reinterpret_cast<double*>(src.data),
                *end = at + src.byteSize / sizeof(double);
         at != end; ++at)
      *at = std::uniform_int_distribution(0, 9)(random);
    const std::unique_ptr<IRasterResampler> kernel(factory->CreateResampler(type));
    kernel->SetRatio(ratio, ratio);
    kernel->Resample(&src, nullptr, &dst);
    const auto* first = reinterpret_cast<const double*>(dst.data);
    values.assign(first, first + uint64_t{size} * size);
  }

  std::vector<double> values;
};

TEST(TableOfMethods, HasAFactoryForEachRow) {
  for (const Method& method : kMethods) {
    SCOPED_TRACE(method.name);
    const auto factory = MakeResamplerFactory(method.type);
    ASSERT_NE(nullptr, factory);
    ForEachType([&](const gobs::DataType& type) {
      const std::unique_ptr<IRasterResampler> kernel(factory->CreateResampler(type));
      ASSERT_NE(nullptr, kernel);
      EXPECT_EQ(factory->GetMargin(), kernel->GetMargin());
    });
  }
}

TEST(TableOfMethods, HasAnotherFactoryForEachRow) {
  std::set<std::string> kernels;
  for (const Method& method : kMethods) {
    const std::unique_ptr<IRasterResampler> kernel(
        MakeResamplerFactory(method.type)->CreateResampler(gobs::eDT_8U));
    kernels.insert(typeid(*kernel).name());
  }
  EXPECT_EQ(kMethods.size(), kernels.size());
}

TEST(TableOfMethods, HasNoFactoryForWhatIsNoMethod) {
  EXPECT_EQ(nullptr, MakeResamplerFactory(ResampleInvalid));
  EXPECT_EQ(nullptr, MakeResamplerFactory(static_cast<QRTOverviewResampleType>(kMethods.size())));
}

TEST(TableOfMethods, SaysWhoTakesComplexData) {
  for (const Method& method : kMethods) {
    SCOPED_TRACE(method.name);
    const auto factory = MakeResamplerFactory(method.type);
    ForEachType([&](const gobs::DataType& type) {
      const std::unique_ptr<IRasterResampler> kernel(factory->CreateResampler(type));
      EXPECT_EQ(method.takesComplex, TakesComplex(*kernel));
    });
  }
}

TEST(TableOfMethods, SaysWhoMakesValuesThatTheImageDoesNotHold) {
  for (const Method& method : kMethods) {
    bool makesOthers = false;
    for (const double value : Reduction(method, 1.0 / 4).values)
      makesOthers = makesOthers || value != std::trunc(value) || value < 0 || value > 9;
    EXPECT_EQ(method.blends, makesOthers) << method.name;
  }
}

}  // namespace
}  // namespace orin::resamplers
