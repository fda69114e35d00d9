// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildreport.h"

#include <gtest/gtest.h>

namespace orin::app {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;

/// A 1000 x 700 image of which levels 2, 4, 8 are asked for.
BuildPlan Plan(std::vector<unsigned> kept) {
  BuildPlan plan;
  plan.width = 1000;
  plan.height = 700;
  plan.channelCount = 1;
  plan.channels = {1};
  plan.requested = {2, 4, 8};
  plan.kept = std::move(kept);
  return plan;
}

LevelDescription Level(unsigned level, LevelPlace place) {
  LevelDescription description;
  description.level = level;
  description.place = place;
  description.file = place == LevelPlace::kInternal ? "scene.tif" : "scene.tif.ovr";
  description.method = "AVERAGE";
  return description;
}

LevelState State(std::vector<unsigned> valid, std::vector<unsigned> unfinished, LevelPlace place) {
  LevelState state{std::move(valid), std::move(unfinished), {}};
  for (const unsigned level : state.valid) state.descriptions.push_back(Level(level, place));
  return state;
}

TEST(AfterFileName, EveryLineNamesTheFileOnce) {
  EXPECT_EQ("a.tif: Failed.\na.tif: disk full",
            AfterFileName("a.tif", "Failed.\na.tif: disk full"));
  EXPECT_EQ("a.tif: one\na.tif: two", AfterFileName("a.tif", "one\n\ntwo\n"));
  EXPECT_EQ("", AfterFileName("a.tif", ""));
}

TEST(BuildReport, TheSummaryTellsWhatWasBuiltHowAndWhere) {
  EXPECT_EQ("levels built: 2, 4, 8 (AVERAGE, inside the file)",
            SummaryText(Plan({}), State({2, 4, 8}, {}, LevelPlace::kInternal)));
  EXPECT_EQ("levels built: 4, 8 (AVERAGE, in scene.tif.ovr); already up to date: 2",
            SummaryText(Plan({2}), State({2, 4, 8}, {}, LevelPlace::kSideCar)));
}

TEST(BuildReport, KeptLevelsOfUnknownOriginAreNeverCalledUpToDate) {
  BuildPlan plan = Plan({2, 4});
  plan.unverified = {4};
  EXPECT_EQ("nothing to do; already up to date: 2; kept unverified: 4", NothingToDoText(plan));
  plan.unverified = {2, 4};
  EXPECT_EQ("nothing to do; kept unverified: 2, 4", NothingToDoText(plan));
}

TEST(BuildReport, LevelsOfAChangedImageAreNamed) {
  BuildPlan plan = Plan({});
  EXPECT_EQ("", StaleText(plan));
  plan.stale = {2, 8};
  EXPECT_EQ("the image was changed after these levels were built: 2, 8.", StaleText(plan));
}

TEST(BuildReport, LevelsInBothPlacesAreWorthANotice) {
  LevelState state = State({2, 4}, {}, LevelPlace::kInternal);
  EXPECT_EQ("", HiddenLevelsText(state));
  state.descriptions.push_back(Level(8, LevelPlace::kSideCar));
  EXPECT_NE("", HiddenLevelsText(state));
  EXPECT_EQ("", HiddenLevelsText(State({2, 4}, {}, LevelPlace::kSideCar)));
}

TEST(BuildReport, NothingToDoSaysWhy) {
  EXPECT_EQ("nothing to do; already up to date: 2, 4, 8",
            SummaryText(Plan({2, 4, 8}), State({2, 4, 8}, {}, LevelPlace::kInternal)));
  EXPECT_EQ("nothing to do: 1000 x 700 pixels need no levels", NothingToDoText(Plan({})));
  BuildPlan tooLarge = Plan({});
  tooLarge.building = {{2000, true}};
  EXPECT_EQ("nothing to do: every level asked for is larger than the image",
            NothingToDoText(tooLarge));
  BuildPlan masks = Plan({});
  masks.channels.clear();
  EXPECT_EQ("nothing to do: all channels are masks of one bit, which have no levels",
            NothingToDoText(masks));
}

TEST(BuildReport, AnInterruptionTellsWhatIsFinishedAndHowToGoOn) {
  BuildOptions options;
  EXPECT_EQ("Interrupted. Levels finished: 2; still to do: 4, 8. The same command continues there.",
            InterruptedText(State({2}, {4, 8}, LevelPlace::kInternal), options));
  EXPECT_EQ("Interrupted. Levels finished: none; still to do: 2. The same command continues there.",
            InterruptedText(State({}, {2}, LevelPlace::kInternal), options));
  EXPECT_EQ("Interrupted. Levels finished: 2, 4.",
            InterruptedText(State({2, 4}, {}, LevelPlace::kInternal), options));
  options.force = true;
  EXPECT_EQ(
      "Interrupted. Levels finished: 2; still to do: 4. "
      "The same command without --force continues there.",
      InterruptedText(State({2}, {4}, LevelPlace::kInternal), options));
}

TEST(BuildReport, RequestsThatCannotBeAreWrongUsageAndTheRestCannotBeBuilt) {
  for (const unsigned line : {609u, 625u, 641u, 698u}) EXPECT_EQ(kWrongUsage, CodeOfWarning(line));
  for (const unsigned line : {0u, 658u, 670u, 913u}) EXPECT_EQ(kCannotBuild, CodeOfWarning(line));
}

TEST(BuildReport, TheAdviceFitsTheFailure) {
  const LevelState state = State({2}, {4, 8}, LevelPlace::kInternal);
  const BuildOptions options;
  EXPECT_NE(std::string::npos, AdviceAfterFailure(641, state, options).find("--force"));
  EXPECT_NE(std::string::npos, AdviceAfterFailure(658, state, options).find("--external"));
  EXPECT_NE(std::string::npos, AdviceAfterFailure(670, state, options).find("--external"));
  EXPECT_NE(std::string::npos, AdviceAfterFailure(698, state, options).find("--method nearest"));
  EXPECT_EQ(
      "Levels finished: 2; still to do: 4, 8. "
      "When the cause is removed, the same command continues there.",
      AdviceAfterFailure(913, state, options));
  EXPECT_EQ("", AdviceAfterFailure(625, state, options));
}

}  // namespace
}  // namespace orin::app
