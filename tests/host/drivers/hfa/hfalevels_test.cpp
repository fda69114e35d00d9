// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <algorithm>

#include "host/datasources/overviewaccessors.h"
#include "host/drivers/hfa/hfarecord.h"
#include "host/drivers/hfa/hfatree.h"
#include "host/drivers/hfa/patchedfile.h"
#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using datasources::BasicOverviewWriterAccessor;
using datasources::IRasterWriter;
using datasources::kUpdate;
using drivers::PatchedFile;
using ::testing::HasSubstr;

constexpr int kWidth = 301, kHeight = 203;

class HfaLevels : public GdalFiles {
 protected:
  HfaLevels() : file_(File("image.img")) {
    WritePicture(file_, "HFA", {.width = kWidth, .height = kHeight, .channels = 2});
  }
  std::string file_;
};

/// Pixels of different editions of a level differ everywhere.
uint8_t LevelPixel(uint32_t x, uint32_t y, unsigned channel, unsigned level, unsigned edition = 0) {
  return uint8_t(x * 3 + y * 5 + channel * 17 + level + edition * 101);
}

/// Writes the rows from `first` up to `last` of a level.
void WriteRows(IRasterWriter& writer, uint32_t first, uint32_t last, unsigned edition = 0) {
  for (uint32_t y = first; y < last; y += 64) {
    gobs::Raster block({writer.GetWidth(), std::min(64u, last - y), writer.GetChannelCount(),
                        writer.GetDataType()},
                       {0, 0, 0, y});
    uint8_t* to = block.data;
    for (uint32_t row = 0; row < block.height; ++row)
      for (uint32_t x = 0; x < block.width; ++x)
        for (const unsigned channel : writer.GetChannelsInfo())
          *to++ = LevelPixel(x, y + row, channel, writer.GetLevel(), edition);
    writer.Write(block);
  }
}

void Build(datasources::IRasterDataset& dataset, unsigned level,
           const std::vector<unsigned>& channels, unsigned edition = 0,
           const std::string& method = "NEAREST") {
  BasicOverviewWriterAccessor accessor(&dataset, channels);
  accessor.SetResamplingName(method);
  accessor.CreateLevel(level);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(level));
  WriteRows(*writer, 0, writer->GetHeight(), edition);
  accessor.SetLevelValid(level, true);
}

/// What is wrong with the image or its levels in the eyes of the library; empty when nothing is.
std::string WrongPixels(const std::string& file, unsigned edition = 0) {
  const drivers::GdalErrors errors;
  const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file.c_str()));
  if (!dataset) return "cannot be opened: " + errors.Reason();
  for (int channel = 1; channel <= 2; ++channel) {
    GDALRasterBand& band = *dataset->GetRasterBand(channel);
    std::vector<uint8_t> pixels(size_t(kWidth) * kHeight);
    if (band.RasterIO(GF_Read, 0, 0, kWidth, kHeight, pixels.data(), kWidth, kHeight, GDT_Byte, 0,
                      0, nullptr) != CE_None)
      return "image cannot be read: " + errors.Reason();
    for (int i = 0; i < kWidth * kHeight; ++i)
      if (pixels[size_t(i)] != PatternAt(i % kWidth, i / kWidth, channel)) return "image differs";
    for (int index = 0; index < band.GetOverviewCount(); ++index) {
      GDALRasterBand& level = *band.GetOverview(index);
      const int factor = (kWidth + level.GetXSize() / 2) / level.GetXSize();
      const int width = kWidth / factor, height = kHeight / factor;
      pixels.resize(size_t(width) * size_t(height));
      if (level.RasterIO(GF_Read, 0, 0, width, height, pixels.data(), width, height, GDT_Byte, 0, 0,
                         nullptr) != CE_None)
        return "level cannot be read: " + errors.Reason();
      for (int i = 0; i < width * height; ++i)
        if (pixels[size_t(i)] != LevelPixel(uint32_t(i % width), uint32_t(i / width),
                                            unsigned(channel), unsigned(factor), edition))
          return "level " + std::to_string(factor) + " differs";
    }
  }
  return errors.Any() ? errors.Reason() : "";
}

std::string Validity(const std::string& file, unsigned level) {
  const auto dataset = Open(file, kUpdate);
  for (const auto& entry : dataset->GetSource()->Levels()->List())
    if (entry.level == level) {
      std::string text;
      for (size_t i = 0; i < entry.presentChannels.size(); ++i)
        text += !entry.presentChannels[i] ? '-' : entry.validChannels[i] ? '1' : '0';
      return text;
    }
  return "";
}

TEST_F(HfaLevels, AreWrittenChannelByChannelAndReadBackAsSources) {
  const auto dataset = Open(file_, kUpdate);
  Build(*dataset, 2, {1});
  EXPECT_EQ("1-", Validity(file_, 2));
  Build(*dataset, 2, {2});
  EXPECT_EQ("11", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_));
  BasicOverviewWriterAccessor accessor(dataset.get(), {2});
  const std::unique_ptr<IRasterWriter> source(accessor.CreateRasterWriter(2));
  EXPECT_EQ(150u, source->GetWidth());
  EXPECT_EQ(101u, source->GetHeight());
  gobs::Raster block({20, 10, 1, gobs::eDT_8U}, {1, 1, 130, 91});
  source->Read(block);
  EXPECT_EQ(LevelPixel(130, 91, 2, 2), *PixelAddress(block, 0, 0));
  EXPECT_EQ(LevelPixel(149, 100, 2, 2), *PixelAddress(block, 20, 10));  // the edge, repeated
}

TEST_F(HfaLevels, OfSomeOfTheChannelsAreNotFinished) {
  Build(*Open(file_, kUpdate), 2, {2});
  const auto level = Open(file_, kUpdate)->GetSource()->Levels()->List().at(0);
  EXPECT_EQ(datasources::LevelStatus::kUnfinished, level.status);
  EXPECT_EQ("-1", Validity(file_, 2));
  Build(*Open(file_, kUpdate), 2, {1});
  EXPECT_EQ(datasources::LevelStatus::kCurrent,
            Open(file_, kUpdate)->GetSource()->Levels()->List().at(0).status);
}

/// How many levels another program sees of each channel: "01"
std::string SeenLevels(const std::string& file) {
  const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file.c_str()));
  std::string counts;
  for (int channel = 1; channel <= dataset->GetRasterCount(); ++channel)
    counts += std::to_string(dataset->GetRasterBand(channel)->GetOverviewCount());
  return counts;
}

/// A pixel of a level as a store reads it.
int PixelOf(const std::string& file, unsigned level, unsigned channel) {
  const auto dataset = Open(file, kUpdate);
  BasicOverviewWriterAccessor accessor(dataset.get(), {channel});
  const std::unique_ptr<IRasterWriter> source(accessor.CreateRasterWriter(level));
  gobs::Raster block({20, 10, 1, gobs::eDT_8U}, {1, 1, 30, 40});
  source->Read(block);
  return *PixelAddress(block, 0, 0);
}

TEST_F(HfaLevels, AreSeenByOtherProgramsWhenNoChannelIsMissing) {
  for (const char* const compressed : {"COMPRESSED=NO", "COMPRESSED=YES"}) {
    std::filesystem::remove(file_);
    WritePicture(file_, "HFA",
                 {.width = kWidth, .height = kHeight, .channels = 2, .options = {compressed}});
    Build(*Open(file_, kUpdate), 2, {2});
    EXPECT_EQ("00", SeenLevels(file_));
    EXPECT_EQ("-1", Validity(file_, 2));
    EXPECT_EQ(LevelPixel(30, 40, 2, 2), PixelOf(file_, 2, 2));
    Build(*Open(file_, kUpdate), 3, {2});
    EXPECT_EQ("00", SeenLevels(file_));
    EXPECT_EQ(LevelPixel(30, 40, 2, 2), PixelOf(file_, 2, 2));
    EXPECT_EQ(LevelPixel(30, 40, 2, 3), PixelOf(file_, 3, 2));
    Build(*Open(file_, kUpdate), 3, {1});
    EXPECT_EQ("11", SeenLevels(file_));
    EXPECT_EQ("-1", Validity(file_, 2));
    Build(*Open(file_, kUpdate), 2, {1});
    EXPECT_EQ("22", SeenLevels(file_));
    EXPECT_EQ("11", Validity(file_, 2));
    EXPECT_EQ("", WrongPixels(file_));
  }
}

TEST_F(HfaLevels, ThatAreWrittenAnewAreSeenByOtherProgramsForAllChannelsAtOnce) {
  Build(*Open(file_, kUpdate), 2, {1, 2});
  Build(*Open(file_, kUpdate), 2, {1}, 1, "AVERAGE");
  EXPECT_EQ("10", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_, 0));
  EXPECT_EQ(LevelPixel(30, 40, 1, 2, 1), PixelOf(file_, 2, 1));
  EXPECT_EQ(LevelPixel(30, 40, 2, 2, 0), PixelOf(file_, 2, 2));
  Build(*Open(file_, kUpdate), 2, {2}, 1, "AVERAGE");
  EXPECT_EQ("11", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_, 1));
}

TEST_F(HfaLevels, OfAChannelThatWaitsGoWhenTheOthersAreMadeInAnotherWay) {
  Build(*Open(file_, kUpdate), 2, {1, 2});
  Build(*Open(file_, kUpdate), 2, {1}, 1, "AVERAGE");
  Build(*Open(file_, kUpdate), 2, {2}, 2, "MODE");
  EXPECT_EQ("01", Validity(file_, 2));
  Build(*Open(file_, kUpdate), 2, {1}, 2, "MODE");
  EXPECT_EQ("11", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_, 2));
}

TEST_F(HfaLevels, OfChannelsThatWaitAreRemovedAsWell) {
  const auto size = std::filesystem::file_size(file_);
  Build(*Open(file_, kUpdate), 2, {1});
  Open(file_, kUpdate)->GetSource()->Levels()->Remove({2});
  EXPECT_EQ("", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_));
  EXPECT_GE(size + 4096, std::filesystem::file_size(file_));
  const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str()));
  EXPECT_EQ(nullptr, dataset->GetMetadataItem("ORIN_PENDING_2"));
}

TEST_F(HfaLevels, OfChannelsThatWaitSurviveChangesByOtherPrograms) {
  Build(*Open(file_, kUpdate), 2, {1});
  {
    const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str(), GDAL_OF_UPDATE));
    dataset->SetMetadataItem("SENSOR", "camera");
    dataset->GetRasterBand(1)->SetStatistics(1, 2, 3, 4);
  }
  Build(*Open(file_, kUpdate), 2, {2});
  EXPECT_EQ("11", SeenLevels(file_));
  EXPECT_EQ("11", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_));
  const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str()));
  EXPECT_STREQ("camera", dataset->GetMetadataItem("SENSOR"));
  EXPECT_STREQ("2", dataset->GetRasterBand(1)->GetMetadataItem("STATISTICS_MAXIMUM"));
}

TEST_F(HfaLevels, AreWrittenForAllChannelsAtOnce) {
  Build(*Open(file_, kUpdate), 3, {1, 2});
  EXPECT_EQ("11", Validity(file_, 3));
  EXPECT_EQ("", WrongPixels(file_));
}

TEST_F(HfaLevels, ThatAreGivenUpLeaveTheFileAsItWasButForTheRecord) {
  const auto size = std::filesystem::file_size(file_);
  {
    const auto dataset = Open(file_, kUpdate);
    BasicOverviewWriterAccessor accessor(dataset.get(), {1});
    accessor.CreateLevel(2);
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
    WriteRows(*writer, 0, 64);
    EXPECT_THAT(RefusalOf([&] { accessor.SetValid(1, 2, true); }), HasSubstr("is not complete"));
  }
  EXPECT_EQ("", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_));
  EXPECT_LT(std::filesystem::file_size(file_), size + 4096);
}

TEST_F(HfaLevels, StayWhatTheyAreWhenTheirNewPixelsAreGivenUp) {
  Build(*Open(file_, kUpdate), 2, {1, 2});
  const std::string before = BytesOf(file_);
  const auto dataset = Open(file_, kUpdate);
  BasicOverviewWriterAccessor accessor(dataset.get(), {2});
  accessor.SetResamplingName("AVERAGE");
  accessor.CreateLevel(2);
  {
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
    WriteRows(*writer, 0, writer->GetHeight(), 1);
    EXPECT_EQ("11", Validity(file_, 2));
    EXPECT_EQ("", WrongPixels(file_));
    EXPECT_LT(before.size() + 150 * 101, std::filesystem::file_size(file_));
  }
  EXPECT_EQ("11", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_));
  EXPECT_EQ(before.size(), std::filesystem::file_size(file_));
}

TEST_F(HfaLevels, ThatAreWrittenAnewForSomeChannelsByAnotherMethodAreNotValidForTheOthers) {
  Build(*Open(file_, kUpdate), 2, {1, 2});
  Build(*Open(file_, kUpdate), 2, {2}, 0, "MODE");
  EXPECT_EQ("01", Validity(file_, 2));
  Build(*Open(file_, kUpdate), 2, {1}, 0, "MODE");
  EXPECT_EQ("11", Validity(file_, 2));
}

/// One channel of a level as a dataset that stays open shows it.
std::string ShownBy(GDALDataset& dataset, int channel, int rows) {
  GDALRasterBand& level = *dataset.GetRasterBand(channel)->GetOverview(0);
  std::string pixels(size_t(level.GetXSize()) * size_t(rows), '\0');
  level.FlushCache(false);  // also forgets what it has read
  EXPECT_EQ(CE_None, level.RasterIO(GF_Read, 0, 0, level.GetXSize(), rows, pixels.data(),
                                    level.GetXSize(), rows, GDT_Byte, 0, 0, nullptr));
  return pixels;
}

TEST_F(HfaLevels, AreReadAsTheyWereByWhoHadTheFileOpen) {
  for (const char* const compressed : {"COMPRESSED=NO", "COMPRESSED=YES"}) {
    WritePicture(file_, "HFA",
                 {.width = kWidth, .height = kHeight, .channels = 2, .options = {compressed}});
    for (const unsigned level : {2u, 4u}) Build(*Open(file_, kUpdate), level, {1, 2});
    const auto size = std::filesystem::file_size(file_);
    {
      const std::unique_ptr<GDALDataset> reader(GDALDataset::Open(file_.c_str()));
      const std::string first = ShownBy(*reader, 1, 64);
      const std::string all =
          ShownBy(*std::unique_ptr<GDALDataset>(GDALDataset::Open(file_.c_str())), 1, 101);
      for (const unsigned edition : {1u, 2u}) {
        for (const unsigned level : {2u, 4u}) {
          const auto dataset = Open(file_, kUpdate);
          for (const unsigned channel : {1u, 2u}) Build(*dataset, level, {channel}, edition);
        }
        EXPECT_EQ("", WrongPixels(file_, edition));
        EXPECT_TRUE(first == ShownBy(*reader, 1, 64));
        EXPECT_TRUE(all == ShownBy(*reader, 1, 101));
      }
      EXPECT_LT(size, std::filesystem::file_size(file_));
    }
    for (const unsigned level : {2u, 4u}) Build(*Open(file_, kUpdate), level, {1, 2}, 3);
    EXPECT_EQ("", WrongPixels(file_, 3));
    EXPECT_EQ("11", Validity(file_, 2));
    EXPECT_GE(size * 102 / 100, std::filesystem::file_size(file_));
    std::filesystem::remove(file_);
  }
}

TEST_F(HfaLevels, TakeTheSameRoomAfterManyRebuilds) {
  for (const char* const compressed : {"COMPRESSED=NO", "COMPRESSED=YES"}) {
    WritePicture(file_, "HFA",
                 {.width = kWidth, .height = kHeight, .channels = 2, .options = {compressed}});
    for (const unsigned level : {2u, 4u}) Build(*Open(file_, kUpdate), level, {1, 2});
    const auto size = std::filesystem::file_size(file_);
    for (unsigned edition = 1; edition <= 5; ++edition) {
      {
        const auto dataset = Open(file_, kUpdate);
        for (const unsigned level : {2u, 4u})
          for (const unsigned channel : {1u, 2u}) Build(*dataset, level, {channel}, edition);
      }
      EXPECT_EQ("", WrongPixels(file_, edition));
      EXPECT_GE(size * 102 / 100, std::filesystem::file_size(file_)) << compressed << edition;
    }
    std::filesystem::remove(file_);
  }
}

TEST_F(HfaLevels, ThatTheFormatCannotTellApartAreRefused) {
  WritePicture(File("small.img"), "HFA", {.width = 20, .height = 20, .channels = 2});
  const auto dataset = Open(File("small.img"), kUpdate);
  Build(*dataset, 7, {1});
  EXPECT_THAT(RefusalOf([&] { Build(*dataset, 8, {1}); }), HasSubstr("cannot tell them apart"));
}

TEST_F(HfaLevels, AreNotWrittenWhileAnotherStoreWritesThem) {
  const auto first = Open(file_, kUpdate);
  const auto second = Open(file_, kUpdate);
  Build(*first, 2, {1});
  EXPECT_THAT(RefusalOf([&] { Build(*second, 4, {1}); }), HasSubstr("another build is writing"));
}

TEST_F(HfaLevels, OfAReadOnlyStoreCannotBeChanged) {
  Build(*Open(file_, kUpdate), 2, {1, 2});
  const auto dataset = Open(file_);  // levels inside are listed, new ones go beside the file
  EXPECT_EQ(2u, dataset->GetSource()->Levels()->List().at(0).level);
  const std::string before = BytesOf(file_);
  dataset->GetSource()->Levels()->Create(4, {1}, "NEAREST");
  EXPECT_EQ(before, BytesOf(file_));
}

TEST_F(HfaLevels, OfACopiedFileAreNotItsOwnAndNoneAreWrittenInside) {
  Build(*Open(file_, kUpdate), 2, {1, 2});
  std::filesystem::copy(file_, File("copy.img"));
  EXPECT_THAT(RefusalOf([&] { Open(File("copy.img"), kUpdate); }),
              HasSubstr("copy.img: holds a list of levels under another file's name"));
  EXPECT_TRUE(Open(File("copy.img"))->GetSource()->Levels()->List().empty());
}

uint64_t SizeWithLevels(const std::string& file, const std::vector<unsigned>& levels) {
  WritePicture(file, "HFA", {.width = kWidth, .height = kHeight, .channels = 2});
  for (const unsigned level : levels) Build(*Open(file, kUpdate), level, {1, 2});
  return std::filesystem::file_size(file);
}

TEST_F(HfaLevels, AreRemovedWhileOthersStayAndMoveUp) {
  constexpr uint64_t kLittle = 4 * 1024;  // parts of the tree that find no room in front
  for (const std::vector<unsigned>& stays :
       std::vector<std::vector<unsigned>>{{2}, {3}, {5}, {2, 3}, {2, 5}, {3, 5}, {}}) {
    std::filesystem::create_directories(File("fresh"));
    const uint64_t fresh = SizeWithLevels(File("fresh/image.img"), stays);
    SizeWithLevels(file_, {2, 3, 5});
    std::vector<unsigned> goes = {2, 3, 5};
    for (const unsigned level : stays) std::erase(goes, level);
    Open(file_, kUpdate)->GetSource()->Levels()->Remove(goes);
    for (const unsigned level : {2u, 3u, 5u})
      EXPECT_EQ(std::count(stays.begin(), stays.end(), level) ? "11" : "", Validity(file_, level));
    EXPECT_EQ("", WrongPixels(file_));
    EXPECT_GE(fresh + kLittle, std::filesystem::file_size(file_))
        << ::testing::PrintToString(stays);
    EXPECT_EQ(int(stays.size()), std::unique_ptr<GDALDataset>(GDALDataset::Open(file_.c_str()))
                                     ->GetRasterBand(2)
                                     ->GetOverviewCount());
    for (const unsigned level : goes) Build(*Open(file_, kUpdate), level, {1, 2});
    EXPECT_EQ("", WrongPixels(file_));
    std::filesystem::remove(file_);
  }
}

TEST_F(HfaLevels, ThatAreNotThereAreNoneToRemove) {
  for (const unsigned level : {2u, 3u}) Build(*Open(file_, kUpdate), level, {1, 2});
  const std::string before = BytesOf(file_);
  Open(file_, kUpdate)->GetSource()->Levels()->Remove({7});
  EXPECT_EQ(before, BytesOf(file_));
}

/// A removal that ends between its two steps leaves levels that no list names.
TEST_F(HfaLevels, ThatARemovalLeftInTheTreeAreMadeAnewAllTheSame) {
  for (const unsigned level : {2u, 3u}) Build(*Open(file_, kUpdate), level, {1, 2});
  {
    PatchedFile file(file_);
    drivers::HfaTree tree(file_);
    for (const auto& layer : drivers::HfaLayersOf(tree))
      for (const auto& part : layer.parts) {
        if (!drivers::IsHfaNameList(part)) continue;
        drivers::HfaNameList list(tree.DataOf(part));
        list.Remove({2});
        const std::string data = list.DataAt(part.data);
        ASSERT_EQ(part.dataBytes, data.size());
        file.WriteNow(part.data, data.data(), data.size());
      }
  }
  EXPECT_EQ("", Validity(file_, 2));
  Build(*Open(file_, kUpdate), 2, {1, 2});
  EXPECT_EQ("11", Validity(file_, 2));
  EXPECT_EQ("", WrongPixels(file_));
}

}  // namespace
}  // namespace orin::tests
