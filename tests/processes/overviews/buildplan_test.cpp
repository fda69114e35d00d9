// SPDX-License-Identifier: MIT
#include "processes/overviews/buildplan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace orin::overviews {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;
using datasources::LevelStatus;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr auto kInside = LevelPlace::kInternal;
constexpr auto kBeside = LevelPlace::kSideCar;

/// A TIFF image that can be written, of three channels, whose pyramid is 2, 4.
RasterFacts Image() {
  RasterFacts facts;
  facts.width = 1000;
  facts.height = 700;
  facts.channels.assign(3, gobs::eDT_8U);
  facts.isTiff = facts.holdsLevels = facts.isWritable = true;
  return facts;
}

LevelDescription Level(unsigned level, const std::string& method, unsigned source = 1,
                       LevelStatus status = LevelStatus::kCurrent) {
  LevelDescription description;
  description.level = level;
  description.method = method;
  description.sourceLevel = source;
  description.status = status;
  description.presentChannels.assign(3, true);
  description.validChannels.assign(
      3, status == LevelStatus::kCurrent || status == LevelStatus::kUnverified);
  return description;
}

RasterFacts ImageWith(std::vector<LevelDescription> inside,
                      std::vector<LevelDescription> beside = {}) {
  RasterFacts facts = Image();
  for (LevelDescription& level : beside) level.place = kBeside;
  facts.inside.levels = std::move(inside);
  facts.beside.levels = std::move(beside);
  return facts;
}

std::vector<unsigned> LevelsOf(const BuildPlan& plan) {
  std::vector<unsigned> levels;
  for (const PlannedLevel& planned : plan.building) levels.push_back(planned.level);
  return levels;
}

BuildRequest Levels(std::vector<unsigned> levels) {
  BuildRequest request;
  request.levels = std::move(levels);
  return request;
}

TEST(PlanBuild, AnImageWithoutLevelsGetsItsPyramidInside) {
  const BuildPlan plan = PlanBuild(Image(), {});
  EXPECT_EQ(Fault::kNone, plan.fault);
  EXPECT_THAT(LevelsOf(plan), ElementsAre(2, 4));
  EXPECT_THAT(plan.channels, ElementsAre(1, 2, 3));
  EXPECT_EQ(kInside, plan.place);
  EXPECT_TRUE(plan.inOnePass);
}

TEST(PlanBuild, NamedLevelsAreBuiltAscendingAndOnce) {
  EXPECT_THAT(LevelsOf(PlanBuild(Image(), Levels({8, 2, 8, 3}))), ElementsAre(2, 3, 8));
}

TEST(PlanBuild, LevelsThatAreUpToDateAreKept) {
  const BuildPlan plan = PlanBuild(ImageWith({Level(2, "MODE"), Level(4, "MODE", 2)}), {});
  EXPECT_THAT(LevelsOf(plan), IsEmpty());
  EXPECT_THAT(plan.kept, ElementsAre(2, 4));
}

TEST(PlanBuild, AStaleLevelIsBuiltByTheMethodItRecordsWhateverTheUsualListSays) {
  const BuildPlan plan = PlanBuild(ImageWith({Level(2, "NEAREST"), Level(4, "NEAREST"),
                                              Level(8, "AVERAGE", 1, LevelStatus::kStale),
                                              Level(16, "MODE", 1, LevelStatus::kUnfinished)}),
                                   {});
  EXPECT_THAT(LevelsOf(plan), ElementsAre(8, 16));
  EXPECT_EQ(ResampleAverage, plan.building[0].method);
  EXPECT_EQ(Reason::kStale, plan.building[0].reason);
  EXPECT_EQ(ResampleMode, plan.building[1].method);
  EXPECT_EQ(Reason::kUnfinished, plan.building[1].reason);
}

TEST(PlanBuild, ALevelWhoseSourceWasChangedIsNotSaidToDifferFromTheImage) {
  LevelDescription above = Level(4, "MODE", 2, LevelStatus::kStale);
  above.reason = datasources::StaleReason::kSourceRebuilt;
  const BuildPlan plan =
      PlanBuild(ImageWith({Level(2, "MODE", 1, LevelStatus::kChanged), above}), {});
  EXPECT_THAT(plan.Levels(Reason::kChanged), ElementsAre(2));
  EXPECT_THAT(plan.Levels(Reason::kSourceRebuilt), ElementsAre(4));
}

TEST(PlanBuild, AMissingLevelTakesTheMethodOfTheOthersElseTheUsualOne) {
  BuildRequest request;
  request.usualMethod = ResampleMode;
  EXPECT_EQ(ResampleAverage,
            PlanBuild(ImageWith({Level(2, "AVERAGE")}), request).building[0].method);
  EXPECT_EQ(ResampleMode, PlanBuild(ImageWith({Level(2, "")}), request).building[0].method);
  EXPECT_EQ(ResampleMode, PlanBuild(Image(), request).building[0].method);
}

TEST(PlanBuild, ANamedMethodRebuildsWhatAnotherOneMade) {
  BuildRequest request = Levels({2, 4, 8});
  request.method = ResampleAverage;
  const BuildPlan plan =
      PlanBuild(ImageWith({Level(2, "AVERAGE"), Level(4, "NEAREST"), Level(8, "")}), request);
  EXPECT_THAT(plan.kept, ElementsAre(2));
  EXPECT_THAT(plan.Levels(Reason::kOtherMethod), ElementsAre(4, 8));
  EXPECT_EQ("NEAREST", plan.building[0].methodBefore);
}

TEST(PlanBuild, OptionsRebuildWhatIsStoredOtherwise) {
  RasterFacts facts = ImageWith({Level(2, "MODE"), Level(4, "MODE")});
  facts.inside.otherForm = {4};
  EXPECT_THAT(PlanBuild(facts, {}).Levels(Reason::kOtherForm), ElementsAre(4));
}

TEST(PlanBuild, LevelsAboveARebuiltOneFollow) {
  BuildRequest request = Levels({2});
  request.force = true;
  const BuildPlan plan = PlanBuild(
      ImageWith({Level(2, "MODE"), Level(4, "MODE", 2), Level(8, "AVERAGE", 4), Level(3, "MODE")}),
      request);
  EXPECT_THAT(LevelsOf(plan), ElementsAre(2, 4, 8));
  EXPECT_THAT(plan.Levels(Reason::kSourceRebuilt), ElementsAre(4, 8));
  EXPECT_EQ(ResampleAverage, plan.building[2].method);
}

TEST(PlanBuild, LevelsBesideOnlyDrawNewOnesThere) {
  const BuildPlan plan = PlanBuild(ImageWith({}, {Level(2, "MODE")}), {});
  EXPECT_EQ(kBeside, plan.place);
  EXPECT_EQ(PlaceReason::kLevelsBeside, plan.placeReason);
  EXPECT_THAT(LevelsOf(plan), ElementsAre(4));
  EXPECT_FALSE(plan.inOnePass);
  BuildRequest inside;
  inside.place = kInside;
  EXPECT_THAT(LevelsOf(PlanBuild(ImageWith({}, {Level(2, "MODE")}), inside)), ElementsAre(2, 4));
}

TEST(PlanBuild, ABuildBesideSeesTheLevelsInside) {
  BuildRequest request = Levels({2, 4});
  request.place = kBeside;
  const BuildPlan plan = PlanBuild(ImageWith({Level(2, "MODE")}), request);
  EXPECT_THAT(plan.kept, ElementsAre(2));
  EXPECT_THAT(LevelsOf(plan), ElementsAre(4));
}

TEST(PlanBuild, WhatCannotHoldLevelsOrWouldLoseByThemGetsThemBeside) {
  RasterFacts facts = Image();
  facts.isCloudOptimized = true;
  EXPECT_EQ(PlaceReason::kCloudOptimized, PlanBuild(facts, {}).placeReason);
  facts.isWritable = false;
  EXPECT_EQ(PlaceReason::kReadOnly, PlanBuild(facts, {}).placeReason);
  facts.holdsLevels = false;
  EXPECT_EQ(PlaceReason::kFormatHoldsNone, PlanBuild(facts, {}).placeReason);
  EXPECT_EQ(kBeside, PlanBuild(facts, {}).place);
  BuildRequest inside;
  inside.place = kInside;
  EXPECT_EQ(Fault::kFormatHoldsNoLevels, PlanBuild(facts, inside).fault);
  facts.holdsLevels = true;
  EXPECT_EQ(Fault::kFileIsReadOnly, PlanBuild(facts, inside).fault);
  facts.isWritable = true;
  EXPECT_EQ(kInside, PlanBuild(facts, inside).place);
}

TEST(PlanBuild, SomeChannelsInsideNeedTheOthersToHaveTheLevel) {
  BuildRequest request = Levels({2});
  request.channels = {1};
  EXPECT_EQ(Fault::kOtherChannelsLackLevel, PlanBuild(Image(), request).fault);
  const LevelDescription stale = Level(2, "MODE", 1, LevelStatus::kStale);
  EXPECT_EQ(Fault::kNone, PlanBuild(ImageWith({stale}), request).fault);
  LevelDescription part = stale;
  part.presentChannels[2] = false;
  EXPECT_EQ(Fault::kOtherChannelsLackLevel, PlanBuild(ImageWith({part}), request).fault);
  request.place = kBeside;
  EXPECT_EQ(Fault::kNone, PlanBuild(Image(), request).fault);
}

TEST(PlanBuild, ChannelsOfOneBitHaveNoLevels) {
  RasterFacts facts = Image();
  facts.channels[1] = gobs::eDT_BIT;
  EXPECT_THAT(PlanBuild(facts, {}).channels, ElementsAre(1, 3));
  BuildRequest request = Levels({2});
  request.channels = {2};
  EXPECT_EQ(Fault::kChannelIsBits, PlanBuild(facts, request).fault);
  request.channels = {4};
  EXPECT_EQ(Fault::kChannelOutside, PlanBuild(facts, request).fault);
  facts.channels.assign(1, gobs::eDT_BIT);
  EXPECT_EQ(Fault::kNone, PlanBuild(facts, {}).fault);
  EXPECT_EQ(Fault::kOnlyBits, PlanBuild(facts, Levels({2})).fault);
}

TEST(PlanBuild, ALevelThatWouldBeEmptyIsLeftOutAndForcedAFault) {
  BuildRequest request = Levels({2, 900});
  const BuildPlan plan = PlanBuild(Image(), request);
  EXPECT_THAT(LevelsOf(plan), ElementsAre(2));
  EXPECT_THAT(plan.empty, ElementsAre(900));
  request.force = true;
  EXPECT_EQ(Fault::kLevelEmpty, PlanBuild(Image(), request).fault);
  EXPECT_EQ(Fault::kLevelTooSmall, PlanBuild(Image(), Levels({2, 1})).fault);
  EXPECT_EQ(Fault::kLevelTooSmall, PlanBuild(Image(), Levels({0})).fault);
}

TEST(PlanBuild, TheFormOfASideCarIsNoneOfLevelsInside) {
  BuildRequest request;
  request.storing.saysBigTiff = true;
  EXPECT_EQ(Fault::kBigTiffInside, PlanBuild(Image(), request).fault);
  request.place = kBeside;
  EXPECT_EQ(Fault::kNone, PlanBuild(Image(), request).fault);
}

TEST(PlanBuild, ComplexPixelsTakeNearestAndAverageOnly) {
  RasterFacts facts = Image();
  facts.channels.assign(1, gobs::DataTypeOf<float>(true));
  BuildRequest request;
  for (const auto type : {ResampleMode, ResampleBilinear, ResampleBicubic}) {
    request.method = type;
    EXPECT_EQ(Fault::kComplexNotSupported, PlanBuild(facts, request).fault);
  }
  for (const auto type : {ResampleNearest, ResampleAverage}) {
    request.method = type;
    EXPECT_EQ(Fault::kNone, PlanBuild(facts, request).fault);
  }
}

}  // namespace
}  // namespace orin::overviews
