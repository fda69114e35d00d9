/// TIFF files as datasets: recognition, opening, metadata and readers.
// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <fstream>
#include <memory>

#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/drivers/tiff/tiffsource.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/testimage.h"

namespace orin::tests {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::StartsWith;

class TiffFiles : public ::testing::Test {
 protected:
  void SetUp() override {
    datasources::FormatRegistry::Instance().Clear();
    drivers::RegisterTiffDriver();
  }
  void TearDown() override { datasources::FormatRegistry::Instance().Clear(); }

  std::string Image(const Layout& layout = {}) {
    WriteImage(folder_.File("image.tif"), layout);
    return folder_.File("image.tif");
  }

  ScratchFolder folder_;
};

TEST_F(TiffFiles, AreRecognisedByTheirFirstBytes) {
  for (const char* mode : {"w", "wb", "w8", "wb8"}) {
    Layout layout;
    layout.mode = mode;
    EXPECT_EQ(kFormatTiff, ZMBTestOpen(Image(layout).c_str())) << mode;
  }
  for (const std::string text : {"", "II", "II*", "MM*\0", "II-\0rest"}) {
    std::ofstream(folder_.File("other")) << text;
    EXPECT_EQ(kFormatUnknown, ZMBTestOpen(folder_.File("other").c_str())) << text;
  }
  EXPECT_EQ(kFormatUnknown, ZMBTestOpen(folder_.File("absent").c_str()));
  EXPECT_EQ(kFormatUnknown, ZMBTestOpen(folder_.File("").c_str()));
}

TEST_F(TiffFiles, StandInTheFormatTableAsKeepersOfOverviews) {
  const ZMBInfo_s* record = ZMBGetFormatInfo(kFormatTiff);
  ASSERT_NE(nullptr, record);
  EXPECT_EQ("TIFF", record->name);
  EXPECT_EQ("TIFF / GeoTIFF", record->description);
  EXPECT_EQ(1, record->nativeOverviews);
}

TEST_F(TiffFiles, DeliverTheirPixelsThroughAReader) {
  Layout layout;
  layout.samples = 3;
  layout.bits = 16;
  layout.compression = COMPRESSION_LZW;
  const std::unique_ptr<datasources::IDataset> dataset(
      datasources::DatasetManager::GetInstance()->Open(Image(layout), datasources::kReadOnly));
  auto* raster = dynamic_cast<datasources::IRasterDataset*>(dataset.get());
  ASSERT_NE(nullptr, raster);
  EXPECT_EQ(37u, raster->GetWidth());
  EXPECT_EQ(29u, raster->GetHeight());
  EXPECT_EQ(3u, raster->GetChannelCount());
  datasources::BasicReader reader(dataset.get(), {3, 1}, false);
  EXPECT_EQ(37u, reader.GetTileWidth());
  EXPECT_EQ(5u, reader.GetTileHeight());
  EXPECT_EQ(gobs::DataTypeOf<uint16_t>(), reader.GetDataType());
  reader.SetMargin(1, 1, datasources::kMarginRepeatEdge);
  const auto block = reader.GetRaster(reader.FindRaster(0, 12));  // the strip of rows 10 to 14
  const auto* pixel = reinterpret_cast<const uint16_t*>(PixelAddress(*block, 4, 2));
  EXPECT_EQ(PatternValue(4, 12, 2), pixel[0]);
  EXPECT_EQ(PatternValue(4, 12, 0), pixel[1]);
  EXPECT_EQ(PatternValue(0, 9, 2),
            *reinterpret_cast<const uint16_t*>(PixelAddress(*block, -1, -1)));
}

TEST_F(TiffFiles, RefuseABlockOfAnotherTypeOrPlace) {
  drivers::TiffSource source(Image(), datasources::kReadOnly);
  const auto reader = source.OpenReader({1});
  gobs::Raster wrongType({4, 4, 1, gobs::DataTypeOf<float>()}, {});
  EXPECT_THROW(reader->Read(wrongType), DataException);
  gobs::Raster outside({4, 4, 1, gobs::eDT_8U}, {0, 0, 36, 0});
  EXPECT_THROW(reader->Read(outside), DataException);
  EXPECT_THROW(source.OpenReader({2}), Exception);
}

TEST_F(TiffFiles, OpenForUpdateWithoutAChangeToBytesOrTimes) {
  const std::string file = Image();
  const timespec longAgo[2] = {{1000, 5}, {2000, 7}};
  ASSERT_EQ(0, utimensat(AT_FDCWD, file.c_str(), longAgo, 0));
  struct stat before, after;
  ASSERT_EQ(0, stat(file.c_str(), &before));
  { drivers::TiffSource source(file, datasources::kUpdate); }
  ASSERT_EQ(0, stat(file.c_str(), &after));
  EXPECT_EQ(before.st_size, after.st_size);
  EXPECT_EQ(2000, after.st_mtim.tv_sec);
  EXPECT_EQ(7, after.st_mtim.tv_nsec);
}

TEST_F(TiffFiles, ThatCannotBeWrittenAreRefusedForUpdate) {
  std::filesystem::create_directory(
      folder_.File("folder.tif"));  // also for root, who may write all
  try {
    drivers::TiffSource source(folder_.File("folder.tif"), datasources::kUpdate);
    ADD_FAILURE() << "a folder was opened";
  } catch (const Exception& failure) {
    EXPECT_THAT(failure.what(), AllOf(StartsWith(folder_.File("folder.tif") + ": "),
                                      HasSubstr("for writing: Is a directory")));
  }
}

/// The no-data value of the file and of channel 1, for a tag's text and a metadata text.
std::pair<std::string, std::string> NoDataOf(const std::string& file, const char* tag,
                                             const char* metadata) {
  Layout layout;
  layout.noData = tag;
  TIFF* tiff = TIFFOpen(file.c_str(), "w");
  EXPECT_NE(nullptr, tiff);
  SetTags(tiff, layout);
  TIFFWriteCheck(tiff, 0, "");
  if (metadata) {
    static const TIFFFieldInfo kMetadata{42112,        -1, -1, TIFF_ASCII,
                                         FIELD_CUSTOM, 1,  0,  const_cast<char*>("metadata")};
    TIFFMergeFieldInfo(tiff, &kMetadata, 1);
    TIFFSetField(tiff, 42112, metadata);
  }
  TIFFWriteDirectory(tiff);
  TIFFClose(tiff);
  const auto found = drivers::TiffSource(file, datasources::kReadOnly).MetadataOf({1});
  return {found.GetFileMetadataValue(datasources::kNoDataKey),
          found.GetChanMetadataValue(datasources::kNoDataKey, 1)};
}

TEST_F(TiffFiles, DeclareNoDataByItemBeforeTag) {
  using Pair = std::pair<std::string, std::string>;
  const std::string file = folder_.File("image.tif");
  const char* kOfFile = "<GDALMetadata><Item name=\"NO_DATA_VALUE\">7</Item></GDALMetadata>";
  const char* kOfChannel =
      "<GDALMetadata><Item name=\"NO_DATA_VALUE\" sample=\"0\">8</Item></GDALMetadata>";
  const char* kNone = "<GDALMetadata><Item name=\"NO_DATA_VALUE\">none</Item></GDALMetadata>";
  const char* kOfOther =
      "<GDALMetadata><Item name=\"NO_DATA_VALUE\" domain=\"D\">9</Item></GDALMetadata>";
  EXPECT_EQ(Pair("", ""), NoDataOf(file, nullptr, nullptr));
  EXPECT_EQ(Pair("-3.5", ""), NoDataOf(file, " -3.5 ", nullptr));
  EXPECT_EQ(Pair("7", ""), NoDataOf(file, "5", kOfFile));
  EXPECT_EQ(Pair("", "8"), NoDataOf(file, "5", kOfChannel));
  EXPECT_EQ(Pair("5", ""), NoDataOf(file, "5", kOfOther));
  EXPECT_EQ(Pair("5", ""), NoDataOf(file, "5", kNone));
  for (const char* number : {"nan", "inf", "-inf", "1e999", "1,5"})  // as it stands
    EXPECT_EQ(Pair(number, ""), NoDataOf(file, number, nullptr)) << number;
  for (const char* noNumber : {"", "x", "1 2", "0x10"})
    EXPECT_EQ(Pair("", ""), NoDataOf(file, noNumber, nullptr)) << noNumber;
}

}  // namespace
}  // namespace orin::tests
