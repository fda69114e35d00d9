/// What a run builds, skips and answers.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

using datasources::LevelPlace;
using ::testing::ElementsAre;

TEST(Generate, BuildsLevelsFromTheSmallestDecimationUp) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 1));
  EXPECT_TRUE(JobFor("a.tif", {8, 2, 4}).Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2, 4, 8));
  for (const unsigned level : {2u, 4u, 8u}) EXPECT_TRUE(IsValid(host, "a.tif", level)) << level;
  EXPECT_EQ(0, host.Live().Total());
}

TEST(Generate, BuildsRepeatedLevelsTwice) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 1));
  EXPECT_TRUE(JobFor("a.tif", {8, 2, 2}).Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2, 2, 8));
}

TEST(Generate, ValidLevelsAreNotBuiltAgain) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 2));
  host.AddLevel("a.tif", 2);
  host.AddLevel("a.tif", 4);
  EXPECT_TRUE(JobFor("a.tif", {4, 2}).Generate());
  EXPECT_TRUE(CreatedLevels(host).empty());
  ASSERT_EQ(1u, host.Events().size());
  EXPECT_EQ("No processing required. The requested overviews already exist and are up-to-date.",
            host.Events()[0].message);
  EXPECT_EQ(kRunSource, host.Events()[0].sourceFile);
  EXPECT_EQ(724u, host.Events()[0].line);
  EXPECT_TRUE(host.Progress().empty());
  EXPECT_TRUE(host.Warnings().empty());
}

TEST(Generate, InvalidLevelsAreBuiltAgain) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 2));
  host.AddLevel("a.tif", 2);
  host.AddLevel("a.tif", 4, false);
  EXPECT_TRUE(JobFor("a.tif", {2, 4}).Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(4));
  EXPECT_TRUE(IsValid(host, "a.tif", 4));
}

TEST(Generate, OneInvalidChannelOfTheListIsEnoughToBuildAgain) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 3));
  host.AddLevel("a.tif", 2);
  host.Levels("a.tif").levels.at(2).channels[2].valid = false;
  CreateFileOverviews others("a.tif", {1, 2});
  others.SetPyramidLevels({2}, false);
  EXPECT_TRUE(others.Generate());
  EXPECT_TRUE(CreatedLevels(host).empty());
  EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2));
}

TEST(Generate, ForceRebuildsValidLevels) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 1));
  host.AddLevel("a.tif", 2);
  host.AddLevel("a.tif", 4);
  EXPECT_TRUE(JobFor("a.tif", {4, 2}, true).Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2, 4));
}

TEST(Generate, AForcedFactorRebuildsValidLevels) {
  for (const bool force : {false, true}) {
    RecordingHost host;
    host.Put("a.tif", NoiseOf(600, 48, 1));
    host.AddLevel("a.tif", 2);
    host.AddLevel("a.tif", 4);
    CreateFileOverviews job("a.tif");
    job.SetPyramidFactor(2, force);
    EXPECT_TRUE(job.Generate());
    EXPECT_EQ(force ? 2u : 0u, CreatedLevels(host).size());
  }
}

TEST(Generate, AnEmptyListOfLevelsMeansAPyramid) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(600, 48, 1));
  CreateFileOverviews job("a.tif");
  job.SetPyramidFactor(3, false);
  job.SetPyramidLevels({}, false);
  EXPECT_TRUE(job.Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2, 4)) << "the preferred factor, not the one before";
}

TEST(Generate, LeavesOutBitChannelsAndKeepsTheListInTheJob) {
  RecordingHost host;
  drivers::MemoryRaster raster = NoiseOf(64, 48, 3);
  raster.channels[1].type = gobs::eDT_BIT;
  for (unsigned char& sample : raster.channels[1].samples) sample &= 1;
  host.Put("a.tif", raster);
  host.Put("b.tif", NoiseOf(64, 48, 3));
  CreateFileOverviews job = JobFor("a.tif", {2});
  EXPECT_TRUE(job.Generate());
  EXPECT_THAT(host.Log("store.Create("), ElementsAre("store.Create(2,{1,3},NEAREST)"));
  host.Clear();
  std::vector<std::string> files = {"b.tif"};
  EXPECT_TRUE(job.Generate(files));
  EXPECT_THAT(host.Log("store.Create("), ElementsAre("store.Create(2,{1,3},NEAREST)"));
}

TEST(Generate, AFileOfBitChannelsAloneNeedsNoWork) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 2, gobs::eDT_BIT));
  EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
  EXPECT_TRUE(CreatedLevels(host).empty());
  EXPECT_TRUE(host.Warnings().empty());
}

TEST(Generate, AnswersFalseWithoutAFileAChannelOrALevel) {
  RecordingHost host;
  host.Put("none.tif", NoiseOf(64, 48, 0));
  host.Put("small.tif", NoiseOf(64, 48, 1));
  EXPECT_FALSE(JobFor("missing.tif", {2}).Generate());
  EXPECT_FALSE(JobFor("none.tif", {2}).Generate());
  CreateFileOverviews planned("small.tif");
  EXPECT_FALSE(planned.Generate());
  EXPECT_TRUE(host.Warnings().empty());
  EXPECT_EQ(0, host.Live().Total());
}

TEST(GenerateList, AnEmptyListIsFalse) {
  std::vector<std::string> files;
  EXPECT_FALSE(CreateFileOverviews().Generate(files));
}

TEST(GenerateList, SkipsWhatCannotBeOpenedAndWhatNeedsNothing) {
  RecordingHost host;
  host.Put("small.tif", NoiseOf(64, 48, 1));
  host.Put("big.tif", NoiseOf(300, 10, 1));
  std::vector<std::string> files = {"missing.tif", "small.tif", "big.tif"};
  CreateFileOverviews job;
  EXPECT_TRUE(job.Generate(files));
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2));
  EXPECT_TRUE(IsValid(host, "big.tif", 2));
}

TEST(GenerateList, SkipsReadOnlyFilesThatHaveLevels) {
  RecordingHost host;
  drivers::MemoryRaster raster = NoiseOf(600, 48, 1);
  raster.readOnly = true;
  host.Put("with.tif", raster);
  host.AddLevel("with.tif", 8);
  host.Put("without.tif", raster);
  std::vector<std::string> files = {"with.tif", "without.tif"};
  CreateFileOverviews job;
  EXPECT_TRUE(job.Generate(files));
  EXPECT_EQ(1u, host.Levels("with.tif").levels.size());
  EXPECT_TRUE(host.Levels("with.tif", LevelPlace::kSideCar).levels.empty());
  EXPECT_TRUE(IsValid(host, "without.tif", 2, LevelPlace::kSideCar));
  EXPECT_TRUE(IsValid(host, "without.tif", 4, LevelPlace::kSideCar));
}

TEST(GenerateList, CompletesWritableFilesThatHaveLevels) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(600, 48, 1));
  host.AddLevel("a.tif", 2);
  std::vector<std::string> files = {"a.tif"};
  EXPECT_TRUE(CreateFileOverviews().Generate(files));
  EXPECT_THAT(CreatedLevels(host), ElementsAre(4));
}

TEST(GenerateList, StopsAtTheFirstFailureAndKeepsItsName) {
  RecordingHost host;
  for (const char* file : {"a.tif", "b.tif", "c.tif"}) host.Put(file, NoiseOf(300, 10, 1));
  host.FailAt("Writer.Write", 2);
  std::vector<std::string> files = {"a.tif", "b.tif", "c.tif"};
  CreateFileOverviews job;
  EXPECT_FALSE(job.Generate(files));
  EXPECT_TRUE(IsValid(host, "a.tif", 2));
  EXPECT_FALSE(IsValid(host, "b.tif", 2));
  EXPECT_TRUE(host.Log("Open(c.tif").empty());
  host.Clear();
  EXPECT_TRUE(job.Generate());
  EXPECT_TRUE(IsValid(host, "b.tif", 2));
}

}  // namespace
}  // namespace orin::testing
