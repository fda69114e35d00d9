// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <algorithm>

#include "host/datasources/overviewaccessors.h"
#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using datasources::BasicOverviewWriterAccessor;
using datasources::IRasterDataset;
using datasources::IRasterWriter;
using datasources::kUpdate;
using datasources::LevelRoom;
using ::testing::HasSubstr;

constexpr uint64_t kTree = 8192;  // bytes that the tree may take less than is expected of it

class HfaRoom : public GdalFiles {
 protected:
  HfaRoom() : file_(File("image.img")) {}
  uint64_t Size() const { return std::filesystem::file_size(file_); }
  LevelRoom RoomFor(const std::vector<unsigned>& levels, const std::vector<unsigned>& channels) {
    return Open(file_, kUpdate)->GetSource()->Levels()->RoomFor(levels, channels);
  }
  std::string file_;
};

/// Writes zeros, or in every byte of a row a number of its own.
void Build(IRasterDataset& dataset, unsigned level, const std::vector<unsigned>& channels,
           bool differ = true, const char* method = "NEAREST") {
  BasicOverviewWriterAccessor accessor(&dataset, channels);
  accessor.SetResamplingName(method);
  accessor.CreateLevel(level);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(level));
  for (uint32_t y = 0; y < writer->GetHeight(); y += 64) {
    gobs::Raster block({writer->GetWidth(), std::min(64u, writer->GetHeight() - y),
                        writer->GetChannelCount(), writer->GetDataType()},
                       {0, 0, 0, y});
    const uint64_t bytes = uint64_t{block.width} * block.height * PixelBytes(block);
    for (uint64_t i = 0; i < bytes; ++i) block.data[i] = differ ? uint8_t(i * 89 + i / 256) : 0;
    writer->Write(block);
  }
  accessor.SetLevelValid(level, true);
}

TEST_F(HfaRoom, IsTheGrowthOfAFileWithoutCompression) {
  struct Kind {
    GDALDataType type;
    std::vector<std::string> options;
  };
  for (const Kind& kind : std::vector<Kind>{{GDT_Byte, {}},
                                            {GDT_Byte, {"NBITS=2"}},
                                            {GDT_Byte, {"NBITS=4"}},
                                            {GDT_UInt16, {}},
                                            {GDT_Float64, {}},
                                            {GDT_CFloat64, {}}}) {
    std::filesystem::remove(file_);
    WritePicture(file_, "HFA", {701, 403, 2, kind.type, kind.options});
    const uint64_t before = Size();
    const uint64_t room = RoomFor({2, 4, 8}, {1, 2}).bytes;
    const auto dataset = Open(file_, kUpdate);
    for (const unsigned level : {2u, 4u, 8u})
      for (const unsigned channel : {1u, 2u}) Build(*dataset, level, {channel});
    const uint64_t growth = Size() - before;  // what was replaced is there as long as the store
    EXPECT_GE(room, growth) << GDALGetDataTypeName(kind.type);
    EXPECT_LE(room, growth + kTree) << GDALGetDataTypeName(kind.type);
  }
}

TEST_F(HfaRoom, OfARebuildIsThatOfTheSecondCopy) {
  WritePicture(file_, "HFA", {701, 403, 2});
  Build(*Open(file_, kUpdate), 2, {1, 2});
  const uint64_t before = Size();
  const LevelRoom room = RoomFor({2}, {1, 2});
  EXPECT_EQ(file_, room.file);
  uint64_t growth = 0;
  {
    const auto dataset = Open(file_, kUpdate);
    for (const unsigned channel : {1u, 2u}) Build(*dataset, 2, {channel}, true, "MODE");
    growth = Size() - before;  // the old pixels are there as long as the store
  }
  EXPECT_GE(room.bytes, growth);
  EXPECT_LE(room.bytes, growth + kTree + 2 * 3200);  // the lists of levels stay as they are
}

TEST_F(HfaRoom, CountsTheChannelsAndLevelsThatAreAskedFor) {
  WritePicture(file_, "HFA", {701, 403, 2});
  const uint64_t pixels = 351 * 202;  // of a channel of level 2
  EXPECT_LE(RoomFor({2}, {2}).bytes + pixels, RoomFor({2}, {1, 2}).bytes);
  EXPECT_GE(RoomFor({2}, {2}).bytes * 2, RoomFor({2}, {1, 2}).bytes);
  EXPECT_LE(RoomFor({4}, {1}).bytes + pixels, RoomFor({2, 4}, {1}).bytes);
  EXPECT_EQ("", RoomFor({404}, {1}).file);  // nothing would be made
  EXPECT_EQ("", RoomFor({2}, {}).file);
}

TEST_F(HfaRoom, OfWhatIsCompressedLiesBetweenWhatTheImageSuggestsAndAllPixels) {
  const std::vector<std::string> compressed = {"COMPRESSED=YES"};
  for (const bool isFlat : {true, false}) {
    std::filesystem::remove(file_);
    WritePicture(file_, "HFA", {701, 403, 2});
    const uint64_t most = RoomFor({2, 4, 8}, {1, 2}).bytes;
    std::filesystem::remove(file_);
    WritePicture(file_, "HFA", {701, 403, 2, GDT_Byte, compressed}, [&](GDALDataset& memory) {
      if (isFlat)
        for (const int channel : {1, 2}) memory.GetRasterBand(channel)->Fill(7);
    });
    const uint64_t before = Size();
    const uint64_t room = RoomFor({2, 4, 8}, {1, 2}).bytes;
    const auto dataset = Open(file_, kUpdate);
    for (const unsigned level : {2u, 4u, 8u})
      for (const unsigned channel : {1u, 2u}) Build(*dataset, level, {channel}, !isFlat);
    EXPECT_GE(room, Size() - before);
    EXPECT_LE(room, isFlat ? most / 5 : most);
  }
}

TEST_F(HfaRoom, ThatTheFormatDoesNotHaveIsAnObstacleWithAdvice) {
  WritePicture(file_, "HFA", {701, 403, 2});
  std::filesystem::resize_file(file_, 2'000'000'000 - 240'000);  // a hole
  EXPECT_EQ("", RoomFor({2}, {1, 2}).obstacle);
  const LevelRoom room = RoomFor({2, 3}, {1, 2});
  EXPECT_THAT(room.obstacle, HasSubstr("image.img: would grow beyond the 2 GB"));
  EXPECT_THAT(room.advice, HasSubstr("--external"));
  const auto dataset = Open(file_, kUpdate);
  Build(*dataset, 2, {1, 2});
  const auto size = Size();
  EXPECT_THAT(RefusalOf([&] {
                Build(*dataset, 3, {1, 2});
              }),
              HasSubstr("would grow beyond the 2 GB"));
  EXPECT_EQ(size, Size());
}

}  // namespace
}  // namespace orin::tests
