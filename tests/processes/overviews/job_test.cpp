/// The job object: defaults, setters, queries, and how it opens its file.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include "host/services/preferences.h"
#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

using ::testing::ElementsAre;

TEST(Job, ExplicitLevelsAreForgottenWhenAFactorIsSet) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(600, 20, 1));
  CreateFileOverviews job = JobFor("a.tif", {5});
  job.SetPyramidFactor(2, false);
  EXPECT_TRUE(job.Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2, 4));
}

TEST(Job, ABadFactorMeansThePreferredOne) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(900, 20, 1));
  auto registry = std::make_unique<PreferenceRegistry>();
  registry->Set("", RasterLayerPreference(0, 3));
  PreferenceRegistry::Install(std::move(registry));
  CreateFileOverviews job("a.tif");
  job.SetPyramidFactor(5, false);
  EXPECT_TRUE(job.Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(3, 9));
  PreferenceRegistry::Install(nullptr);
}

TEST(Job, OnlyTheConstructorsThatNameAFileAskForThePreferredFactor) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(300, 20, 1));
  auto registry = std::make_unique<PreferenceRegistry>();
  registry->Set("", RasterLayerPreference(0, 3));
  PreferenceRegistry::Install(std::move(registry));
  std::vector<std::string> files = {"a.tif"};
  CreateFileOverviews unnamed;
  EXPECT_TRUE(unnamed.Generate(files));
  EXPECT_THAT(CreatedLevels(host), ElementsAre(2));
  host.Clear();
  EXPECT_TRUE(CreateFileOverviews("a.tif").Generate());
  EXPECT_THAT(CreatedLevels(host), ElementsAre(3));
  PreferenceRegistry::Install(nullptr);
}

TEST(Job, TheDefaultMethodIsThePreferredOne) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 1));
  auto registry = std::make_unique<PreferenceRegistry>();
  registry->Set("", RasterLayerPreference(2, 2));
  PreferenceRegistry::Install(std::move(registry));
  CreateFileOverviews job = JobFor("a.tif", {2});
  job.SetPyramidType(ResampleInvalid);
  job.Generate();
  PreferenceRegistry::Install(nullptr);
  EXPECT_THAT(host.Log("store.Create("), ElementsAre("store.Create(2,{1},MODE)"));
}

TEST(Job, ExistsWhenItsFileCanBeOpened) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 2));
  EXPECT_TRUE(CreateFileOverviews("a.tif").FileExists());
  EXPECT_TRUE(CreateFileOverviews("a.tif").RasterDataExists());
  EXPECT_FALSE(CreateFileOverviews("b.tif").FileExists());
  EXPECT_FALSE(CreateFileOverviews("b.tif").RasterDataExists());
  EXPECT_FALSE(CreateFileOverviews("b.tif").HasComplex());
  EXPECT_FALSE(CreateFileOverviews().FileExists());
  EXPECT_EQ(0, host.Live().Total());
}

TEST(Job, ChannelsAreValidFromOneToTheirNumber) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 2));
  EXPECT_TRUE(CreateFileOverviews("a.tif").ValidChannelList());
  EXPECT_TRUE(CreateFileOverviews("a.tif", {2, 1, 2}).ValidChannelList());
  EXPECT_FALSE(CreateFileOverviews("a.tif", {0}).ValidChannelList());
  EXPECT_FALSE(CreateFileOverviews("a.tif", {1, 3}).ValidChannelList());
  EXPECT_TRUE(CreateFileOverviews("none.tif").ValidChannelList());
  EXPECT_FALSE(CreateFileOverviews("none.tif", {1}).ValidChannelList());
}

TEST(Job, IsComplexWhenAListedChannelIs) {
  RecordingHost host;
  drivers::MemoryRaster raster = NoiseOf(8, 8, 1);
  raster.channels.push_back(NoiseOf(8, 8, 1, gobs::DataTypeOf<float>(true)).channels[0]);
  host.Put("a.tif", raster);
  EXPECT_TRUE(CreateFileOverviews("a.tif").HasComplex());
  EXPECT_FALSE(CreateFileOverviews("a.tif", {1}).HasComplex());
  EXPECT_TRUE(CreateFileOverviews("a.tif", {1, 2}).HasComplex());
}

TEST(Job, ChannelsThatDoNotExistAreNotComplex) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 1, gobs::DataTypeOf<float>(true)));
  EXPECT_FALSE(CreateFileOverviews("a.tif", {0, 2, 4294967295u}).HasComplex());
  EXPECT_TRUE(CreateFileOverviews("a.tif", {0, 2, 1}).HasComplex());
}

TEST(Job, OpensForUpdateAndStaysInsideAFileThatHoldsLevels) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 1));
  EXPECT_TRUE(CreateFileOverviews("a.tif").FileExists());
  EXPECT_THAT(host.Log("Open("), ElementsAre("Open(a.tif,update)"));
  EXPECT_TRUE(host.Log("sidecar.Open").empty());
}

TEST(Job, AReadOnlyFileIsReopenedThroughTheGenericLayer) {
  RecordingHost host;
  drivers::MemoryRaster raster = NoiseOf(8, 8, 1);
  raster.readOnly = true;
  host.Put("a.tif", raster);
  EXPECT_TRUE(CreateFileOverviews("a.tif").FileExists());
  EXPECT_EQ(1u, host.Log("sidecar.Open(a.tif)").size());
}

TEST(Job, AFormatWithoutInternalLevelsIsReopenedThroughTheGenericLayer) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(8, 8, 1), 99);
  EXPECT_TRUE(CreateFileOverviews("a.odd").FileExists());
  EXPECT_EQ(1u, host.Log("sidecar.Open(a.odd)").size());
}

TEST(Job, TheCallersChoiceOfPlaceHolds) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 1));
  host.Put("a.odd", NoiseOf(8, 8, 1), 99);
  CreateFileOverviews outside("a.tif");
  outside.SaveToKvx(true);
  EXPECT_TRUE(outside.FileExists());
  EXPECT_EQ(1u, host.Log("sidecar.Open(a.tif)").size());
  host.Clear();
  CreateFileOverviews inside("a.odd");
  inside.SaveToKvx(false);
  EXPECT_TRUE(inside.FileExists());
  EXPECT_TRUE(host.Log("sidecar.Open").empty());
}

TEST(Job, AGenericLayerThatCannotOpenLeavesNoDataset) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(8, 8, 1), 99);
  host.FailAt("SideCar.Open", 1);
  EXPECT_FALSE(CreateFileOverviews("a.odd").FileExists());
  EXPECT_EQ(0, host.Live().Total());
}

TEST(Job, ACopyIsIndependent) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 64, 2));
  CreateFileOverviews job("a.tif", {2});
  job.SetPyramidType(ResampleNearest);
  job.SetPyramidLevels({4}, true);
  job.ShowProgress(false);
  CreateFileOverviews copy(job);
  CreateFileOverviews assigned;
  assigned = job;
  job.SetPyramidLevels({2}, false);
  const CreateFileOverviews& self = copy;
  copy = self;
  for (CreateFileOverviews* other : {&copy, &assigned}) {
    host.Clear();
    EXPECT_TRUE(other->Generate());
    EXPECT_THAT(host.Log("store.Create("), ElementsAre("store.Create(4,{2},NEAREST)"));
    EXPECT_TRUE(host.Log("Update(0,Gen").empty());
  }
}

}  // namespace
}  // namespace orin::testing
