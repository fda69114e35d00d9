// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <algorithm>
#include <thread>

#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using ::testing::HasSubstr;

class GdalReader : public GdalFiles {};

/// Reads a window and names the first sample of the buffer, margins included, that is not the
/// pattern with its edges repeated.
template <class T>
std::string WrongSample(datasources::IRasterReader& reader, const parallelio::ProcessWindow& window,
                        uint32_t width, uint32_t height) {
  const std::vector<unsigned> channels = reader.GetChannelsInfo();
  gobs::Raster block({width, height, uint32_t(channels.size()), reader.GetDataType()}, window);
  std::fill(block.data, block.data + block.byteSize, uint8_t{0xA5});
  reader.Read(block);
  const auto* sample = reinterpret_cast<const T*>(block.data);
  for (int64_t row = 0; row < block.bufferLines; ++row)
    for (int64_t column = 0; column < block.stride; ++column)
      for (const unsigned channel : channels) {
        const auto x = std::clamp<int64_t>(int64_t{window.x} + column - window.marginX, 0,
                                           reader.GetWidth() - 1);
        const auto y = std::clamp<int64_t>(int64_t{window.y} + row - window.marginY, 0,
                                           reader.GetHeight() - 1);
        if (*sample++ != T(PatternAt(int(x), int(y), int(channel))))
          return "(" + std::to_string(x) + ", " + std::to_string(y) + ") of channel " +
                 std::to_string(channel);
      }
  return "";
}

TEST_F(GdalReader, DeliversAnyWindowWithItsMarginsAndChannelsInTheOrderAsked) {
  for (const char* driver : {"PNG", "BMP", "HFA"}) {
    const std::string file = File(std::string("image.") + driver);
    WritePicture(file, driver, {.channels = 3});
    const auto dataset = Open(file);
    for (const std::vector<unsigned>& channels :
         {std::vector<unsigned>{1, 2, 3}, {2}, {3, 1}, {2, 2}}) {
      const auto reader = dataset->GetSource()->OpenReader(channels);
      EXPECT_EQ("", WrongSample<uint8_t>(*reader, {0, 0, 0, 0}, 37, 29)) << driver;
      EXPECT_EQ("", WrongSample<uint8_t>(*reader, {3, 2, 0, 0}, 10, 10)) << driver;
      EXPECT_EQ("", WrongSample<uint8_t>(*reader, {3, 2, 30, 20}, 7, 9)) << driver;
      EXPECT_EQ("", WrongSample<uint8_t>(*reader, {1, 1, 36, 28}, 1, 1)) << driver;
      EXPECT_EQ("", WrongSample<uint8_t>(*reader, {60, 40, 10, 10}, 5, 5)) << driver;
    }
  }
}

TEST_F(GdalReader, DeliversWideTypesInTheMachinesOrder) {
  WritePicture(File("image.envi"), "ENVI", {.channels = 2, .type = GDT_Float64});
  const auto dataset = Open(File("image.envi"));
  const auto reader = dataset->GetSource()->OpenReader({2, 1});
  EXPECT_EQ("", WrongSample<double>(*reader, {1, 1, 0, 0}, 37, 29));
}

TEST_F(GdalReader, ReadsTheImageItselfWhereItHasLevels) {
  WritePicture(File("image.img"), "HFA", {.width = 300, .height = 200});
  {
    const std::unique_ptr<GDALDataset> dataset(
        GDALDataset::Open(File("image.img").c_str(), GDAL_OF_UPDATE));
    const int level = 2;
    ASSERT_EQ(CE_None, dataset->BuildOverviews("NONE", 1, &level, 0, nullptr, nullptr, nullptr));
  }
  const auto dataset = Open(File("image.img"));
  const auto reader = dataset->GetSource()->OpenReader({1});
  EXPECT_EQ(1u, reader->GetLevel());
  EXPECT_EQ("", WrongSample<uint8_t>(*reader, {0, 0, 0, 0}, 300, 200));
}

TEST_F(GdalReader, AsksForWholeRowsWhereTheFormatDecodesThemTogether) {
  WritePicture(File("image.png"), "PNG", {.width = 300, .height = 200});
  WritePicture(File("image.img"), "HFA", {.width = 300, .height = 200});
  const auto png = Open(File("image.png"));
  EXPECT_EQ(300u, png->GetSource()->OpenReader({1})->GetTileWidth());
  const auto hfa = Open(File("image.img"));
  EXPECT_EQ(64u, hfa->GetSource()->OpenReader({1})->GetTileWidth());
}

TEST_F(GdalReader, OfOneSourceCanWorkInSeveralThreads) {
  WritePicture(File("image.png"), "PNG", {.width = 300, .height = 200, .channels = 3});
  const auto dataset = Open(File("image.png"));
  std::vector<std::string> wrong(4, "not read");
  std::vector<std::thread> threads;
  for (unsigned i = 0; i < wrong.size(); ++i)
    threads.emplace_back([&, i] {
      const auto reader = dataset->GetSource()->OpenReader({i % 3 + 1});
      for (int turn = 0; turn < 5; ++turn)
        wrong[i] = WrongSample<uint8_t>(*reader, {1, 1, 20 * i, 30}, 200, 100);
    });
  for (std::thread& thread : threads) thread.join();
  for (const std::string& message : wrong) EXPECT_EQ("", message);
}

TEST_F(GdalReader, DecodesAnImageOnceForAllItsChannels) {
  const std::string file = File("image.png");
  WritePicture(file, "PNG", {.width = 300, .height = 200, .channels = 3});
  const auto dataset = Open(file);
  const auto first = dataset->GetSource()->OpenReader({1});
  EXPECT_EQ("", WrongSample<uint8_t>(*first, {0, 0, 0, 0}, 300, 200));
  std::filesystem::resize_file(file, std::filesystem::file_size(file) / 2);
  for (const unsigned channel : {2u, 3u}) {
    const auto next = dataset->GetSource()->OpenReader({channel});
    EXPECT_EQ("", WrongSample<uint8_t>(*next, {2, 2, 100, 100}, 150, 100));
  }
}

TEST_F(GdalReader, RefusesDamagedPixelsNamingTheFileAndTheReason) {
  const std::string file = File("image.png");
  WritePicture(file, "PNG", {.width = 300, .height = 200});
  std::filesystem::resize_file(file, std::filesystem::file_size(file) / 2);
  const auto dataset = Open(file);
  const auto reader = dataset->GetSource()->OpenReader({1});
  testing::internal::CaptureStderr();
  EXPECT_THAT(RefusalOf([&] {
                WrongSample<uint8_t>(*reader, {0, 0, 0, 0}, 300, 200);
              }),
              HasSubstr(file + ": cannot be read: "));
  EXPECT_EQ("", testing::internal::GetCapturedStderr());
}

TEST_F(GdalReader, RefusesAJpegFileThatEndsTooEarly) {
  const std::string file = File("image.jpg");
  WritePicture(file, "JPEG", {.width = 300, .height = 200});
  std::filesystem::resize_file(file, std::filesystem::file_size(file) * 3 / 4);
  const auto dataset = Open(file);
  const auto reader = dataset->GetSource()->OpenReader({1});
  EXPECT_THAT(RefusalOf([&] {
                WrongSample<uint8_t>(*reader, {0, 0, 0, 0}, 300, 200);
              }),
              HasSubstr("remature end"));
}

TEST_F(GdalReader, RefusesAnEnviFileThatIsShorterThanItsHeaderSays) {
  const std::string file = File("image.envi");
  WritePicture(file, "ENVI", {.channels = 2, .type = GDT_Int16});
  const auto dataset = Open(file);
  EXPECT_TRUE(dataset->GetSource()->OpenReader({1}));
  std::filesystem::resize_file(file, 37 * 29 * 2 * 2 - 1);
  EXPECT_THAT(RefusalOf([&] { dataset->GetSource()->OpenReader({1}); }),
              HasSubstr("it has 4291 bytes, and its header tells of 4292"));
}

TEST_F(GdalReader, RefusesABlockOfAnotherKind) {
  WritePicture(File("image.png"), "PNG", {});
  const auto dataset = Open(File("image.png"));
  const auto reader = dataset->GetSource()->OpenReader({1});
  gobs::Raster outside({37, 29, 1, gobs::eDT_8U}, {0, 0, 1, 0});
  EXPECT_THROW(reader->Read(outside), DataException);
  gobs::Raster wide({37, 29, 1, gobs::DataTypeOf<float>()}, {0, 0, 0, 0});
  EXPECT_THROW(reader->Read(wide), DataException);
}

TEST_F(GdalReader, MakesNoFileBesideTheImage) {
  WritePicture(File("image.png"), "PNG", {});
  const auto dataset = Open(File("image.png"));
  const auto reader = dataset->GetSource()->OpenReader({1});
  EXPECT_EQ("", WrongSample<uint8_t>(*reader, {0, 0, 0, 0}, 37, 29));
  for (const auto& entry : std::filesystem::directory_iterator(folder_))
    EXPECT_EQ("image.png", entry.path().filename());
}

}  // namespace
}  // namespace orin::tests
