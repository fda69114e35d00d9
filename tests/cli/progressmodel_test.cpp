/// The progress of a whole run, from fractions that restart at every level.
// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/progressmodel.h"

#include <gtest/gtest.h>

#include <vector>

namespace orin::app {
namespace {

/// The fractions that a run reports for one level, four blocks long.
std::vector<double> ReportsOf(double start, double end) {
  std::vector<double> fractions;
  for (int block = 0; block <= 4; ++block) fractions.push_back(start + (end - start) * block / 4);
  return fractions;
}

/// Costs of levels 2, 4 and 8 are 16 : 4 : 1.
constexpr double kDone4 = 16.0 / 21;
constexpr double kDone8 = 20.0 / 21;

TEST(ProgressModel, NothingIsDoneBeforeTheFirstLevel) {
  ProgressModel model({{2}, {4}}, LevelReport::kToTheEnd);
  EXPECT_EQ(0.0, model.Overall(0.0));
  EXPECT_FALSE(model.HasLevel());
}

TEST(ProgressModel, APassThatReportsToTheEndFillsItsShareOnly) {
  ProgressModel model({{2}, {4}, {8}}, LevelReport::kToTheEnd);
  model.StartLevel(0.0);
  EXPECT_EQ(2u, model.CurrentLevel());
  EXPECT_DOUBLE_EQ(kDone4 / 2, model.Overall(0.5));
  EXPECT_DOUBLE_EQ(kDone4, model.Overall(1.0));
  model.StartLevel(kDone4);
  EXPECT_EQ(4u, model.CurrentLevel());
  EXPECT_DOUBLE_EQ(kDone4, model.Overall(kDone4));
  EXPECT_DOUBLE_EQ((kDone4 + kDone8) / 2, model.Overall((kDone4 + 1) / 2));
  model.StartLevel(kDone8);
  EXPECT_DOUBLE_EQ((kDone8 + 1) / 2, model.Overall((kDone8 + 1) / 2));
  EXPECT_EQ(1.0, model.Overall(1.0));
}

TEST(ProgressModel, PassesWithinTheirShareAreTakenAsTheyAre) {
  ProgressModel model({{2}, {4}, {8}}, LevelReport::kWithinShare);
  model.StartLevel(0.0);
  EXPECT_DOUBLE_EQ(0.25, model.Overall(0.25));
  model.StartLevel(kDone4);
  EXPECT_DOUBLE_EQ(0.9, model.Overall(0.9));
  model.StartLevel(kDone8);
  EXPECT_DOUBLE_EQ(0.98, model.Overall(0.98));
  EXPECT_EQ(1.0, model.Overall(1.0));
}

TEST(ProgressModel, TheWholeNeverShrinksAndEndsAtOne) {
  const double ends[] = {kDone4, kDone8, 1.0};
  for (const LevelReport report : {LevelReport::kToTheEnd, LevelReport::kWithinShare}) {
    ProgressModel model({{2}, {4}, {8}}, report);
    double before = model.Overall(0.0);
    double start = 0.0;
    for (const double end : ends) {
      model.StartLevel(start);
      for (const double fraction : ReportsOf(start, report == LevelReport::kToTheEnd ? 1.0 : end)) {
        const double now = model.Overall(fraction);
        EXPECT_GE(now, before);
        before = now;
      }
      EXPECT_NEAR(end, before, 1e-12);
      start = end;
    }
    EXPECT_EQ(1.0, model.Overall(1.0));
  }
}

TEST(ProgressModel, TheEndOfAFailedRunDoesNotCountAsComplete) {
  ProgressModel model({{2}, {4}}, LevelReport::kWithinShare);
  model.StartLevel(0.0);
  EXPECT_DOUBLE_EQ(0.8, model.Overall(1.0));  // level 2 is four fifths of the work
}

TEST(ProgressModel, LevelsLargerThanTheImageTakeNoPartOfTheBar) {
  // The run counts level 8 (share 1/21) and never starts it.
  ProgressModel model({{2}, {4}, {8, true}}, LevelReport::kWithinShare);
  model.StartLevel(0.0);
  EXPECT_DOUBLE_EQ(0.8, model.Overall(kDone4));
  model.StartLevel(kDone4);
  EXPECT_EQ(1.0, model.Overall(kDone8));
}

TEST(ProgressModel, ARepeatedLevelIsWorkTwice) {
  ProgressModel model({{2}, {2}}, LevelReport::kToTheEnd);
  model.StartLevel(0.0);
  EXPECT_DOUBLE_EQ(0.5, model.Overall(1.0));
  model.StartLevel(0.5);
  EXPECT_DOUBLE_EQ(0.75, model.Overall(0.75));
}

TEST(ProgressModel, AnUnexpectedLevelLeavesTheLastOneCurrent) {
  ProgressModel model({{2}}, LevelReport::kToTheEnd);
  model.StartLevel(0.0);
  model.StartLevel(0.5);
  EXPECT_EQ(2u, model.CurrentLevel());
  EXPECT_DOUBLE_EQ(0.5, model.Overall(0.5));
}

}  // namespace
}  // namespace orin::app
