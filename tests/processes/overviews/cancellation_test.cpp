/// Progress refused at every possible call.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>

#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

/// Raster large enough for several blocks a level at the run's memory budget.
drivers::MemoryRaster SeveralBlocks() { return NoiseOf(6000, 4000, 1, gobs::DataTypeOf<double>()); }

struct Place {
  const char* file;
  int code;
  datasources::LevelPlace place;
};

struct Undisturbed {
  size_t reports;
  LevelPixels pixels;
};

Undisturbed UndisturbedRun(const drivers::MemoryRaster& raster, const Place& place) {
  RecordingHost host;
  host.Put(place.file, raster, place.code);
  EXPECT_TRUE(JobFor(place.file, {2, 4}).Generate());
  return {host.Progress().size(), PixelsOf(host, place.file, place.place)};
}

class Cancellation : public ::testing::TestWithParam<Place> {};

TEST_P(Cancellation, AtAnyCallLeavesNoUnfinishedLevelValidAndTheNextRunFinishes) {
  const Place& place = GetParam();
  const drivers::MemoryRaster raster = SeveralBlocks();
  const auto [reports, pixels] = UndisturbedRun(raster, place);
  ASSERT_GT(reports, 8u);
  for (size_t n = 1; n <= reports; ++n) {
    RecordingHost host;
    host.Put(place.file, raster, place.code);
    host.RefuseProgressAt(n);
    const bool answer = JobFor(place.file, {2, 4}).Generate();
    const bool both =
        IsValid(host, place.file, 2, place.place) && IsValid(host, place.file, 4, place.place);
    EXPECT_TRUE(both || !answer) << n;
    EXPECT_TRUE(ValidChannelsHold(pixels, host, place.file, place.place)) << n;
    EXPECT_TRUE(host.Warnings().empty()) << n;
    EXPECT_EQ(1.0f, host.Progress().back()) << n;
    EXPECT_EQ(0, host.Live().Total()) << n;
    EXPECT_TRUE(JobFor(place.file, {2, 4}).Generate()) << n;
    EXPECT_TRUE(IsValid(host, place.file, 2, place.place)) << n;
    EXPECT_TRUE(IsValid(host, place.file, 4, place.place)) << n;
  }
}

INSTANTIATE_TEST_SUITE_P(Places, Cancellation,
                         ::testing::Values(Place{"a.tif", kFormatTiff,
                                                 datasources::LevelPlace::kInternal},
                                           Place{"a.odd", 99, datasources::LevelPlace::kSideCar}));

TEST(CancellationOfALevel, MarksNothingAndBuildsNothingMore) {
  RecordingHost host;
  host.Put("a.tif", SeveralBlocks());
  host.RefuseProgressAt(4);  // 0.0, message, first block, second block
  EXPECT_FALSE(JobFor("a.tif", {2, 4}).Generate());
  EXPECT_FALSE(IsValid(host, "a.tif", 2));
  EXPECT_TRUE(host.Log("store.SetValid").empty());
  EXPECT_TRUE(host.Log("store.Create(4").empty());
}

TEST(CancellationOfALevel, AtItsLastReportMarksItValidAndStopsTheRun) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(64, 64, 1), 99);
  host.RefuseProgressAt(4);  // 0.0, message, the only block, the level's end at 0.8
  EXPECT_FALSE(JobFor("a.odd", {2, 4}).Generate());
  EXPECT_TRUE(IsValid(host, "a.odd", 2, datasources::LevelPlace::kSideCar));
  EXPECT_TRUE(host.Log("sidecar.Create(4").empty());
}

TEST(CancellationOfALevel, ARefusalOfTheRunsOwnReportsIsIgnored) {
  for (const size_t n : {size_t{1}, size_t{2}}) {
    RecordingHost host;
    host.Put("a.tif", NoiseOf(64, 64, 1));
    host.RefuseProgressAt(n);
    EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
    EXPECT_TRUE(IsValid(host, "a.tif", 2));
  }
}

TEST(CancellationOfALevel, AtTheLastReportOfACompleteRunChangesNothing) {
  // Thirds and sevenths: sums of the shares miss 1.0 in single precision.
  for (const unsigned channels : {1u, 3u, 7u, 49u}) {
    const std::vector<unsigned> levels = {2, 3, 6, 7, 128};  // the last one is empty
    size_t reports = 0;
    {
      RecordingHost host;
      host.Put("a.odd", NoiseOf(64, 64, channels), 99);
      ASSERT_TRUE(JobFor("a.odd", levels).Generate());
      reports = host.Progress().size();
    }
    RecordingHost host;
    host.Put("a.odd", NoiseOf(64, 64, channels), 99);
    host.RefuseProgressAt(reports - 1, true);
    EXPECT_TRUE(JobFor("a.odd", levels).Generate()) << channels;
    EXPECT_TRUE(IsValid(host, "a.odd", 7, datasources::LevelPlace::kSideCar));
  }
}

TEST(CancellationOfALevel, TheRangeOfOneChannelEndsWhereTheSumInDoublePrecisionDoes) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(300, 300, 1), 99);
  std::vector<unsigned> levels;
  for (unsigned level = 2; level <= 150; ++level) levels.push_back(level);
  EXPECT_TRUE(JobFor("a.odd", levels).Generate());
  double total = 0, done = 0;
  for (const unsigned level : levels) total += 1.0 / level / level;
  size_t report = 1;  // behind the run's own first one: message, block, end of each level
  for (const unsigned level : levels) {
    const double share = 1.0 / level / level / total;
    const auto start = static_cast<float>(done);
    const auto end = static_cast<float>(done + static_cast<float>(share));
    const float last = (end - start) * 1.0f + start;  // as the update policy computes it
    EXPECT_EQ(std::min(last, 1.0f), host.Progress().at(report + 2)) << level;
    done += share;
    report += 3;
  }
}

/// An image of floats whose no-data value is NaN, which a run cannot be told.
drivers::MemoryRaster WithNaN() {
  auto raster = PictureOf<float>({{1, 2, 3, 4}, {5, 6, 7, 8}, {1, 2, 3, 4}, {5, 6, 7, 8}});
  raster.metadata["NO_DATA_VALUE"] = "nan";
  return raster;
}

TEST(CancellationOfTheSearchForASubstitute, EndsTheRunBeforeTheLevelExists) {
  RecordingHost host;
  host.Put("a.tif", WithNaN());
  host.RefuseProgressAt(3);  // 0.0, message, the search's only block
  EXPECT_FALSE(JobFor("a.tif", {2}).Generate());
  EXPECT_TRUE(host.Warnings().empty());
  EXPECT_TRUE(CreatedLevels(host).empty());
  EXPECT_EQ(1.0f, host.Progress().back());
  EXPECT_EQ(0, host.Live().Total());
  EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
  EXPECT_TRUE(IsValid(host, "a.tif", 2));
}

TEST(CancellationOfTheSearchForASubstitute, StopsAListToo) {
  RecordingHost host;
  auto large = NoiseOf(300, 10, 1, gobs::DataTypeOf<float>());
  large.metadata["NO_DATA_VALUE"] = "nan";
  for (const char* file : {"a.tif", "b.tif"}) host.Put(file, large);
  host.RefuseProgressAt(3);
  std::vector<std::string> files = {"a.tif", "b.tif"};
  EXPECT_FALSE(CreateFileOverviews().Generate(files));
  EXPECT_TRUE(host.Warnings().empty());
  EXPECT_TRUE(host.Log("Open(b.tif").empty());
}

TEST(CancellationOfAList, StopsTheList) {
  RecordingHost host;
  for (const char* file : {"a.tif", "b.tif"}) host.Put(file, NoiseOf(300, 10, 1));
  host.RefuseProgressAt(3);
  std::vector<std::string> files = {"a.tif", "b.tif"};
  EXPECT_FALSE(CreateFileOverviews().Generate(files));
  EXPECT_TRUE(host.Log("Open(b.tif").empty());
}

}  // namespace
}  // namespace orin::testing
