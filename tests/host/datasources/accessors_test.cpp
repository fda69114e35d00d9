// SPDX-License-Identifier: MIT
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
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class Accessors : public ::testing::Test {
 protected:
  Accessors() { host_.Put("a.tif", NoiseOf(16, 12, 3)); }

  IRasterDataset& Open(const std::string& file = "a.tif") {
    dataset_.reset(DatasetManager::GetInstance()->Open(file, kUpdate));
    return dynamic_cast<IRasterDataset&>(*dataset_);
  }

  RecordingHost host_;
  std::unique_ptr<IDataset> dataset_;
};

TEST_F(Accessors, LevelsAreThosePresentForAllChannelsAscending) {
  host_.AddLevel("a.tif", 4);
  host_.AddLevel("a.tif", 2);
  host_.Levels("a.tif").levels.at(2).channels[2].present = false;
  EXPECT_THAT(BasicOverviewReaderAccessor(&Open(), {1, 2}).GetLevels(), ElementsAre(2u, 4u));
  EXPECT_THAT(BasicOverviewReaderAccessor(&Open(), {1, 3}).GetLevels(), ElementsAre(4u));
  EXPECT_THAT(BasicOverviewWriterAccessor(&Open(), {3}).GetLevels(), ElementsAre(4u));
}

TEST_F(Accessors, ALevelIsValidWhenAllChannelsAre) {
  host_.AddLevel("a.tif", 2);
  host_.Levels("a.tif").levels.at(2).channels[1].valid = false;
  EXPECT_TRUE(BasicOverviewReaderAccessor(&Open(), {1, 3}).IsLevelValid(2));
  EXPECT_FALSE(BasicOverviewReaderAccessor(&Open(), {1, 2}).IsLevelValid(2));
  EXPECT_FALSE(BasicOverviewReaderAccessor(&Open(), {1}).IsLevelValid(4));
  const std::unique_ptr<IOverviewInfo> info(Open().GetOverviewInfo());
  EXPECT_TRUE(info->IsLevelValid(1, 2));
  EXPECT_FALSE(info->IsLevelValid(2, 2));
  EXPECT_FALSE(info->IsLevelValid(0, 2));
  EXPECT_FALSE(info->IsLevelValid(4, 2));
  EXPECT_FALSE(info->IsLevelValid(1, 3));
}

TEST_F(Accessors, ChannelNumbersOfSetValidCountWithinTheAccessor) {
  host_.AddLevel("a.tif", 2, false);
  BasicOverviewWriterAccessor accessor(&Open(), {3, 1});
  accessor.SetValid(1, 2, true);
  EXPECT_THAT(host_.Log("store.SetValid"), ElementsAre("store.SetValid(2,{3},true)"));
  accessor.SetValid(2, 2, true);
  accessor.SetLevelValid(2, false);
  EXPECT_THAT(host_.Log("store.SetValid"),
              ElementsAre("store.SetValid(2,{3},true)", "store.SetValid(2,{1},true)",
                          "store.SetValid(2,{3,1},false)"));
  EXPECT_THROW(accessor.SetValid(0, 2, true), Exception);
  EXPECT_THROW(accessor.SetValid(3, 2, true), Exception);
}

TEST_F(Accessors, TheMethodIsRecordedWithTheLevel) {
  BasicOverviewWriterAccessor accessor(&Open(), {1, 2});
  accessor.SetResamplingName("AVERAGE");
  accessor.CreateLevel(4);
  EXPECT_THAT(host_.Log("store.Create"), ElementsAre("store.Create(4,{1,2},AVERAGE)"));
  const std::unique_ptr<IOverviewInfo> info(
      dynamic_cast<IRasterDataset&>(*dataset_).GetOverviewInfo());
  EXPECT_EQ("AVERAGE", info->GetResamplingName(4));
  EXPECT_EQ("", info->GetResamplingName(2));
}

TEST_F(Accessors, CreatingALevelAgainKeepsIt) {
  BasicOverviewWriterAccessor accessor(&Open(), {1});
  accessor.CreateLevel(4);
  host_.Levels("a.tif").levels.at(4).channels[0].samples.assign(12, 9);
  accessor.CreateLevel(4);
  EXPECT_EQ(9, host_.Levels("a.tif").levels.at(4).channels[0].samples[11]);
}

TEST_F(Accessors, AWriterServesAsReaderOfItsLevel) {
  host_.AddLevel("a.tif", 4);
  host_.Levels("a.tif").levels.at(4).channels[1].samples.assign(12, 9);
  BasicOverviewWriterAccessor accessor(&Open(), {2});
  const std::unique_ptr<IRasterReader> reader(accessor.CreateRasterWriter(4));
  EXPECT_EQ(4u, reader->GetWidth());
  EXPECT_EQ(3u, reader->GetHeight());
  EXPECT_EQ(4u, reader->GetLevel());
  EXPECT_EQ(9, reader->GetRaster(0)->data[0]);
}

TEST_F(Accessors, ALevelThatIsNotThereCannotBeOpened) {
  BasicOverviewWriterAccessor accessor(&Open(), {2});
  EXPECT_THROW(delete accessor.CreateRasterWriter(4), Exception);
}

TEST_F(Accessors, AFormatWithoutLevelsListsNoneAndRefusesToMakeAny) {
  host_.Put("a.odd", NoiseOf(16, 12, 1), 99);
  BasicOverviewWriterAccessor writer(&Open("a.odd"), {1});
  BasicOverviewReaderAccessor reader(&dynamic_cast<IRasterDataset&>(*dataset_), {1});
  EXPECT_THAT(reader.GetLevels(), IsEmpty());
  EXPECT_THAT(writer.GetLevels(), IsEmpty());
  EXPECT_FALSE(reader.IsLevelValid(2));
  EXPECT_EQ(nullptr, dynamic_cast<IRasterDataset&>(*dataset_).GetOverviewInfo());
  try {
    writer.CreateLevel(2);
    FAIL() << "a level was made";
  } catch (const Exception& e) {
    EXPECT_EQ("a.odd: its format holds no levels.", e.GetMessage());
  }
}

}  // namespace
}  // namespace orin::datasources
