// SPDX-License-Identifier: MIT
#include "host/datasources/datasetmanager.h"

#include <gmock/gmock.h>

#include <memory>

#include "host/datasources/basicreader.h"
#include "host/services/exception.h"
#include "tests/testing/pictures.h"
#include "tests/testing/recordinghost.h"

namespace orin::datasources {
namespace {

using orin::testing::Fault;
using orin::testing::NoiseOf;
using orin::testing::RecordingHost;
using ::testing::ElementsAre;

using DatasetPtr = std::unique_ptr<IDataset>;

DatasetPtr Open(const std::string& file, AccessMode mode = kUpdate) {
  return DatasetPtr(DatasetManager::GetInstance()->Open(file, mode));
}
DatasetPtr OpenFormat(const std::string& format, const std::string& file,
                      AccessMode mode = kUpdate) {
  return DatasetPtr(DatasetManager::GetInstance()->OpenFormat(format, file, mode));
}

template <class Work>
std::string MessageOf(Work work) {
  try {
    work();
  } catch (const Exception& e) {
    return e.GetMessage();
  }
  return "nothing was thrown";
}

TEST(DatasetManager, IsOne) {
  EXPECT_EQ(DatasetManager::GetInstance(), DatasetManager::GetInstance());
}

TEST(DatasetManager, OpensThroughTheFilesOwnFormat) {
  RecordingHost host;
  auto picture = NoiseOf(9, 7, 3);
  picture.channels[2].type = gobs::eDT_BIT;
  host.Put("a.tif", picture);
  const DatasetPtr dataset = Open("a.tif");
  EXPECT_EQ("a.tif", dataset->GetFileName());
  EXPECT_EQ(kUpdate, dataset->GetAccessMode());
  EXPECT_EQ(kFormatTiff, dataset->GetFileFormatCode());
  EXPECT_TRUE(dataset->IsRaster());
  const std::unique_ptr<IFormatDescriptor> format(dataset->GetFormatDescriptor());
  EXPECT_EQ("TIFF", format->GetName());
  EXPECT_EQ("TIFF / GeoTIFF", format->GetDescription());
  EXPECT_EQ(kFormatTiff, format->GetCode());
  auto* raster = dynamic_cast<IRasterDataset*>(dataset.get());
  ASSERT_NE(nullptr, raster);
  EXPECT_EQ(9u, raster->GetWidth());
  EXPECT_EQ(7u, raster->GetHeight());
  EXPECT_EQ(3u, raster->GetChannelCount());
  const std::unique_ptr<IChannelInfo> last(raster->GetChannelInfo(3));
  EXPECT_EQ(1u, last->GetDataType().bits);
}

TEST(DatasetManager, AChannelThatDoesNotExistIsRefused) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(9, 7, 3));
  const DatasetPtr dataset = Open("a.tif");
  auto* raster = dynamic_cast<IRasterDataset*>(dataset.get());
  EXPECT_THROW(delete raster->GetChannelInfo(0), DataException);
  EXPECT_EQ("a.tif: there is no channel 4; the file has 3.",
            MessageOf([&] { delete raster->GetChannelInfo(4); }));
}

TEST(DatasetManager, TheGenericLayerHasItsOwnNameAndKeepsTheFilesCode) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(9, 7, 1));
  const DatasetPtr dataset = OpenFormat("ZMBALL", "a.tif");
  const std::unique_ptr<IFormatDescriptor> format(dataset->GetFormatDescriptor());
  EXPECT_EQ("ZMBALL", format->GetName());
  EXPECT_EQ(kFormatGeneric, format->GetCode());
  EXPECT_EQ(kFormatTiff, dataset->GetFileFormatCode());
  EXPECT_EQ("a.tif", dataset->GetFileName());
  EXPECT_THAT(host.Log("Open("), ElementsAre("Open(a.tif,read)"));
}

TEST(DatasetManager, AnyOtherNameMustBeTheFilesOwnFormat) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(9, 7, 1));
  EXPECT_NE(nullptr, OpenFormat("TIFF", "a.tif"));
  EXPECT_EQ("a.tif: is not a TESSRA file.", MessageOf([] { OpenFormat("TESSRA", "a.tif"); }));
  EXPECT_EQ("There is no raster format named GRID.",
            MessageOf([] { OpenFormat("GRID", "a.tif"); }));
  EXPECT_EQ("There is no raster format named UNKNOWN.",
            MessageOf([] { OpenFormat("UNKNOWN", "a.tif"); }));
}

TEST(DatasetManager, WhatCannotBeOpenedIsNamedWithTheReason) {
  RecordingHost host;
  EXPECT_EQ("/nowhere/a.tif: cannot be opened: No such file or directory.",
            MessageOf([] { Open("/nowhere/a.tif"); }));
  EXPECT_EQ("/tmp: is a directory, not a raster file.", MessageOf([] { Open("/tmp"); }));
  EXPECT_EQ("/dev/null: is a pipe or a device, not a raster file.",
            MessageOf([] { Open("/dev/null"); }));
  EXPECT_EQ("/nowhere/a.tif: cannot be opened: No such file or directory.",
            MessageOf([] { OpenFormat("ZMBALL", "/nowhere/a.tif"); }));
}

TEST(DatasetManager, AReadOnlyFileIsRefusedForUpdateAndOpensForReading) {
  RecordingHost host;
  auto picture = NoiseOf(9, 7, 1);
  picture.readOnly = true;
  host.Put("a.tif", picture);
  EXPECT_THROW(Open("a.tif", kUpdate), Exception);
  EXPECT_EQ(kReadOnly, Open("a.tif", kReadOnly)->GetAccessMode());
  EXPECT_NE(nullptr, OpenFormat("ZMBALL", "a.tif", kUpdate));
  EXPECT_EQ(0, host.Live().Total());
}

TEST(DatasetManager, AFailingDriverLeavesNothingBehind) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(9, 7, 1));
  host.FailAt("Open", 1, Fault::kDataException);
  EXPECT_THROW(Open("a.tif"), DataException);
  host.FailAt("SideCar.Open", 1);
  EXPECT_THROW(OpenFormat("ZMBALL", "a.tif"), Exception);
  EXPECT_EQ(0, host.Live().Total());
}

TEST(BasicReader, ReadsChannelsInTheOrderAskedFor) {
  RecordingHost host;
  drivers::MemoryRaster picture = orin::testing::PictureOf<unsigned char>({{1, 2}});
  picture.channels.push_back(orin::testing::ChannelOf<unsigned char>({{3, 4}}));
  picture.channels[1].metadata["NO_DATA_VALUE"] = "4";
  host.Put("a.tif", picture);
  const DatasetPtr dataset = Open("a.tif");
  BasicReader reader(dataset.get(), {2, 1}, false);
  EXPECT_EQ(2u, reader.GetChannelCount());
  EXPECT_THAT(reader.GetChannelsInfo(), ElementsAre(2u, 1u));
  EXPECT_EQ("4", reader.GetAuxiliaryData().GetChanMetadataValue("NO_DATA_VALUE", 1));
  const auto block = reader.GetRaster(0);
  EXPECT_THAT(std::vector<unsigned>(block->data, block->data + 4), ElementsAre(3u, 1u, 4u, 2u));
}

TEST(BasicReader, AsksTheDriverForNothingWhenAChannelDoesNotExist) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(9, 7, 2));
  const DatasetPtr dataset = Open("a.tif");
  EXPECT_EQ("a.tif: there is no channel 3; the file has 2.", MessageOf([&] {
              BasicReader(dataset.get(), {1, 3}, false);
            }));
  EXPECT_THROW(BasicReader(dataset.get(), {0}, false), DataException);
  EXPECT_TRUE(host.Log("source.OpenReader").empty());
}

TEST(BasicReader, ADatasetThatIsNoRasterIsRefused) {
  struct Table final : IDataset {
    IFormatDescriptor* GetFormatDescriptor() const override { return nullptr; }
    AccessMode GetAccessMode() const override { return kReadOnly; }
    int GetFileFormatCode() const override { return 0; }
    std::string GetFileName() const override { return "t"; }
    bool IsRaster() const override { return false; }
  } table;
  EXPECT_THROW(BasicReader(&table, {1}, false), DataException);
}

}  // namespace
}  // namespace orin::datasources
