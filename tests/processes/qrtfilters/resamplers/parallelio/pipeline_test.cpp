/// The order of reading, resampling and writing, and what stays alive.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>
#include <omp.h>

#include "tests/processes/qrtfilters/resamplers/parallelio/levelsetup.h"
#include "tests/testing/fakeraster.h"

namespace orin::parallelio {
namespace {

using gobs::Raster;
using orin::gobs::LiveBlocks;
using orin::gobs::MostLiveBlocks;
using orin::gobs::ResetMostLiveBlocks;
using ::testing::ElementsAre;

TEST(Pipeline, ABlockIsReadThenProcessedThenWritten) {
  LevelSetup level;
  level.Process();
  for (unsigned i = 0; i < LevelSetup::kBlocks; ++i) {
    EXPECT_LT(level.PlaceOf(ReadLine(i)), level.PlaceOf(ProcessLine(i)));
    EXPECT_LT(level.PlaceOf(ProcessLine(i)), level.PlaceOf(WriteLine(i)));
  }
  EXPECT_TRUE(level.LevelIsRight());
  EXPECT_TRUE(level.driver.HasWrittenAll());
  EXPECT_FALSE(level.driver.IsCancelled());
}

TEST(Pipeline, AStepBeginsWhenAllSectionsOfTheStepBeforeHaveEnded) {
  constexpr unsigned kBlocks = 12;
  LevelSetup level(4 * kBlocks);
  level.Process();
  EXPECT_EQ(kBlocks, level.Writes());
  for (unsigned i = 0; i + 2 < kBlocks; ++i) {
    EXPECT_LT(level.PlaceOf(ProcessLine(i)), level.PlaceOf(ReadLine(i + 2)));
    EXPECT_LT(level.PlaceOf(WriteLine(i)), level.PlaceOf(ProcessLine(i + 2)));
    EXPECT_LT(level.PlaceOf(WriteLine(i)), level.PlaceOf(WriteLine(i + 1)));
  }
}

TEST(Pipeline, ProgressIsReportedBeforeEachStepAndAtTheEnd) {
  LevelSetup level;
  level.Process();
  EXPECT_THAT(level.host.Progress(), ElementsAre(0.0f, 1.0f / 3.0f, 2.0f / 3.0f, 1.0f));
  EXPECT_LT(level.PlaceOf(ReadLine(0)), level.PlaceOf("Update(0)"));
  EXPECT_LT(level.PlaceOf("Update(0)"), level.PlaceOf(ProcessLine(0)));
  EXPECT_LT(level.PlaceOf(ProcessLine(0)), level.PlaceOf("Update(0.333333)"));
  EXPECT_LT(level.PlaceOf("Update(0.666667)"), level.PlaceOf(ProcessLine(2)));
  EXPECT_EQ("Update(1)", level.Log().back());
}

TEST(Pipeline, ALevelOfOneBlockIsReadProcessedAndWrittenOnce) {
  LevelSetup level(4);
  level.Process();
  EXPECT_THAT(level.Log(),
              ElementsAre(ReadLine(0), "Update(0)", ProcessLine(0), WriteLine(0), "Update(1)"));
}

TEST(Pipeline, NoMoreThanFourBlocksAreAliveAndNoneIsLeft) {
  const int before = LiveBlocks();
  LevelSetup level(80);
  ResetMostLiveBlocks();
  level.Process();
  EXPECT_LE(MostLiveBlocks() - before, 4);
  EXPECT_GE(MostLiveBlocks() - before, 2);
  EXPECT_EQ(before, LiveBlocks());
}

TEST(Pipeline, LargeBuffersAreHandedFromBlockToBlockAndReturnedAtTheEnd) {
  LevelSetup level(400000);
  level.driver.memoryBudget = 24 << 20;
  const gobs::BlockMappings before = gobs::MappingsOfBlocks();
  uint64_t most = 0;
  level.factory.before = [&](const Raster&, const gobs::Mask*, const Raster&) {
    most = std::max(most, gobs::MappingsOfBlocks().bytes);
  };
  level.Process();
  const gobs::BlockMappings after = gobs::MappingsOfBlocks();
  ASSERT_LE(4u, level.Writes());
  EXPECT_EQ(before.bytes, after.bytes);
  // Two sizes of input and of output at most, two of each alive.
  EXPECT_GE(8u, after.count - before.count);
  EXPECT_GE((24u << 20) + gobs::BlockBuffers::kMaxBytes, most - before.bytes);
}

TEST(Pipeline, BlocksOfTheWindowThatWasPlannedReachKernelAndWriter) {
  LevelSetup level;
  level.reader->SetMargin(3, 1, 2);
  std::vector<std::pair<ProcessWindow, ProcessWindow>> windows;
  level.factory.before = [&](const Raster& src, const gobs::Mask*, const Raster& dst) {
    windows.emplace_back(src.Window(), dst.Window());
  };
  level.Process();
  ASSERT_LE(LevelSetup::kBlocks, windows.size());
  uint32_t y = 0;
  for (const auto& [source, target] : windows) {
    EXPECT_EQ((ProcessWindow{3, 1, 0, 2 * y}), source);
    EXPECT_EQ((ProcessWindow{0, 0, 0, y}), target);
    y += 6 / static_cast<uint32_t>(windows.size());
  }
  EXPECT_TRUE(level.LevelIsRight());
}

TEST(Pipeline, KeptMarginsReachTheOutputBlock) {
  LevelSetup level;
  level.reader->SetMargin(1, 1, 2);
  level.driver.keepOutputMargins = true;
  bool all = true;
  level.factory.before = [&](const Raster&, const gobs::Mask*, const Raster& dst) {
    all = all && dst.marginX == 1 && dst.marginY == 1;
  };
  level.Process();
  EXPECT_TRUE(all);
  EXPECT_TRUE(level.LevelIsRight());
}

TEST(Pipeline, APreloadedOutputBlockHoldsTheWritersPixels) {
  LevelSetup level;
  auto& stored = level.host.Levels("a.tif").levels.at(2).channels[0].samples;
  for (size_t i = 0; i < stored.size(); ++i) stored[i] = static_cast<unsigned char>(i / 40 + 100);
  level.driver.preloadOutput = true;
  std::vector<unsigned> firsts;
  level.factory.before = [&](const Raster&, const gobs::Mask*, const Raster& dst) {
    firsts.push_back(dst.data[0]);
  };
  level.Process();
  EXPECT_THAT(firsts, ElementsAre(100u, 102u, 104u));
  EXPECT_EQ(3u, level.Count("writer[2]{1}.Read"));
}

TEST(Pipeline, WithoutPreloadingTheWriterIsNeverRead) {
  LevelSetup level;
  level.Process();
  EXPECT_EQ(0u, level.Count("writer[2]{1}.Read"));
}

/// Plans as usual, from a reader of its own, and reads all blocks before the pipeline starts.
class Preplanned final : public LevelDriver {
 public:
  explicit Preplanned(datasources::IRasterReader& reader) : reader_(reader) {}
  void ComputeBlocks(std::vector<BlockJob>& blocks, datasources::IRasterReader*,
                     datasources::IRasterWriter* writer) override {
    LevelDriver::ComputeBlocks(blocks, &reader_, writer);
    for (BlockJob& job : blocks) {
      job.raster = new Raster(job.inputInfo, job.inputWindow);
      reader_.Read(*job.raster);
    }
  }

 private:
  datasources::IRasterReader& reader_;
};

TEST(Pipeline, WithoutAReaderThePlannedBlocksAreTaken) {
  LevelSetup level;
  Preplanned driver(*level.reader);
  driver.factory = &level.factory;
  driver.ResamplerManager::xRatio = driver.ResamplerManager::yRatio = 0.5;
  driver.ResamplerAccessPolicy::xRatio = driver.ResamplerAccessPolicy::yRatio = 0.5;
  driver.memoryBudget = 1000;
  driver.Process(nullptr, level.writer.get());
  EXPECT_EQ(LevelSetup::kBlocks, level.Reads());
  EXPECT_EQ(LevelSetup::kBlocks, level.Writes());
  EXPECT_TRUE(level.LevelIsRight());
}

TEST(Pipeline, AnEmptyLevelIsNothingToDoFollowedByTheFinalReport) {
  LevelSetup level;
  orin::testing::FakeRaster target;
  target.level = 2;
  target.width = 0;
  level.driver.Process(level.reader.get(), &target);
  EXPECT_THAT(level.Log(), ElementsAre("Update(1)"));
  EXPECT_TRUE(level.driver.HasWrittenAll());
}

TEST(Pipeline, NestedParallelismIsOnForTheKernelAndRestoredAfterwards) {
  const int former = omp_get_max_active_levels();
  omp_set_max_active_levels(1);
  LevelSetup level;
  int inKernel = 0;
  level.factory.before = [&](const Raster&, const gobs::Mask*, const Raster&) {
    inKernel = omp_get_max_active_levels();
  };
  level.Process();
  EXPECT_LT(1, inKernel);
  EXPECT_EQ(1, omp_get_max_active_levels());
  level.host.FailAt("Writer.Write", 1);
  EXPECT_THROW(level.Process(), Exception);
  EXPECT_EQ(1, omp_get_max_active_levels());
  omp_set_max_active_levels(former);
}

TEST(Pipeline, ThreeThreadsAreAskedForByTheRegionNotForTheProcess) {
  const int former = omp_get_max_threads();
  omp_set_num_threads(5);
  LevelSetup level;
  int team = 0;
  int askedInside = 0;
  level.factory.before = [&](const Raster&, const gobs::Mask*, const Raster&) {
    team = omp_get_num_threads();
    askedInside = omp_get_max_threads();
  };
  level.Process();
  EXPECT_EQ(3, team);
  EXPECT_EQ(5, askedInside);
  EXPECT_EQ(5, omp_get_max_threads());
  omp_set_num_threads(former);
}

}  // namespace
}  // namespace orin::parallelio
