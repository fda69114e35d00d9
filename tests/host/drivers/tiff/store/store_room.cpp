/// What levels will take, told before they are made.
// SPDX-License-Identifier: MIT
#include <filesystem>

#include "host/datasources/leveloptions.h"
#include "host/drivers/tiff/storedsize.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

using datasources::LevelRoom;

constexpr uint64_t kDirectories = 20000;  // more than those of a few levels take

LevelRoom RoomFor(IRasterDataset& dataset, const std::vector<unsigned>& levels) {
  return dataset.GetSource()->Levels()->RoomFor(levels, ChannelsOf(dataset));
}

/// Bytes by which the file grows when the levels are built.
uint64_t GrowthOf(const std::string& file, const Layout& image,
                  const std::vector<unsigned>& levels) {
  const uint64_t before = std::filesystem::file_size(file);
  for (const unsigned level : levels) Build(file, image, {.level = level});
  return std::filesystem::file_size(file) - before;
}

TEST_F(TiffStore, RoomOfUncompressedLevelsIsThatOfTheirTiles) {
  const Layout image{.width = 1000, .height = 700, .samples = 2, .bits = 16, .tile = 64};
  const std::string file = folder_.File("image.tif");
  WriteImage(file, image);
  const uint64_t expected = RoomFor(*Open(file, datasources::kReadOnly), {2, 4, 2000}).bytes;
  const uint64_t tiles = (8 * 6 + 4 * 3) * 64 * 64 * 4;
  EXPECT_LE(tiles, expected);
  EXPECT_GE(tiles + kDirectories, expected);
  const uint64_t growth = GrowthOf(file, image, {2, 4});
  EXPECT_LE(growth, expected);
  EXPECT_GE(growth + kDirectories, expected);
}

TEST_F(TiffStore, RoomOfCompressedLevelsIsThatOfSamplesThatDoNotCompress) {
  const std::string file = folder_.File("image.tif");
  for (const uint16_t bits : {8, 16}) {
    const Layout image{.width = 1024,
                       .height = 1024,
                       .bits = bits,
                       .tile = 256,
                       .compression = COMPRESSION_ADOBE_DEFLATE};
    WriteImage(file, image);
    const uint64_t samples = 512 * 512 * bits / 8;
    const uint64_t room = RoomFor(*Open(file, datasources::kReadOnly), {2}).bytes;
    EXPECT_LE(samples, room);
    EXPECT_GE(samples + samples / 50 + kDirectories, room);
    EXPECT_LE(GrowthOf(file, image, {2}), room);
  }
}

TEST_F(TiffStore, RoomOfALevelThatIsNoJpegAlthoughItsImageIsOneIsThatOfItsOwnCodec) {
  Layout image{.width = 1024,
               .height = 1024,
               .samples = 4,
               .tile = 64,
               .compression = COMPRESSION_JPEG,
               .photometric = PHOTOMETRIC_RGB};
  const std::string file = folder_.File("image.tif");
  std::vector<uint32_t> skipped(200);  // of 256 tiles: few bytes for many samples
  std::iota(skipped.begin(), skipped.end(), 0u);
  WriteImage(file, image, skipped);
  constexpr uint64_t kSamples = 512 * 512 * 4;
  const uint64_t heads = 64 * 1024 + kSamples / 32;
  const uint64_t asJpeg = std::filesystem::file_size(file);
  const uint64_t jpegRoom = RoomFor(*Open(file, datasources::kReadOnly), {2}).bytes;
  EXPECT_GE(2 * asJpeg + heads + kDirectories, jpegRoom);
  image.alpha = EXTRASAMPLE_UNASSALPHA;
  WriteImage(file, image, skipped);
  const LevelRoom room = RoomFor(*Open(file, datasources::kReadOnly), {2});
  EXPECT_LE(kSamples, room.bytes);
  EXPECT_FALSE(room.blursAlpha);
  datasources::LevelOptions options;
  EXPECT_EQ("", datasources::ReadLevelOption("COMPRESS=JPEG", options));
  const auto dataset = Open(file, datasources::kReadOnly);
  dataset->GetSource()->Levels()->SetOptions(options);
  const LevelRoom blurred = RoomFor(*dataset, {2});
  EXPECT_TRUE(blurred.blursAlpha);
  const uint64_t maskBytes = 512 * 512 / 8;
  EXPECT_LE(jpegRoom + maskBytes, blurred.bytes);
  EXPECT_GE(2 * asJpeg + 2 * heads + maskBytes + kDirectories, blurred.bytes);
}

TEST_F(TiffStore, RoomOfOneChannelBesideTheFileIsItsPlanes) {
  const Layout image{.width = 1024, .height = 1024, .samples = 4, .tile = 64};
  const std::string file = folder_.File("image.tif");
  WriteImage(file, image);
  const auto dataset = OpenGeneric(file);
  const auto levels = dataset->GetSource()->Levels();
  const uint64_t one = levels->RoomFor({2}, {3}).bytes;
  const uint64_t all = levels->RoomFor({2}, {1, 2, 3, 4}).bytes;
  EXPECT_NEAR(512 * 512, double(one), kDirectories);
  EXPECT_NEAR(4 * 512 * 512, double(all), kDirectories);
  EXPECT_EQ(file + ".ovr", levels->RoomFor({2}, {1}).file);
  EXPECT_EQ("", levels->RoomFor({5000}, {1}).file);  // nothing would be made
  EXPECT_EQ("", levels->RoomFor({0}, {1}).file);
}

TEST_F(TiffStore, LevelsThatCouldPassFourGiBAreAnObstacleInAClassicFileOnly) {
  const Layout image{.width = 1024, .height = 1024, .tile = 64};
  Layout big = image;
  big.mode = "w8";
  const std::string file = folder_.File("image.tif");
  for (const auto& [layout, room, isRefused] :
       {std::tuple{image, 400000u, false}, {image, 200000u, true}, {big, 200000u, false}}) {
    WriteImage(file, layout);
    std::filesystem::resize_file(file, (uint64_t{1} << 32) - room);
    const std::string obstacle = RoomFor(*Open(file, datasources::kReadOnly), {2}).obstacle;
    EXPECT_EQ(isRefused, obstacle.starts_with(file + ": could pass 4 GiB")) << obstacle;
  }
}

TEST_F(TiffStore, ClassicSideCarThatCouldPassFourGiBSaysWhatToDo) {
  const Layout image{.width = 1024, .height = 1024, .tile = 64};
  const std::string file = folder_.File("image.tif");
  WriteImage(file, image);
  Build(*OpenGeneric(file), image, {.level = 8});
  const uint64_t size = std::filesystem::file_size(file + ".ovr");
  std::filesystem::resize_file(file + ".ovr", 0xFFFFFF00);
  const auto dataset = OpenGeneric(file);
  try {
    Build(*dataset, image, {.level = 2});
    ADD_FAILURE() << "the side-car took it";
  } catch (const Exception& refusal) {
    EXPECT_TRUE(refusal.GetMessage().starts_with(file + ".ovr: could pass 4 GiB"));
    EXPECT_NE(std::string::npos, refusal.GetMessage().find("Delete the side-car"));
  }
  EXPECT_EQ(0xFFFFFF00, std::filesystem::file_size(file + ".ovr"));
  std::filesystem::resize_file(file + ".ovr", size);
  EXPECT_EQ("", WrongTile(file + ".ovr", 0, LevelLayout(image, 8)));
}

/// A level of that many samples without compression, 256 x 256 in a tile.
drivers::LevelCoding CodingOfSquare(uint32_t edge, uint16_t compression) {
  auto coding = drivers::PlainCoding(edge, edge, 1, gobs::eDT_8U, "");
  coding.format.compression = compression;
  coding.format.tiled = true;
  coding.format.tileWidth = coding.format.tileHeight = 256;
  return coding;
}

TEST_F(TiffStore, LevelsOfAnImageThatCompressesWellAreTakenToBeAFewTimesAsLargeAtMost) {
  auto coding = CodingOfSquare(1024, COMPRESSION_LZW);
  const uint64_t worst = drivers::MostBytesOf(coding, 1, false);
  EXPECT_LE(1024u * 1024 * 3 / 2, worst);  // LZW may make more of it
  coding.imageBytes = 5000;
  const uint64_t padding = 1024 * 1024 / 32 + 16 * 1024;
  EXPECT_LE(4u * 5000, drivers::MostBytesOf(coding, 1, false));
  EXPECT_GE(4 * 5000 + padding + kDirectories, drivers::MostBytesOf(coding, 1, false));
  for (const uint16_t codec : {COMPRESSION_NONE, COMPRESSION_LERC, COMPRESSION_WEBP}) {
    coding = CodingOfSquare(1024, codec);
    coding.imageBytes = 5000;
    EXPECT_LE(1024u * 1024, drivers::MostBytesOf(coding, 1, false)) << codec;
  }
}

}  // namespace
}  // namespace orin::tests
