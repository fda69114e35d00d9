/// Runs a resampler and its slow twin on the same blocks and compares every byte, and where they
/// fill.
// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>
#include <omp.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <type_traits>
#include <vector>

#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "tests/processes/qrtfilters/resamplers/randomcase.h"
#include "tests/reference/pixels.h"
#include "tests/testing/matchers.h"
#include "tests/testing/randomvalues.h"
#include "tests/testing/rasterbuilder.h"

namespace orin::testing {

template <class T>
using Twin = void (*)(const reference::Block<T>&, const reference::Bits*,
                      const reference::Block<T>&, const reference::Settings&);

template <class T>
reference::Block<T> BlockOf(TestRaster<T>& raster, const Geometry& g, uint32_t channels,
                            bool isComplex) {
  return {g.width, g.height, g.marginX, g.marginY, channels, isComplex ? 2 : 1, raster.Values()};
}

/// Source, mask and two destinations of one case.
template <class T>
struct CaseData {
  explicit CaseData(const Case& c)
      : src(c.src, c.srcChannels, c.settings.isComplex),
        expected(c.dst, c.dstChannels, c.settings.isComplex),
        actual(c.dst, c.dstChannels, c.settings.isComplex) {
    Random random(~c.seed);
    FillRandomly(random, c.values, src.Values(), src.ValueCount());
    if (c.mask != MaskKind::kNone) mask.emplace(c.src, MaskBytes(random, c.mask, c.src));
    if (c.seed % 3 != 0)
      src.Get()->validity =
          std::make_unique<gobs::Mask>(c.src.width, c.src.height, src.Get()->Window());
    before.assign(src.Values(), src.Values() + src.ValueCount());
  }

  TestRaster<T> src, expected, actual;
  std::optional<TestMask> mask;
  std::vector<T> before;  ///< the source's pixels
};

/// \returns false when the case has no defined answer
template <class T>
bool RunTwin(Twin<T> twin, const Case& c, CaseData<T>& data) {
  const bool isComplex = c.settings.isComplex;
  const reference::Block<T> src = BlockOf(data.src, c.src, c.srcChannels, isComplex);
  const reference::Block<T> dst = BlockOf(data.expected, c.dst, c.dstChannels, isComplex);
  reference::Bits bits{c.src.width, c.src.height, c.src.marginX, c.src.marginY, nullptr};
  if (data.mask) bits.bytes = data.mask->Bytes();
  try {
    twin(src, data.mask ? &bits : nullptr, dst, c.settings);
  } catch (const reference::NotDefined&) {
    return false;
  }
  return true;
}

inline void Configure(IRasterResampler& resampler, const reference::Settings& s, uint64_t seed) {
  if (s.ratioGiven) {
    resampler.SetRatio(s.ratioX, s.ratioY);
  } else if (seed % 2 == 0) {  // a ratio taken back is no ratio
    resampler.SetRatio(7, 0.01);
    resampler.ClearRatio();
  }
  resampler.SetNoDataValue(s.noDataValue);
  resampler.SetComplex(s.isComplex);
  if (s.georeferenced)
    resampler.SetGeoReference(s.srcOriginX, s.srcOriginY, s.srcPixelSizeX, s.srcPixelSizeY,
                              s.dstOriginX, s.dstOriginY, s.dstPixelSizeX, s.dstPixelSizeY);
}

template <class T>
void RunProduct(resamplers::IResamplerFactory& factory, const Case& c, CaseData<T>& data) {
  const auto type = gobs::DataTypeOf<T>(c.settings.isComplex);
  const std::unique_ptr<IRasterResampler> resampler(factory.CreateResampler(type));
  ASSERT_NE(resampler, nullptr);
  Configure(*resampler, c.settings, c.seed);
  resampler->Resample(data.src.Get(), data.mask ? data.mask->Get() : nullptr, data.actual.Get());
}

/// Where the twin fills, whatever the pixel type: it writes 7 among zeros there.
inline std::vector<bool> FilledBy(Twin<double> twin, const Case& c, const reference::Bits* bits) {
  TestRaster<double> zeros(c.src, c.srcChannels, c.settings.isComplex);
  TestRaster<double> out(c.dst, c.dstChannels, c.settings.isComplex);
  std::fill_n(zeros.Values(), zeros.ValueCount(), 0.0);
  reference::Settings settings = c.settings;
  settings.noDataValue = 7;
  twin(BlockOf(zeros, c.src, c.srcChannels, settings.isComplex), bits,
       BlockOf(out, c.dst, c.dstChannels, settings.isComplex), settings);
  std::vector<bool> filled;
  for (uint32_t y = 0; y < c.dst.height; ++y)
    for (uint32_t x = 0; x < c.dst.width; ++x) filled.push_back(out.At(x, y) == 7);
  return filled;
}

/// The product tells where it filled exactly where somebody asks for it.
template <class T>
void ExpectValidityOf(Twin<double> twin, const Case& c, CaseData<T>& data) {
  const gobs::Mask* const validity = data.actual.Get()->validity.get();
  ASSERT_EQ(data.mask && data.src.Get()->validity, validity != nullptr);
  if (!validity) return;
  const reference::Bits bits{c.src.width, c.src.height, c.src.marginX, c.src.marginY,
                             data.mask->Bytes()};
  const std::vector<bool> filled = FilledBy(twin, c, &bits);
  size_t n = 0;
  for (uint32_t y = 0; y < c.dst.height; ++y)
    for (uint32_t x = 0; x < c.dst.width; ++x)
      ASSERT_EQ(!filled[n++], validity->IsValid(x, y)) << "at " << x << ", " << y;
}

template <class T>
void ExpectEqualAndClean(CaseData<T>& data, NotANumber nan) {
  EXPECT_TRUE(SamePixels(data.expected, data.actual, nan));
  EXPECT_TRUE(data.actual.GuardsIntact()) << "a write outside the destination's buffer";
  EXPECT_TRUE(data.src.GuardsIntact()) << "a write outside the source's buffer";
  const size_t bytes = data.before.size() * sizeof(T);
  EXPECT_EQ(0, std::memcmp(data.before.data(), data.src.Values(), bytes)) << "source changed";
  EXPECT_TRUE(!data.mask || data.mask->Untouched()) << "mask changed";
}

/// One case of each combination of mapping, mask, channel count and complexness.
template <class T>
class Differential {
 public:
  /// \param fills  the same twin, to tell where it fills
  Differential(resamplers::IResamplerFactory& factory, Twin<T> twin, Twin<double> fills,
               const Abilities& can, NotANumber nan)
      : factory_(factory), twin_(twin), fills_(fills), can_(can), nan_(nan) {}

  /// Other pixels and sizes for each number of threads.
  void CheckEveryCombination() {
    for (const int threads : kThreadCounts) {
      omp_set_num_threads(threads);
      SCOPED_TRACE(::testing::Message() << threads << " threads");
      CheckRound();
      if (::testing::Test::HasFailure()) return;
    }
  }

 private:
  void CheckRound() {
    for (const MappingPlan& plan : kMappings)
      for (int mask = 0; mask < 4; ++mask)
        for (const uint32_t channels : kChannelCounts)
          for (int isComplex = 0; isComplex <= (can_.complexData ? 1 : 0); ++isComplex) {
            CheckOne(plan, static_cast<MaskKind>(mask), channels, isComplex != 0);
            if (::testing::Test::HasFailure()) return;
          }
  }

  /// Draws until the twin has an answer.
  void CheckOne(const MappingPlan& plan, MaskKind mask, uint32_t channels, bool isComplex) {
    for (int attempt = 0; attempt < 200; ++attempt) {
      const Case c = MakeCase(++seed_, plan, mask, channels, isComplex, can_);
      CaseData<T> data(c);
      if (!RunTwin(twin_, c, data)) continue;
      RunProduct(factory_, c, data);
      ExpectEqualAndClean(data, nan_);
      ExpectValidityOf(fills_, c, data);
      if (::testing::Test::HasFailure()) ADD_FAILURE() << c;
      return;
    }
    ADD_FAILURE() << "no defined case for ratio " << plan.ratioX << ", " << plan.ratioY;
  }

  resamplers::IResamplerFactory& factory_;
  Twin<T> twin_;
  Twin<double> fills_;
  Abilities can_;
  NotANumber nan_;
  uint64_t seed_ = 0;
};

using EveryPixelType = ::testing::Types<int8_t, uint8_t, int16_t, uint16_t, int32_t, uint32_t,
                                        float, double, int64_t, uint64_t>;

struct PixelTypeNames {
  template <class T>
  static std::string GetName(int) {
    if (std::is_floating_point_v<T>) return sizeof(T) == 4 ? "float" : "double";
    return (std::is_signed_v<T> ? "int" : "uint") + std::to_string(8 * sizeof(T));
  }
};

}  // namespace orin::testing
