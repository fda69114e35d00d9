/// The passes of a run: order of calls, sources, progress, no-data.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <cstring>
#include <locale>

#include "host/datasources/blocksize.h"
#include "host/services/text.h"
#include "tests/processes/overviews/overviewstesting.h"
#include "tests/testing/fakeraster.h"

namespace orin::testing {
namespace {

using datasources::LevelPlace;
using ::testing::ElementsAre;

TEST(Passes, TiffTakesAllChannelsInOnePassAndMarksTheLevel) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 3));
  EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
  EXPECT_THAT(
      host.Log(),
      ElementsAre("Open(a.tif,update)", "Open(a.tif,update)", "~source", "~store", "store.List()",
                  "Update(0)", "Update(0,Generating overview level: 2)",
                  "source.OpenReader({1,2,3})", "reader[1]{1,2,3}.GetAuxiliaryData()",
                  "reader[1]{1,2,3}.GetAuxiliaryData()", "store.Create(2,{1,2,3},NEAREST)",
                  "store.OpenWriter(2,{1,2,3})", "store.List()", "source.OpenReader({1,2,3})",
                  "reader[1]{1,2,3}.SetMargin(0,0,2)", "reader[1]{1,2,3}.Read(0,0,8,8)",
                  "Update(0)", "writer[2]{1,2,3}.Write(0,0,4,4)", "Update(1)",
                  "store.SetValid(2,{1,2,3},true)", "~writer[2]{1,2,3}", "~reader[1]{1,2,3}",
                  "~reader[1]{1,2,3}", "Update(1)", "~source", "~store"));
}

TEST(Passes, OtherFormatsTakeChannelByChannelAndMarkEachOne) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(8, 8, 3), 99);
  CreateFileOverviews job("a.odd", {3, 1});
  job.SetPyramidType(ResampleNearest);
  job.SetPyramidLevels({2}, false);
  EXPECT_TRUE(job.Generate());
  EXPECT_THAT(host.Log("sidecar.Create"),
              ElementsAre("sidecar.Create(2,{3},NEAREST)", "sidecar.Create(2,{1},NEAREST)"));
  EXPECT_THAT(host.Log("sidecar.SetValid"),
              ElementsAre("sidecar.SetValid(2,{3},true)", "sidecar.SetValid(2,{1},true)"));
}

TEST(Passes, TheMethodsMarginIsAskedForInModeTwo) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(32, 32, 1));
  const char* names[] = {"NEAREST", "AVERAGE", "MODE", "BILINEAR", "BICUBIC"};
  const char* margins[] = {"0,0", "1,1", "1,1", "1,1", "3,3"};
  for (int type = 0; type <= 4; ++type) {
    host.Clear();
    CreateFileOverviews job = JobFor("a.tif", {2}, true);
    job.SetPyramidType(static_cast<QRTOverviewResampleType>(type));
    job.Generate();
    EXPECT_THAT(host.Log("store.Create("),
                ElementsAre(std::string("store.Create(2,{1},") + names[type] + ")"));
    EXPECT_THAT(host.Log("reader[1]{1}.SetMargin"),
                ElementsAre(std::string("reader[1]{1}.SetMargin(") + margins[type] + ",2)"));
  }
}

/// "level<-source" of every level that a job builds.
std::vector<std::string> SourcesOf(RecordingHost& host, QRTOverviewResampleType type,
                                   const std::vector<unsigned>& levels) {
  CreateFileOverviews job = JobFor("a.tif", levels);
  job.SetPyramidType(type);
  job.Generate();
  std::vector<std::string> sources;
  std::string level;
  for (const std::string& line : host.Log()) {
    if (line.rfind("store.Create(", 0) == 0) level = line.substr(13, line.find(',') - 13);
    const size_t margin = line.find("}.SetMargin(");
    if (margin == std::string::npos) continue;
    const size_t open = line.find('[');
    sources.push_back(level + "<-" + line.substr(open + 1, line.find(']') - open - 1));
  }
  return sources;
}

TEST(Passes, AverageReadsTheLargestSmallerDivisor) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(96, 96, 1));
  EXPECT_THAT(SourcesOf(host, ResampleAverage, {2, 4, 8}), ElementsAre("2<-1", "4<-2", "8<-4"));
  RecordingHost other;
  other.Put("a.tif", NoiseOf(96, 96, 1));
  EXPECT_THAT(SourcesOf(other, ResampleAverage, {2, 3, 6}), ElementsAre("2<-1", "3<-1", "6<-3"));
}

TEST(Passes, OtherMethodsReadTheLargestSmallerLevel) {
  for (const auto type : {ResampleNearest, ResampleMode, ResampleBilinear, ResampleBicubic}) {
    RecordingHost host;
    host.Put("a.tif", NoiseOf(96, 96, 1));
    EXPECT_THAT(SourcesOf(host, type, {2, 3, 6}), ElementsAre("2<-1", "3<-2", "6<-3")) << type;
  }
}

TEST(Passes, AnExistingLevelServesAsSourceWhetherItIsValidOrNot) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(96, 96, 1));
  host.AddLevel("a.tif", 4, false);
  EXPECT_THAT(SourcesOf(host, ResampleNearest, {2, 8}), ElementsAre("2<-1", "8<-4"));
}

TEST(Passes, PixelsOfALevelAreThoseOfItsSource) {
  RecordingHost host;
  host.Put("a.tif", PictureOf<uint8_t>({{1, 2, 3, 4, 5, 6},
                                        {7, 8, 9, 10, 11, 12},
                                        {13, 14, 15, 16, 17, 18},
                                        {19, 20, 21, 22, 23, 24},
                                        {25, 26, 27, 28, 29, 30},
                                        {31, 32, 33, 34, 35, 36}}));
  EXPECT_TRUE(JobFor("a.tif", {2, 3}).Generate());
  const auto& levels = host.Levels("a.tif").levels;
  EXPECT_THAT(levels.at(2).channels[0].samples, ElementsAre(1, 3, 5, 13, 15, 17, 25, 27, 29));
  EXPECT_THAT(levels.at(3).channels[0].samples, ElementsAre(1, 3, 13, 15));  // from level 2
}

TEST(Passes, ProgressOfATiffLevelEndsAtOneAndStartsWhereTheOnesBeforeEnded) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1));
  EXPECT_TRUE(JobFor("a.tif", {2, 4}).Generate());
  // Shares: 1/4 and 1/16 of 5/16.
  EXPECT_THAT(host.Log("Update("),
              ElementsAre("Update(0)", "Update(0,Generating overview level: 2)", "Update(0)",
                          "Update(1)", "Update(0.8,Generating overview level: 4)", "Update(0.8)",
                          "Update(1)", "Update(1)"));
}

TEST(Passes, ProgressOfOtherFormatsRunsThroughTheChannels) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(64, 64, 2), 99);
  EXPECT_TRUE(JobFor("a.odd", {2, 4}).Generate());
  const std::vector<float> expected = {0, 0, 0, 0.4f, 0.4f, 0.8f, 0.8f, 0.8f, 0.9f, 0.9f, 1, 1};
  ASSERT_EQ(expected.size(), host.Progress().size());
  for (size_t i = 0; i < expected.size(); ++i)
    EXPECT_NEAR(expected[i], host.Progress()[i], 1e-6) << i;
}

TEST(Passes, SkippedLevelsHaveAShareButNoMessage) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1));
  EXPECT_TRUE(JobFor("a.tif", {2, 128}).Generate());
  EXPECT_EQ(1u, host.Log("Update(0,Generating").size());
  EXPECT_TRUE(host.Log("store.Create(128").empty());
}

TEST(Passes, MessagesCanBeSwitchedOff) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1));
  CreateFileOverviews job = JobFor("a.tif", {2});
  job.ShowProgress(false);
  EXPECT_TRUE(job.Generate());
  EXPECT_THAT(host.Log("Update("), ElementsAre("Update(0)", "Update(0)", "Update(1)", "Update(1)"));
}

TEST(Passes, BlocksStayWithinABudgetOf64MiB) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(6000, 4000, 1, gobs::DataTypeOf<double>()));
  FakeRaster image = LevelOf(6000, 4000, 1);
  FakeRaster level = LevelOf(6000, 4000, 2);
  image.type = level.type = gobs::DataTypeOf<double>();
  EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
  // 64 MiB over two of each: 8 bytes of input, and 8 of output for every fourth one.
  unsigned width = 0, height = 0;
  FindOptimalRasterSize(&image, &level, 67108864 / 16, width, height, {});
  EXPECT_EQ(FormatString("writer[2]{1}.Write(0,0,%u,%u)", width, height),
            host.Log("writer[2]{1}.Write").front());
  EXPECT_LT(1u, host.Log("writer[2]{1}.Write").size());
}

drivers::MemoryRaster WithNoData(drivers::MemoryRaster raster, const std::string& file,
                                 const std::string& channel) {
  if (!file.empty()) raster.metadata["NO_DATA_VALUE"] = file;
  if (!channel.empty()) raster.channels[0].metadata["NO_DATA_VALUE"] = channel;
  return raster;
}

std::vector<unsigned char> LevelTwo(const drivers::MemoryRaster& raster) {
  RecordingHost host;
  host.Put("a.tif", raster);
  EXPECT_TRUE(JobFor("a.tif", {2}).Generate());
  return host.Levels("a.tif").levels.at(2).channels[0].samples;
}

TEST(Passes, TheFilesNoDataValueComesBeforeTheChannels) {
  const auto picture = PictureOf<uint8_t>({{9, 0, 3, 0}, {0, 0, 0, 0}});
  EXPECT_THAT(LevelTwo(WithNoData(picture, "9", "")), ElementsAre(9, 3));
  EXPECT_THAT(LevelTwo(WithNoData(picture, "", "9")), ElementsAre(9, 3));
  // The channel's 3 is what is masked; the file's 9 is what fills.
  EXPECT_THAT(LevelTwo(WithNoData(picture, "9", "3")), ElementsAre(9, 9));
}

/// Writes "1,5" for one and a half.
class DecimalComma final : public std::numpunct<char> {
  char do_decimal_point() const override { return ','; }
};

TEST(Passes, TheNoDataTextIsReadTheSameInEveryLocale) {
  const auto picture =
      WithNoData(PictureOf<float>({{-9.5f, -9.5f, 3, 3}, {-9.5f, -9.5f, 3, 3}}), "-9.5", "");
  const std::locale former =
      std::locale::global(std::locale(std::locale::classic(), new DecimalComma));
  const std::vector<unsigned char> samples = LevelTwo(picture);
  std::locale::global(former);
  float pixels[2];
  ASSERT_EQ(sizeof pixels, samples.size());
  std::memcpy(pixels, samples.data(), sizeof pixels);
  EXPECT_EQ(-9.5f, pixels[0]);
  EXPECT_EQ(3.0f, pixels[1]);
}

}  // namespace
}  // namespace orin::testing
