/// The recording host itself: what it logs, counts and breaks.
// SPDX-License-Identifier: MIT
#include "tests/testing/recordinghost.h"

#include <gmock/gmock.h>

#include <stdexcept>

#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/overviewaccessors.h"
#include "host/services/exception.h"
#include "host/services/warning.h"
#include "tests/testing/pictures.h"

namespace orin::testing {
namespace {

using datasources::BasicOverviewWriterAccessor;
using datasources::BasicReader;
using datasources::DatasetManager;
using datasources::IDataset;
using datasources::IRasterDataset;
using datasources::IRasterWriter;
using ::testing::ElementsAre;

std::unique_ptr<IDataset> OpenForUpdate(const std::string& file) {
  return std::unique_ptr<IDataset>(DatasetManager::GetInstance()->Open(file, datasources::kUpdate));
}

TEST(RecordingHost, LogsTheCallsOfOneLevelInOrderAndSeesEverythingReleased) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 2));
  {
    const auto dataset = OpenForUpdate("a.tif");
    auto* raster = dynamic_cast<IRasterDataset*>(dataset.get());
    ASSERT_NE(nullptr, raster);
    BasicReader reader(dataset.get(), {1, 2}, false);
    reader.SetMargin(1, 1, 2);
    BasicOverviewWriterAccessor accessor(raster, {1, 2});
    accessor.SetResamplingName("NEAREST");
    accessor.CreateLevel(2);
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
    gobs::Raster block({4, 4, 2, gobs::eDT_8U}, {0, 0, 0, 0});
    reader.Read(block);
    writer->Write(block);
    accessor.SetLevelValid(2, true);
    EXPECT_EQ(1, host.Live().sources);
    EXPECT_EQ(1, host.Live().stores);
    EXPECT_EQ(1, host.Live().readers);
    EXPECT_EQ(1, host.Live().writers);
  }
  EXPECT_THAT(host.Log(),
              ElementsAre("Open(a.tif,update)", "source.OpenReader({1,2})",
                          "reader[1]{1,2}.SetMargin(1,1,2)", "store.Create(2,{1,2},NEAREST)",
                          "store.OpenWriter(2,{1,2})", "reader[1]{1,2}.Read(0,0,4,4)",
                          "writer[2]{1,2}.Write(0,0,4,4)", "store.SetValid(2,{1,2},true)",
                          "~writer[2]{1,2}", "~reader[1]{1,2}", "~source", "~store"));
  EXPECT_EQ(0, host.Live().Total());
  EXPECT_TRUE(host.Levels("a.tif").levels.at(2).channels[1].valid);
}

TEST(RecordingHost, FailsAtTheCallThatWasNamedAndOnlyThere) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(8, 8, 1));
  const auto dataset = OpenForUpdate("a.tif");
  host.FailAt("OpenReader", 2, Fault::kDataException);
  EXPECT_NO_THROW(BasicReader(dataset.get(), {1}, false));
  EXPECT_THROW(BasicReader(dataset.get(), {1}, false), DataException);
  EXPECT_NO_THROW(BasicReader(dataset.get(), {1}, false));
  EXPECT_EQ(3u, host.CallCount("OpenReader"));
  host.FailAt(1, Fault::kStdRuntimeError);
  EXPECT_THROW(BasicReader(dataset.get(), {1}, false), std::runtime_error);
}

TEST(RecordingHost, RefusesTheProgressCallThatWasNamed) {
  RecordingHost host;
  host.RefuseProgressAt(2);
  EXPECT_TRUE(tarn::Counter::Update(0.0f));
  EXPECT_FALSE(tarn::Counter::Update(0.25f, "half of half", nullptr));
  EXPECT_TRUE(tarn::Counter::Update(0.5f));
  host.RefuseProgressAt(1, true);
  EXPECT_FALSE(tarn::Counter::Update(0.75f));
  EXPECT_FALSE(tarn::Counter::Update(1.0f));
  EXPECT_THAT(host.Log(), ElementsAre("Update(0)", "Update(0.25,half of half)", "Update(0.5)",
                                      "Update(0.75)", "Update(1)"));
}

TEST(RecordingHost, KeepsSideCarLevelsApartFromThoseInside) {
  RecordingHost host;
  host.Put("a.odd", NoiseOf(8, 8, 1), 99);
  host.AddLevel("a.odd", 4, true, datasources::LevelPlace::kSideCar);
  const std::unique_ptr<IDataset> dataset(
      DatasetManager::GetInstance()->OpenFormat("ZMBALL", "a.odd", datasources::kReadOnly));
  BasicOverviewWriterAccessor accessor(dynamic_cast<IRasterDataset*>(dataset.get()), {1});
  EXPECT_THAT(accessor.GetLevels(), ElementsAre(4u));
  accessor.CreateLevel(2);
  EXPECT_THAT(host.Log(), ElementsAre("Open(a.odd,read)", "sidecar.Open(a.odd)", "sidecar.List()",
                                      "sidecar.Create(2,{1},)"));
  EXPECT_TRUE(host.Levels("a.odd").levels.empty());
}

TEST(RecordingHost, KeepsReportsWithTheirPlaceAndGivesTheSinksBack) {
  std::vector<std::string> outer;
  auto former = tarn::Warning::SetSink([&](const tarn::Report& r) { outer.push_back(r.message); });
  {
    RecordingHost host;
    tarn::Warning::Warn("inside", "some/file", 12);
    ASSERT_EQ(1u, host.Warnings().size());
    EXPECT_EQ("inside", host.Warnings()[0].message);
    EXPECT_EQ("some/file", host.Warnings()[0].sourceFile);
    EXPECT_EQ(12u, host.Warnings()[0].line);
  }
  tarn::Warning::Warn("outside", "some/file", 13);
  EXPECT_THAT(outer, ElementsAre("outside"));
  tarn::Warning::SetSink(std::move(former));
}

}  // namespace
}  // namespace orin::testing
