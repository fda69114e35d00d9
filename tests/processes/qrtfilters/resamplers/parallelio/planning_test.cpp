/// How a level is cut into blocks, and what each of them is computed from.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <type_traits>
#include <vector>

#include "processes/qrtfilters/resamplers/parallelio/filteriodriver.h"
#include "tests/testing/fakeraster.h"
#include "tests/testing/virtualslot.h"

namespace orin::parallelio {
namespace {

using gobs::DataTypeOf;
using gobs::RasterInfo;
using orin::testing::FakeRaster;
using orin::testing::LevelOf;
using orin::testing::SlotOf;

void SetRatio(LevelDriver& driver, double ratio) {
  driver.ResamplerAccessPolicy::xRatio = driver.ResamplerAccessPolicy::yRatio = ratio;
  driver.ResamplerManager::xRatio = driver.ResamplerManager::yRatio = ratio;
}

std::vector<BlockJob> PlanOf(LevelDriver& driver, FakeRaster& source, FakeRaster& target) {
  SetRatio(driver, double(source.level) / target.level);
  std::vector<BlockJob> blocks;
  driver.ComputeBlocks(blocks, &source, &target);
  return blocks;
}

TEST(LevelDriver, StartsWithTheDefaults) {
  const LevelDriver driver;
  EXPECT_EQ(268435456u, driver.memoryBudget);
  EXPECT_FALSE(driver.preloadOutput);
  EXPECT_FALSE(driver.keepOutputMargins);
  EXPECT_EQ(1.0, driver.ResamplerAccessPolicy::xRatio);
  EXPECT_EQ(1.0, driver.ResamplerAccessPolicy::yRatio);
  EXPECT_FALSE(driver.HasWrittenAll());
}

TEST(LevelDriver, DerivesFromItsPoliciesInOrderAndKeepsTheSlotOfThePlanning) {
  const LevelDriver driver;
  const void* const parts[] = {static_cast<const resamplers::ResamplerManager*>(&driver),
                               static_cast<const ResamplerAccessPolicy*>(&driver),
                               static_cast<const TARNUpdateStrategy*>(&driver),
                               &driver.memoryBudget,
                               &driver.preloadOutput,
                               &driver.keepOutputMargins};
  for (size_t i = 1; i < std::size(parts); ++i) EXPECT_LT(parts[i - 1], parts[i]) << i;
  EXPECT_EQ(2u, SlotOf(&LevelDriver::ComputeBlocks));  // after the destructor's two
  EXPECT_TRUE(std::has_virtual_destructor_v<ResamplerAccessPolicy>);
}

TEST(BlockJob, FieldsStandInTheirOrderAndHoldNoBlockAtFirst) {
  const BlockJob job;
  const void* const fields[] = {&job.inputInfo, &job.outputInfo, &job.inputWindow,
                                &job.outputWindow, &job.raster};
  for (size_t i = 1; i < std::size(fields); ++i) EXPECT_LT(fields[i - 1], fields[i]) << i;
  EXPECT_EQ(nullptr, job.raster);
}

TEST(ProcessWindow, HoldsMarginsThenPosition) {
  const ProcessWindow window{1, 2, 3, 4};
  EXPECT_EQ(1u, window.marginX);
  EXPECT_EQ(2u, window.marginY);
  EXPECT_EQ(3u, window.x);
  EXPECT_EQ(4u, window.y);
}

TEST(Planning, BlocksCoverTheLevelOnceRowByRowAndNoneIsEmpty) {
  FakeRaster source = LevelOf(83, 61, 1);
  FakeRaster target = LevelOf(83, 61, 2);  // 41 x 30
  LevelDriver driver;
  driver.memoryBudget = 100;  // blocks of 3 x 3
  const std::vector<BlockJob> blocks = PlanOf(driver, source, target);
  ASSERT_EQ(14u * 10, blocks.size());
  uint32_t x = 0;
  uint32_t y = 0;
  for (const BlockJob& job : blocks) {
    EXPECT_EQ(x, job.outputWindow.x);
    EXPECT_EQ(y, job.outputWindow.y);
    EXPECT_EQ(x == 39 ? 2u : 3u, job.outputInfo.width);  // narrower at the right edge
    EXPECT_EQ(3u, job.outputInfo.height);
    EXPECT_EQ(nullptr, job.raster);
    x += job.outputInfo.width;
    if (x == 41) {
      x = 0;
      y += job.outputInfo.height;
    }
  }
  EXPECT_EQ(30u, y);
  EXPECT_EQ(83u, driver.sourceWidth);
  EXPECT_EQ(61u, driver.sourceHeight);
}

TEST(Planning, TheBlocksAtTheBottomAreShorter) {
  FakeRaster source = LevelOf(80, 62, 1);
  FakeRaster target = LevelOf(80, 62, 2);  // 40 x 31
  LevelDriver driver;
  driver.memoryBudget = 100;
  EXPECT_EQ(1u, PlanOf(driver, source, target).back().outputInfo.height);
}

TEST(Planning, InputsCarryTheReadersMarginsAndOutputsNoneUnlessKept) {
  FakeRaster source = LevelOf(80, 60, 1);
  source.SetMargin(3, 1, 2);
  FakeRaster target = LevelOf(80, 60, 4);
  LevelDriver driver;
  driver.memoryBudget = 100;
  for (const bool keep : {false, true}) {
    driver.keepOutputMargins = keep;
    for (const BlockJob& job : PlanOf(driver, source, target)) {
      EXPECT_EQ(3u, job.inputWindow.marginX);
      EXPECT_EQ(1u, job.inputWindow.marginY);
      EXPECT_EQ(4 * job.outputWindow.x, job.inputWindow.x);
      EXPECT_EQ(4 * job.outputWindow.y, job.inputWindow.y);
      EXPECT_EQ(4 * job.outputInfo.width, job.inputInfo.width);
      EXPECT_EQ(4 * job.outputInfo.height, job.inputInfo.height);
      EXPECT_EQ(keep ? 3u : 0u, job.outputWindow.marginX);
      EXPECT_EQ(keep ? 1u : 0u, job.outputWindow.marginY);
    }
  }
}

TEST(Planning, InputsHaveTheChannelsAndTheTypeOfTheOutput) {
  FakeRaster source = LevelOf(80, 60, 1);
  FakeRaster target = LevelOf(80, 60, 2);
  target.channels = 3;
  target.type = DataTypeOf<float>(true);
  LevelDriver driver;
  for (const BlockJob& job : PlanOf(driver, source, target)) {
    EXPECT_EQ(3u, job.outputInfo.channelCount);
    EXPECT_EQ(target.type, job.outputInfo.dataType);
    EXPECT_EQ(3u, job.inputInfo.channelCount);
    EXPECT_EQ(target.type, job.inputInfo.dataType);
  }
}

TEST(Planning, TheBudgetInPixelsWeighsChannelsAndBitsOfBothSides) {
  FakeRaster source = LevelOf(2, 40000000, 1);
  FakeRaster target = LevelOf(2, 40000000, 2);
  source.channels = target.channels = 3;
  source.type = target.type = DataTypeOf<unsigned short>();
  target.storedTileHeight = 1;  // any height suits
  LevelDriver driver;
  driver.memoryBudget = 67108864;
  // 64 MiB / (2 * (3*0.8*0.25*16/8 + 3*0.8*16/8)) = 5592405.33; the fraction is cut.
  unsigned width = 0;
  unsigned height = 0;
  FindOptimalRasterSize(&source, &target, 5592405, width, height, {});
  const auto blocks = PlanOf(driver, source, target);
  EXPECT_EQ(height, blocks[0].outputInfo.height);
  EXPECT_EQ(5592405u / 5, height);
}

TEST(Planning, AHugeBudgetDoesNotOverflow) {
  FakeRaster source = LevelOf(1000, 1000, 1);
  FakeRaster target = LevelOf(1000, 1000, 2);
  source.type = target.type = {1, false, false, 1, 0, false};
  LevelDriver driver;
  driver.memoryBudget = 4294967295u;
  EXPECT_EQ(1u, PlanOf(driver, source, target).size());
}

TEST(Planning, ATinyBudgetStillGivesBlocks) {
  FakeRaster source = LevelOf(10, 10, 1);
  FakeRaster target = LevelOf(10, 10, 2);
  LevelDriver driver;
  driver.memoryBudget = 0;
  EXPECT_EQ(25u, PlanOf(driver, source, target).size());
}

TEST(Planning, ALevelWithoutPixelsHasNoBlocks) {
  FakeRaster source = LevelOf(10, 10, 1);
  FakeRaster target = LevelOf(10, 10, 2);
  target.width = 0;
  LevelDriver driver;
  EXPECT_TRUE(PlanOf(driver, source, target).empty());
  target.width = 5;
  target.height = 0;
  EXPECT_TRUE(PlanOf(driver, source, target).empty());
}

/// x and width of the source block of a row of pixels [x, x + width).
std::pair<uint32_t, uint32_t> SourceOf(double ratio, uint32_t limit, uint32_t x, uint32_t width) {
  ResamplerAccessPolicy access;
  access.xRatio = ratio;
  access.yRatio = 1.0;
  access.sourceWidth = limit;
  access.sourceHeight = 1;
  ProcessWindow position;
  const RasterInfo input = access.InputOf({width, 1, 1, gobs::eDT_8U}, {0, 0, x, 0}, position);
  EXPECT_EQ(0u, position.y);
  EXPECT_EQ(1u, input.height);
  return {position.x, input.width};
}

using Span = std::pair<uint32_t, uint32_t>;

TEST(ResamplerAccessPolicy, PositionsAndSizesAreDividedByTheRatio) {
  EXPECT_EQ(Span(6, 8), SourceOf(0.5, 1000, 3, 4));
  EXPECT_EQ(Span(0, 1), SourceOf(1.0, 1000, 0, 1));
}

TEST(ResamplerAccessPolicy, QuotientsAreTruncatedNotRounded) {
  EXPECT_EQ(Span(7, 12), SourceOf(0.4, 1000, 3, 5));  // 7.5 and 12.5
  EXPECT_EQ(Span(9, 3), SourceOf(1.0 / 3, 1000, 3, 1));
  EXPECT_EQ(Span(224, 449), SourceOf(1.0 / 75, 1000, 3, 6));  // just below 225 and 450 in double
}

TEST(ResamplerAccessPolicy, ABlockThatWouldPassTheEdgeIsCutThere) {
  EXPECT_EQ(Span(6, 4), SourceOf(0.5, 10, 3, 3));
  EXPECT_EQ(Span(6, 6), SourceOf(0.5, 12, 3, 3));
  EXPECT_EQ(Span(8, 1), SourceOf(0.5, 9, 4, 1));
}

TEST(ResamplerAccessPolicy, BothAxesHaveTheirOwnRatioAndEdge) {
  ResamplerAccessPolicy access;
  access.xRatio = 0.5;
  access.yRatio = 0.25;
  access.sourceWidth = 100;
  access.sourceHeight = 30;
  ProcessWindow position;
  const RasterInfo input = access.InputOf({5, 4, 2, DataTypeOf<short>()}, {3, 2, 10, 4}, position);
  EXPECT_EQ((ProcessWindow{3, 2, 20, 16}), position);
  EXPECT_EQ(10u, input.width);
  EXPECT_EQ(14u, input.height);
  EXPECT_EQ(2u, input.channelCount);
  EXPECT_EQ(DataTypeOf<short>(), input.dataType);
}

}  // namespace
}  // namespace orin::parallelio
