// SPDX-License-Identifier: MIT
#include "host/datasources/genericlayer.h"

#include <gmock/gmock.h>

#include <memory>

#include "host/datasources/datasetmanager.h"
#include "host/datasources/overviewaccessors.h"
#include "host/services/exception.h"
#include "tests/testing/pictures.h"
#include "tests/testing/recordinghost.h"

namespace orin::datasources {
namespace {

using orin::testing::NoiseOf;
using orin::testing::RecordingHost;
using ::testing::Contains;
using ::testing::ElementsAre;

class GenericLayer : public ::testing::Test {
 protected:
  GenericLayer() { host_.Put("a.tif", NoiseOf(16, 16, 2)); }

  IRasterDataset& Open() {
    dataset_.reset(DatasetManager::GetInstance()->OpenFormat("ZMBALL", "a.tif", kUpdate));
    return dynamic_cast<IRasterDataset&>(*dataset_);
  }

  RecordingHost host_;
  std::unique_ptr<IDataset> dataset_;
};

TEST_F(GenericLayer, ListsLevelsInsideAndBesideTheFileTogetherAscending) {
  host_.AddLevel("a.tif", 8);
  host_.AddLevel("a.tif", 2);
  host_.AddLevel("a.tif", 4, true, LevelPlace::kSideCar);
  const std::unique_ptr<IOverviewInfo> info(Open().GetOverviewInfo());
  EXPECT_THAT(info->GetLevels(), ElementsAre(2u, 4u, 8u));
  EXPECT_EQ(LevelPlace::kInternal, info->Describe()[0].place);
  EXPECT_EQ(LevelPlace::kSideCar, info->Describe()[1].place);
  EXPECT_EQ("a.tif.sidecar", info->Describe()[1].file);
}

TEST_F(GenericLayer, WhatStandsInBothIsTakenFromTheSideCar) {
  host_.AddLevel("a.tif", 2, true);
  host_.AddLevel("a.tif", 2, false, LevelPlace::kSideCar);
  const std::unique_ptr<IOverviewInfo> info(Open().GetOverviewInfo());
  EXPECT_THAT(info->GetLevels(), ElementsAre(2u));
  EXPECT_FALSE(info->IsLevelValid(1, 2));
  EXPECT_EQ(LevelPlace::kSideCar, info->Describe()[0].place);
}

TEST_F(GenericLayer, NewLevelsAndMarksGoToTheSideCarAlone) {
  BasicOverviewWriterAccessor accessor(&Open(), {1, 2});
  accessor.SetResamplingName("MODE");
  accessor.CreateLevel(2);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
  gobs::Raster block({8, 8, 2, gobs::eDT_8U}, {});
  std::fill_n(block.data, block.byteSize, uint8_t{1});
  writer->Write(block);
  accessor.SetLevelValid(2, true);
  EXPECT_TRUE(host_.Levels("a.tif").levels.empty());
  const auto& beside = host_.Levels("a.tif", LevelPlace::kSideCar).levels.at(2);
  EXPECT_EQ("MODE", beside.description.method);
  EXPECT_TRUE(beside.channels[0].valid);
  EXPECT_TRUE(beside.channels[1].valid);
}

TEST_F(GenericLayer, ALevelInsideTheFileCanBeReadButNotWrittenOrMarked) {
  host_.AddLevel("a.tif", 2);
  BasicOverviewWriterAccessor accessor(&Open(), {1, 2});
  const std::unique_ptr<IRasterWriter> level(accessor.CreateRasterWriter(2));
  gobs::Raster block({8, 8, 2, gobs::eDT_8U}, {});
  EXPECT_NO_THROW(level->Read(block));
  EXPECT_THAT(host_.Log(), Contains("store.OpenWriter(2,{1,2})"));
  EXPECT_THROW(level->Write(block), Exception);
  EXPECT_THROW(accessor.SetLevelValid(2, false), Exception);
  EXPECT_TRUE(host_.Levels("a.tif").levels.at(2).channels[0].valid);
}

TEST_F(GenericLayer, ALevelInBothPlacesIsOpenedInTheSideCar) {
  host_.AddLevel("a.tif", 2);
  host_.AddLevel("a.tif", 2, true, LevelPlace::kSideCar);
  BasicOverviewWriterAccessor accessor(&Open(), {1});
  const std::unique_ptr<IRasterWriter> level(accessor.CreateRasterWriter(2));
  EXPECT_THAT(host_.Log("sidecar.OpenWriter"), ElementsAre("sidecar.OpenWriter(2,{1})"));
  EXPECT_TRUE(host_.Log("store.OpenWriter").empty());
}

TEST_F(GenericLayer, AFormatWithoutLevelsInsideHasThoseOfTheSideCar) {
  host_.Put("a.tif", NoiseOf(16, 16, 2), 99);
  host_.AddLevel("a.tif", 2);
  host_.AddLevel("a.tif", 4, true, LevelPlace::kSideCar);
  const std::unique_ptr<IOverviewInfo> info(Open().GetOverviewInfo());
  EXPECT_THAT(info->GetLevels(), ElementsAre(4u));
}

TEST_F(GenericLayer, WithoutASideCarFormatTheFileIsRefusedByName) {
  FormatRegistry::Instance().SetSideCarFormat(nullptr);
  try {
    Open();
    FAIL() << "opened";
  } catch (const Exception& e) {
    EXPECT_EQ("a.tif: no side-car format is registered.", e.GetMessage());
  }
  EXPECT_TRUE(host_.Log("Open(").empty());
}

}  // namespace
}  // namespace orin::datasources
