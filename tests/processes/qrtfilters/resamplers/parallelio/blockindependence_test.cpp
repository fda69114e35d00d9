/// No pixel of a level depends on the memory budget, on the tiles, or on the number of threads.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <omp.h>

#include <memory>
#include <string>
#include <vector>

#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/datasources/overviewaccessors.h"
#include "host/drivers/memory/memorydriver.h"
#include "processes/qrtfilters/resamplers/factories.h"
#include "processes/qrtfilters/resamplers/parallelio/filteriodriver.h"
#include "tests/testing/pictures.h"

namespace orin::parallelio {
namespace {

using datasources::BasicOverviewWriterAccessor;
using datasources::BasicReader;
using datasources::DatasetManager;
using datasources::IDataset;
using datasources::IRasterDataset;
using datasources::IRasterReader;
using datasources::IRasterWriter;
using Samples = std::vector<unsigned char>;

constexpr char kName[] = "mem:independence";

struct Conditions {
  uint32_t memoryBudget = 67108864;  ///< bytes
  unsigned tile = 256;               ///< edge of the tiles of source and level, pixels
  int threads = 2;
};

/// Builds `level` from `source` (1: the image), which exists.
void Build(IRasterDataset& raster, resamplers::IResamplerFactory& factory, unsigned source,
           unsigned level, const Conditions& conditions) {
  BasicOverviewWriterAccessor accessor(&raster, {1});
  accessor.CreateLevel(level);
  const std::unique_ptr<IRasterWriter> target(accessor.CreateRasterWriter(level));
  const std::unique_ptr<IRasterReader> from(
      source == 1 ? static_cast<IRasterReader*>(new BasicReader(&raster, {1}, false))
                  : accessor.CreateRasterWriter(source));
  from->SetMargin(factory.GetMargin(), factory.GetMargin(), datasources::kMarginRepeatEdge);
  from->SetTileSize(conditions.tile, conditions.tile);
  target->SetTileSize(conditions.tile, conditions.tile);
  LevelDriver driver;
  driver.factory = &factory;
  const double ratio = double(source) / double(level);
  driver.ResamplerManager::xRatio = driver.ResamplerManager::yRatio = ratio;
  driver.ResamplerAccessPolicy::xRatio = driver.ResamplerAccessPolicy::yRatio = ratio;
  driver.memoryBudget = conditions.memoryBudget;
  driver.SetEnabled(false);
  omp_set_num_threads(conditions.threads);
  driver.Process(from.get(), target.get());
  accessor.SetLevelValid(level, true);
}

struct Step {
  unsigned source;
  unsigned level;
};

constexpr Step kSteps[] = {{1, 2}, {1, 3},  {1, 4}, {1, 5}, {1, 7},
                           {1, 8}, {1, 75}, {2, 4}, {2, 3}, {4, 6}};

Samples LevelUnder(const drivers::MemoryRaster& image, resamplers::IResamplerFactory& factory,
                   const Step& step, const Conditions& conditions) {
  drivers::PutMemoryRaster(kName, image);
  const std::unique_ptr<IDataset> dataset(
      DatasetManager::GetInstance()->Open(kName, datasources::kUpdate));
  auto& raster = dynamic_cast<IRasterDataset&>(*dataset);
  if (step.source != 1) Build(raster, factory, 1, step.source, {});
  Build(raster, factory, step.source, step.level, conditions);
  return drivers::MemoryLevelSamples(kName, 1, step.level);
}

class BlockIndependence : public ::testing::TestWithParam<int> {
 protected:
  void SetUp() override {
    datasources::FormatRegistry::Instance().Clear();
    drivers::RegisterMemoryDriver();
  }
  void TearDown() override {
    omp_set_num_threads(formerThreads_);
    drivers::RemoveMemoryRaster(kName);
    datasources::FormatRegistry::Instance().Clear();
  }
  resamplers::IResamplerFactory& Factory() {
    resamplers::IResamplerFactory* const all[] = {&nearest_, &average_, &mode_, &bilinear_,
                                                  &bicubic_};
    return *all[GetParam()];
  }

  const drivers::MemoryRaster image_ = orin::testing::NoiseOf(1501, 1103, 1);

 private:
  const int formerThreads_ = omp_get_max_threads();
  resamplers::NearestNeighbourResamplerFactory nearest_;
  resamplers::AverageResamplerFactory average_;
  resamplers::ModeResamplerFactory mode_;
  resamplers::BilinearResamplerFactory bilinear_;
  resamplers::BicubicResamplerFactory bicubic_;
};

TEST_P(BlockIndependence, BudgetsFrom64KiBTo256MiBGiveTheSameBytes) {
  for (const Step& step : kSteps) {
    const Samples whole = LevelUnder(image_, Factory(), step, {268435456, 256, 2});
    ASSERT_EQ(size_t{image_.width / step.level} * (image_.height / step.level), whole.size());
    for (const uint32_t budget : {65536u, 300000u, 1048576u, 8388608u, 67108864u})
      EXPECT_TRUE(whole == LevelUnder(image_, Factory(), step, {budget, 256, 2}))
          << step.level << " from " << step.source << ", " << budget;
  }
}

TEST_P(BlockIndependence, TilesAndStripsGiveTheSameBytes) {
  for (const Step& step : kSteps) {
    const Samples whole = LevelUnder(image_, Factory(), step, {268435456, 256, 2});
    for (const unsigned tile : {16u, 100u, 2000u})
      EXPECT_TRUE(whole == LevelUnder(image_, Factory(), step, {1048576, tile, 2}))
          << step.level << " from " << step.source << ", " << tile;
  }
}

TEST_P(BlockIndependence, OneTwoThreeAndEightThreadsGiveTheSameBytes) {
  for (const Step& step : {Step{1, 2}, Step{1, 3}, Step{1, 75}, Step{2, 3}}) {
    const Samples one = LevelUnder(image_, Factory(), step, {1048576, 256, 1});
    for (const int threads : {2, 3, 8})
      EXPECT_TRUE(one == LevelUnder(image_, Factory(), step, {1048576, 256, threads}))
          << step.level << " from " << step.source << ", " << threads << " threads";
  }
}

std::string MethodName(const ::testing::TestParamInfo<int>& method) {
  const char* const names[] = {"Nearest", "Average", "Mode", "Bilinear", "Bicubic"};
  return names[method.param];
}

INSTANTIATE_TEST_SUITE_P(Methods, BlockIndependence, ::testing::Range(0, 5), MethodName);

}  // namespace
}  // namespace orin::parallelio
