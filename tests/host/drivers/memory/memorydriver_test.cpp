// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memorydriver.h"

#include <gmock/gmock.h>

#include <memory>

#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/datasources/overviewaccessors.h"
#include "host/services/exception.h"
#include "tests/testing/pictures.h"

namespace orin::drivers {
namespace {

using datasources::AccessMode;
using datasources::BasicOverviewWriterAccessor;
using datasources::BasicReader;
using datasources::DatasetManager;
using datasources::FormatRegistry;
using datasources::IDataset;
using datasources::IRasterDataset;
using datasources::IRasterWriter;
using orin::testing::ChannelOf;
using orin::testing::PictureOf;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class MemoryDriver : public ::testing::Test {
 protected:
  MemoryDriver() {
    FormatRegistry::Instance().Clear();
    RegisterMemoryDriver();
    PutMemoryRaster("mem:a", PictureOf<unsigned char>({{1, 2}, {3, 4}}));
  }
  ~MemoryDriver() override {
    for (const char* name : {"mem:a", "mem:b"}) RemoveMemoryRaster(name);
    FormatRegistry::Instance().Clear();
  }
  static std::unique_ptr<IDataset> Open(const std::string& name,
                                        AccessMode mode = datasources::kUpdate) {
    return std::unique_ptr<IDataset>(DatasetManager::GetInstance()->Open(name, mode));
  }
  /// Builds a level of one pixel.
  static void BuildLevel(IDataset& dataset, unsigned level, unsigned char value) {
    BasicOverviewWriterAccessor accessor(dynamic_cast<IRasterDataset*>(&dataset), {1});
    accessor.SetResamplingName("NEAREST");
    accessor.CreateLevel(level);
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(level));
    gobs::Raster block({1, 1, 1, gobs::eDT_8U}, {});
    block.data[0] = value;
    writer->Write(block);
    accessor.SetLevelValid(level, true);
  }
};

TEST_F(MemoryDriver, ServesTheHostsOwnFormat) {
  EXPECT_EQ(3, ZMBTestOpen("mem:a"));
  EXPECT_EQ(0, ZMBTestOpen("mem:other"));
  ASSERT_NE(nullptr, ZMBGetFormatInfo(3));
  EXPECT_EQ("TESSRA", ZMBGetFormatInfo(3)->name);
  EXPECT_EQ("memory raster", ZMBGetFormatInfo(3)->description);
  EXPECT_EQ(1, ZMBGetFormatInfo(3)->nativeOverviews);
}

TEST_F(MemoryDriver, DeliversThePixelsThatWereHandedOver) {
  const auto dataset = Open("mem:a", datasources::kReadOnly);
  BasicReader reader(dataset.get(), {1}, false);
  const auto block = reader.GetRaster(0);
  EXPECT_THAT(std::vector<unsigned>(block->data, block->data + 4), ElementsAre(1, 2, 3, 4));
  EXPECT_EQ(256u, reader.GetTileWidth());
  EXPECT_EQ(256u, reader.GetTileHeight());
  EXPECT_EQ(1u, reader.GetLevel());
}

TEST_F(MemoryDriver, LevelsLiveAsLongAsTheNameAndAreSharedByAllDatasets) {
  BuildLevel(*Open("mem:a"), 2, 42);
  const auto again = Open("mem:a", datasources::kReadOnly);
  const std::unique_ptr<datasources::IOverviewInfo> info(
      dynamic_cast<IRasterDataset&>(*again).GetOverviewInfo());
  EXPECT_THAT(info->GetLevels(), ElementsAre(2u));
  EXPECT_TRUE(info->IsLevelValid(1, 2));
  EXPECT_THAT(MemoryLevelSamples("mem:a", 1, 2), ElementsAre(42));
}

TEST_F(MemoryDriver, AReplacedRasterHasNoLevels) {
  BuildLevel(*Open("mem:a"), 2, 42);
  PutMemoryRaster("mem:a", PictureOf<unsigned char>({{9, 9}, {9, 9}}));
  EXPECT_THAT(MemoryLevelSamples("mem:a", 1, 2), IsEmpty());
  EXPECT_THAT(MemoryLevelSamples("mem:a", 1, 1), ElementsAre(9, 9, 9, 9));
}

TEST_F(MemoryDriver, OpenDatasetsKeepARasterWhoseNameIsGone) {
  const auto dataset = Open("mem:a");
  BasicReader reader(dataset.get(), {1}, false);
  RemoveMemoryRaster("mem:a");
  EXPECT_EQ(4, reader.GetRaster(0)->data[3]);
  EXPECT_NO_THROW(BuildLevel(*dataset, 2, 1));
  EXPECT_THROW(Open("mem:a"), Exception);
}

TEST_F(MemoryDriver, SamplesOfWhatDoesNotExistAreEmpty) {
  EXPECT_THAT(MemoryLevelSamples("mem:other", 1, 1), IsEmpty());
  EXPECT_THAT(MemoryLevelSamples("mem:a", 2, 1), IsEmpty());
  EXPECT_THAT(MemoryLevelSamples("mem:a", 0, 1), IsEmpty());
  EXPECT_THAT(MemoryLevelSamples("mem:a", 1, 2), IsEmpty());
}

TEST_F(MemoryDriver, AReadOnlyRasterIsRefusedForUpdateByName) {
  MemoryRaster picture = PictureOf<unsigned char>({{1, 2}, {3, 4}});
  picture.readOnly = true;
  PutMemoryRaster("mem:b", picture);
  try {
    Open("mem:b", datasources::kUpdate);
    FAIL() << "opened";
  } catch (const Exception& e) {
    EXPECT_EQ("mem:b: cannot be changed: it is read-only.", e.GetMessage());
  }
  const auto dataset = Open("mem:b", datasources::kReadOnly);
  EXPECT_THROW(BuildLevel(*dataset, 2, 1), Exception);
}

TEST_F(MemoryDriver, AChannelWhoseSizeDoesNotFitIsRefused) {
  MemoryRaster picture = PictureOf<unsigned char>({{1, 2}, {3, 4}});
  picture.channels.push_back(ChannelOf<short>({{1, 2}, {3, 4}}));
  EXPECT_NO_THROW(PutMemoryRaster("mem:b", picture));
  picture.channels[1].samples.pop_back();
  try {
    PutMemoryRaster("mem:b", picture);
    FAIL() << "taken";
  } catch (const DataException& e) {
    EXPECT_EQ("mem:b: channel 2 holds 7 bytes; 2 x 2 pixels of its type take 8.", e.GetMessage());
  }
}

TEST_F(MemoryDriver, ChannelsOfDifferentTypesOpenTogetherButReadApart) {
  MemoryRaster picture = PictureOf<unsigned char>({{1, 2}, {3, 4}});
  picture.channels.push_back({gobs::eDT_BIT, {1, 0, 0, 1}, {}});
  PutMemoryRaster("mem:b", picture);
  const auto dataset = Open("mem:b");
  EXPECT_NO_THROW(BasicReader(dataset.get(), {1}, false));
  EXPECT_NO_THROW(BasicReader(dataset.get(), {2}, false));
  EXPECT_THROW(BasicReader(dataset.get(), {1, 2}, false), DataException);
}

TEST_F(MemoryDriver, MetadataFollowsTheReadersChannels) {
  MemoryRaster picture = PictureOf<unsigned char>({{1, 2}});
  picture.channels.push_back(ChannelOf<unsigned char>({{1, 2}}));
  picture.metadata["NO_DATA_VALUE"] = "0";
  picture.channels[1].metadata["NO_DATA_VALUE"] = "2";
  PutMemoryRaster("mem:b", picture);
  const auto dataset = Open("mem:b");
  const auto data = BasicReader(dataset.get(), {2, 1}, false).GetAuxiliaryData();
  EXPECT_EQ("0", data.GetFileMetadataValue("NO_DATA_VALUE"));
  EXPECT_EQ("2", data.GetChanMetadataValue("NO_DATA_VALUE", 1));
  EXPECT_EQ("", data.GetChanMetadataValue("NO_DATA_VALUE", 2));
}

}  // namespace
}  // namespace orin::drivers
