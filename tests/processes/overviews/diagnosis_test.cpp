// SPDX-License-Identifier: MIT
#include "processes/overviews/diagnosis.h"

#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

using overviews::Diagnose;
using overviews::Obstacle;

TEST(Diagnosis, TellsSilentAnswersApart) {
  RecordingHost host;
  host.Put("none.tif", NoiseOf(64, 48, 0));
  host.Put("small.tif", NoiseOf(64, 48, 1));
  host.Put("big.tif", NoiseOf(300, 10, 1));
  const auto of = [](const char* file) { return Diagnose(CreateFileOverviews(file)); };
  EXPECT_EQ(Obstacle::kCannotBeOpened, of("missing.tif").obstacle);
  EXPECT_EQ("missing.tif: cannot be opened: No such file or directory.", of("missing.tif").text);
  EXPECT_EQ(Obstacle::kNoRaster, of("none.tif").obstacle);
  EXPECT_EQ("none.tif: holds no pixels.", of("none.tif").text);
  EXPECT_EQ(Obstacle::kNoLevelNeeded, of("small.tif").obstacle);
  EXPECT_EQ("small.tif: an image of 64 x 48 pixels needs no levels.", of("small.tif").text);
  EXPECT_EQ(Obstacle::kNone, of("big.tif").obstacle);
  EXPECT_EQ("", of("big.tif").text);
}

TEST(Diagnosis, GoesByTheJobsLevelsAndPlace) {
  RecordingHost host;
  host.Put("small.tif", NoiseOf(64, 48, 1));
  EXPECT_EQ(Obstacle::kNone, Diagnose(JobFor("small.tif", {2})).obstacle);
  CreateFileOverviews beside("small.tif");
  beside.SaveToKvx(true);
  host.FailAt("SideCar.Open", 1);
  EXPECT_EQ(Obstacle::kCannotBeOpened, Diagnose(beside).obstacle);
}

TEST(Diagnosis, ReportsAndChangesNothing) {
  RecordingHost host;
  host.Put("big.tif", NoiseOf(300, 10, 1));
  Diagnose(CreateFileOverviews("big.tif"));
  Diagnose(CreateFileOverviews("missing.tif"));
  EXPECT_TRUE(host.Warnings().empty());
  EXPECT_TRUE(host.Events().empty());
  EXPECT_TRUE(host.Progress().empty());
  EXPECT_TRUE(CreatedLevels(host).empty());
  EXPECT_EQ(0, host.Live().Total());
}

}  // namespace
}  // namespace orin::testing
