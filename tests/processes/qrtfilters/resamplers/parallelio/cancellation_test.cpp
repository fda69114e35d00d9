/// Progress that is refused: where the pipeline stops, what is written, what is freed.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include "tests/processes/qrtfilters/resamplers/parallelio/levelsetup.h"

namespace orin::parallelio {
namespace {

using orin::gobs::LiveBlocks;
using ::testing::ElementsAre;

constexpr size_t kBlocks = LevelSetup::kBlocks;

TEST(Cancellation, ARefusalBeforeStepNStopsTheLevelThere) {
  for (size_t step = 0; step < kBlocks; ++step) {
    const int before = LiveBlocks();
    LevelSetup level;
    level.host.RefuseProgressAt(step + 1);
    EXPECT_NO_THROW(level.Process());
    EXPECT_TRUE(level.driver.IsCancelled());
    EXPECT_FALSE(level.driver.HasWrittenAll());
    EXPECT_EQ(step + 1, level.Reads()) << step;
    EXPECT_EQ(step, level.Processed()) << step;
    EXPECT_EQ(step == 0 ? 0 : step - 1, level.Writes()) << step;
    EXPECT_EQ(step + 1, level.host.Progress().size()) << step;  // no report after the refusal
    EXPECT_EQ(before, LiveBlocks()) << step;
  }
}

TEST(Cancellation, ARefusalOfTheFinalReportChangesNothing) {
  LevelSetup level;
  level.host.RefuseProgressAt(kBlocks + 1);
  level.Process();
  EXPECT_FALSE(level.driver.IsCancelled());
  EXPECT_TRUE(level.driver.HasWrittenAll());
  EXPECT_TRUE(level.LevelIsRight());
}

TEST(Cancellation, ARefusalAtTheEndOfALevelThatIsNotTheLastCancelsButAllIsWritten) {
  LevelSetup level;
  level.driver.SetRange(0.25f, 0.5f);
  level.host.RefuseProgressAt(kBlocks + 1);
  level.Process();
  EXPECT_THAT(level.host.Progress().back(), 0.5f);
  EXPECT_TRUE(level.driver.IsCancelled());
  EXPECT_TRUE(level.driver.HasWrittenAll());
  EXPECT_EQ(kBlocks, level.Writes());
  EXPECT_TRUE(level.LevelIsRight());
}

TEST(Cancellation, ACancelledDriverStaysCancelledAndOnlyReadsTheFirstBlockAgain) {
  const int before = LiveBlocks();
  LevelSetup level;
  level.host.RefuseProgressAt(2);
  level.Process();
  level.host.Clear();
  level.Process();
  EXPECT_THAT(level.Log(), ElementsAre(ReadLine(0)));
  EXPECT_FALSE(level.driver.HasWrittenAll());
  EXPECT_EQ(before, LiveBlocks());
}

TEST(Cancellation, ALaterLevelForgetsThatTheOneBeforeWasWritten) {
  LevelSetup level;
  level.driver.SetRange(0.25f, 0.5f);
  level.host.RefuseProgressAt(kBlocks + 1);
  level.Process();
  ASSERT_TRUE(level.driver.HasWrittenAll());
  level.Process();
  EXPECT_FALSE(level.driver.HasWrittenAll());
}

TEST(Cancellation, WithProgressDisabledNobodyIsAskedAndNothingStops) {
  LevelSetup level;
  level.driver.SetEnabled(false);
  level.host.RefuseProgressAt(1, true);
  level.Process();
  EXPECT_TRUE(level.host.Progress().empty());
  EXPECT_FALSE(level.driver.IsCancelled());
  EXPECT_TRUE(level.LevelIsRight());
}

struct Stop {
  std::vector<double> fractions;
  size_t at;
};

int StopAt(double fraction, const char* message, void* userData) {
  EXPECT_EQ(nullptr, message);
  auto& stop = *static_cast<Stop*>(userData);
  stop.fractions.push_back(fraction);
  return stop.fractions.size() == stop.at ? 0 : 1;
}

TEST(Cancellation, ACallbackThatReturnsZeroCancelsBelowTheEndOnly) {
  for (size_t at = 1; at <= kBlocks + 1; ++at) {
    LevelSetup level;
    Stop stop{{}, at};
    level.driver.callback = &StopAt;
    level.driver.userData = &stop;
    level.Process();
    EXPECT_EQ(at <= kBlocks, level.driver.IsCancelled()) << at;
    EXPECT_EQ(at > kBlocks, level.driver.HasWrittenAll()) << at;
    EXPECT_EQ(at, stop.fractions.size());
    EXPECT_TRUE(level.host.Progress().empty());
  }
}

TEST(Cancellation, ProgressFollowsTheRangeOfTheLevel) {
  LevelSetup level;
  level.driver.SetRange(0.5f, 1.0f);
  level.Process();
  EXPECT_THAT(level.host.Progress(),
              ElementsAre(0.5f, 0.5f * (1.0f / 3.0f) + 0.5f, 0.5f * (2.0f / 3.0f) + 0.5f, 1.0f));
}

}  // namespace
}  // namespace orin::parallelio
