// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildreport.h"

#include <gtest/gtest.h>

#include "apps/orin-overviews/buildnotices.h"

namespace orin::app {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;
using datasources::LevelStatus;
using overviews::BuildPlan;
using overviews::Fault;
using overviews::RasterFacts;
using overviews::Reason;

LevelDescription Level(unsigned level, LevelPlace place, std::string method = "AVERAGE") {
  LevelDescription description;
  description.level = level;
  description.place = place;
  description.file = place == LevelPlace::kInternal ? "scene.tif" : "scene.tif.ovr";
  description.method = std::move(method);
  description.validChannels = {true};
  description.status = LevelStatus::kCurrent;
  return description;
}

/// A 1000 x 700 image with these levels inside.
RasterFacts Image(std::vector<unsigned> levels) {
  RasterFacts facts;
  facts.width = 1000;
  facts.height = 700;
  facts.channels = {gobs::eDT_8U};
  for (const unsigned level : levels)
    facts.inside.levels.push_back(Level(level, LevelPlace::kInternal));
  return facts;
}

BuildPlan Plan(std::vector<unsigned> kept, std::vector<unsigned> building) {
  BuildPlan plan;
  plan.channels = {1};
  plan.kept = std::move(kept);
  for (const unsigned level : building)
    plan.building.push_back({level, ResampleAverage, Reason::kMissing, ""});
  return plan;
}

LevelState State(std::vector<unsigned> valid, std::vector<unsigned> unfinished) {
  LevelState state{std::move(valid), std::move(unfinished), {}, {}};
  for (const unsigned level : state.valid)
    state.inside.push_back(Level(level, LevelPlace::kInternal));
  return state;
}

TEST(BuildReport, TheSummaryTellsWhatWasBuiltHowAndWhere) {
  EXPECT_EQ("levels built: 2, 4, 8 (AVERAGE, inside the file)",
            SummaryText(Plan({}, {2, 4, 8}), Image({}), State({2, 4, 8}, {})));
  EXPECT_EQ("levels built: 4, 8 (AVERAGE, inside the file); already up to date: 2",
            SummaryText(Plan({2}, {4, 8}), Image({2}), State({2, 4, 8}, {})));
}

TEST(BuildReport, LevelsOfSeveralMethodsAreToldApart) {
  LevelState state = State({2, 4, 8}, {});
  state.inside[1].method = state.inside[2].method = "MODE";
  EXPECT_EQ("levels built: 2 (AVERAGE, inside the file); 4, 8 (MODE, inside the file)",
            SummaryText(Plan({}, {2, 4, 8}), Image({}), state));
}

TEST(BuildReport, KeptLevelsOfUnknownOriginAreNeverCalledUpToDate) {
  RasterFacts facts = Image({2, 4});
  facts.inside.levels[1].status = LevelStatus::kUnverified;
  EXPECT_EQ("nothing to do; already up to date: 2; kept unverified: 4",
            NothingToDoText(Plan({2, 4}, {}), facts));
  facts.inside.levels[0].status = LevelStatus::kUnverified;
  EXPECT_EQ("nothing to do; kept unverified: 2, 4", NothingToDoText(Plan({2, 4}, {}), facts));
}

TEST(BuildReport, LevelsInBothPlacesAreNamedWithThoseThatOthersRead) {
  LevelState state = State({2, 4}, {});
  EXPECT_EQ("", BothPlacesText(state));
  state.beside.push_back(Level(8, LevelPlace::kSideCar));
  EXPECT_EQ(
      "Levels stand inside the file (2, 4) and in scene.tif.ovr (8). Other programs read "
      "those inside only.",
      BothPlacesText(state));
}

TEST(BuildReport, NothingToDoSaysWhy) {
  EXPECT_EQ("nothing to do; already up to date: 2, 4, 8",
            SummaryText(Plan({2, 4, 8}, {}), Image({2, 4, 8}), State({2, 4, 8}, {})));
  EXPECT_EQ("nothing to do: 1000 x 700 pixels need no levels",
            NothingToDoText(Plan({}, {}), Image({})));
  BuildPlan tooLarge = Plan({}, {});
  tooLarge.empty = {2000};
  EXPECT_EQ("nothing to do: every level asked for is larger than the image",
            NothingToDoText(tooLarge, Image({})));
  BuildPlan masks = Plan({}, {});
  masks.channels.clear();
  EXPECT_EQ("nothing to do: all channels are masks of one bit, which have no levels",
            NothingToDoText(masks, Image({})));
}

TEST(BuildReport, AnInterruptionTellsWhatIsFinishedAndHowToGoOn) {
  EXPECT_EQ(
      "Interrupted. Levels finished: 2; still to do: 4, 8. Run the same command again to resume.",
      InterruptedText(State({2}, {4, 8}), false));
  EXPECT_EQ(
      "Interrupted. Levels finished: none; still to do: 2. Run the same command again to resume.",
      InterruptedText(State({}, {2}), false));
  EXPECT_EQ("Interrupted. Levels finished: 2, 4.", InterruptedText(State({2, 4}, {}), false));
  EXPECT_EQ(
      "Interrupted. Levels finished: 2; still to do: 4. "
      "Run the same command without --force to resume.",
      InterruptedText(State({2}, {4}), true));
}

TEST(BuildReport, AFailureTellsWhatIsFinishedAndHowToGoOn) {
  EXPECT_EQ(
      "Levels finished: 2; still to do: 4, 8. "
      "Fix the problem, then run the same command again to resume.",
      RetryText(State({2}, {4, 8}), false));
  EXPECT_EQ("", RetryText(State({2}, {}), false));
}

TEST(BuildNotices, RequestsThatCannotBeAreWrongUsageAndTheRestCannotBeBuilt) {
  for (const Fault fault :
       {Fault::kChannelOutside, Fault::kChannelIsBits, Fault::kOnlyBits, Fault::kLevelTooSmall,
        Fault::kLevelEmpty, Fault::kComplexNotSupported, Fault::kOtherChannelsLackLevel,
        Fault::kPartInOtherForm, Fault::kBigTiffInside})
    EXPECT_EQ(kWrongUsage, CodeOf(fault));
  for (const Fault fault : {Fault::kFormatHoldsNoLevels, Fault::kFileIsReadOnly})
    EXPECT_EQ(kCannotBuild, CodeOf(fault));
  EXPECT_EQ(kDone, CodeOf(Fault::kNone));
}

TEST(BuildNotices, EachReasonNamesItsLevels) {
  BuildPlan plan = Plan({}, {});
  overviews::BuildRequest request;
  EXPECT_TRUE(NoticesOf(plan, request, Image({}), "scene.tif").empty());
  plan.building = {{2, ResampleMode, Reason::kOtherMethod, "NEAREST"},
                   {4, ResampleMode, Reason::kStale, "MODE"},
                   {8, ResampleMode, Reason::kOtherMethod, ""}};
  request.method = ResampleMode;
  const std::vector<std::string> expected = {
      "Rebuilding levels 4: they no longer match the image.",
      "Rebuilding levels 8 by MODE: another program made them, by a method that they do not "
      "record.",
      "Rebuilding levels 2 by MODE: they were made by NEAREST."};
  EXPECT_EQ(expected, NoticesOf(plan, request, Image({}), "scene.tif"));
}

}  // namespace
}  // namespace orin::app
