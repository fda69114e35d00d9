/// Requests that a run refuses, with the exact words and lines.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

TEST(Validation, RefusesChannelsOutsideTheFile) {
  for (const unsigned channel : {0u, 4u}) {
    RecordingHost host;
    host.Put("a.tif", NoiseOf(64, 64, 3));
    CreateFileOverviews job("a.tif", {1, channel});
    job.SetPyramidLevels({2}, false);
    EXPECT_FALSE(job.Generate());
    ExpectOneWarning(host, 609, "Error. Expecting a non-zero value less than or equal to 3.");
    EXPECT_TRUE(CreatedLevels(host).empty());
  }
}

TEST(Validation, RefusesLevelsBelowTwoCountingThemFromOne) {
  for (const unsigned level : {0u, 1u}) {
    RecordingHost host;
    host.Put("a.tif", NoiseOf(64, 64, 1));
    EXPECT_FALSE(JobFor("a.tif", {2, level}).Generate());
    ExpectOneWarning(
        host, 625, "OLEVELS[2] = " + std::to_string(level) + "  - Levels must be 2 or greater.\n");
    EXPECT_TRUE(CreatedLevels(host).empty());
  }
}

TEST(Validation, ChannelsAreCheckedBeforeLevels) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1));
  CreateFileOverviews job("a.tif", {2});
  job.SetPyramidLevels({1}, false);
  EXPECT_FALSE(job.Generate());
  ExpectOneWarning(host, 609, "Error. Expecting a non-zero value less than or equal to 1.");
}

TEST(Validation, ForcedLevelLargerThanTheImageIsAnError) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(100, 40, 1));
  EXPECT_FALSE(JobFor("a.tif", {2, 64}, true).Generate());
  ExpectOneWarning(host, 641,
                   "You cannot use level 64 With a file with size 100x40 or you will end up with a "
                   "size 0 overview.");
  EXPECT_TRUE(CreatedLevels(host).empty());
}

TEST(Validation, UnforcedLevelLargerThanTheImageIsSkippedWithoutAWord) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(100, 40, 1));
  EXPECT_TRUE(JobFor("a.tif", {2, 64, 200}).Generate());
  EXPECT_TRUE(host.Warnings().empty());
  EXPECT_EQ(std::vector<unsigned>{2}, CreatedLevels(host));
}

TEST(Validation, InternalLevelsNeedAFormatThatHoldsThem) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(64, 64, 1), 99);
  CreateFileOverviews job = JobFor("a.odd", {2});
  job.SaveToKvx(false);
  EXPECT_FALSE(job.Generate());
  ExpectOneWarning(
      host, 658,
      "Error. You have requested overviews be created internally (with KVX=NO) but that "
      "is not supported for " +
          ZMBInfo[99]->description + " files.");
}

TEST(Validation, AFormatWithoutARecordIsCalledByItsName) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(64, 64, 1), 99);
  CreateFileOverviews job = JobFor("a.odd", {2});
  job.SaveToKvx(false);
  ZMBInfo[99] = nullptr;
  EXPECT_FALSE(job.Generate());
  ExpectOneWarning(host, 658,
                   "Error. You have requested overviews be created internally (with KVX=NO) but "
                   "that is not supported for UNKNOWN files.");
}

TEST(Validation, InternalLevelsNeedAWritableFile) {
  RecordingHost host;
  drivers::MemoryRaster raster = NoiseOf(64, 64, 1);
  raster.readOnly = true;
  host.Put("a.tif", raster);
  CreateFileOverviews job = JobFor("a.tif", {2});
  job.SaveToKvx(false);
  EXPECT_FALSE(job.Generate());
  ExpectOneWarning(
      host, 670,
      "Error. You have requested overviews be created internally (with KVX=NO) but that "
      "is not possible for a read-only file.");
}

TEST(Validation, LevelsAreCheckedBeforePlacement) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(64, 64, 1), 99);
  CreateFileOverviews job = JobFor("a.odd", {1});
  job.SaveToKvx(false);
  EXPECT_FALSE(job.Generate());
  ExpectOneWarning(host, 625, "OLEVELS[1] = 1  - Levels must be 2 or greater.\n");
}

TEST(Validation, ComplexDataIsRefusedByAllButNearestAndAverage) {
  for (const int type : {2, 3, 4, 5, 17}) {
    RecordingHost host;
    host.Put("a.tif", NoiseOf(64, 64, 1, gobs::DataTypeOf<short>(true)));
    CreateFileOverviews job = JobFor("a.tif", {2});
    job.SetPyramidType(static_cast<QRTOverviewResampleType>(type));
    EXPECT_FALSE(job.Generate());
    ExpectOneWarning(host, 698, "Only AVER or NEAREST is supported for complex data.");
    EXPECT_TRUE(CreatedLevels(host).empty());
  }
}

TEST(Validation, ComplexDataIsRefusedEvenWhereNothingIsMissing) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1, gobs::DataTypeOf<short>(true)));
  host.AddLevel("a.tif", 2);
  CreateFileOverviews job = JobFor("a.tif", {2});
  job.SetPyramidType(ResampleMode);
  EXPECT_FALSE(job.Generate());
  ExpectOneWarning(host, 698, "Only AVER or NEAREST is supported for complex data.");
  EXPECT_TRUE(host.Events().empty());
}

TEST(Validation, ComplexDataIsTakenByNearest) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1, gobs::DataTypeOf<short>(true)));
  EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
  EXPECT_TRUE(IsValid(host, "a.tif", 2));
}

TEST(Validation, AnUnknownMethodEndsAsAFailureOfTheRun) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1));
  CreateFileOverviews job = JobFor("a.tif", {2});
  job.SetPyramidType(static_cast<QRTOverviewResampleType>(9));
  EXPECT_FALSE(job.Generate());
  ExpectOneWarning(
      host, 913,
      "Failed to create overviews.\nThe ResamplerManager has not been setup correctly. "
      "Ensure the IResamplerFactory has been set for the ResamplerManager before "
      "proceeding.");
  EXPECT_FALSE(IsValid(host, "a.tif", 2));
  EXPECT_EQ(1.0f, host.Progress().back());
}

}  // namespace
}  // namespace orin::testing
