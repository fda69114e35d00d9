/// Sparse, damaged and hostile files: the declared fill, or a clear exception, never a crash.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <fstream>
#include <iterator>

#include "host/services/exception.h"
#include "tests/host/drivers/tiff/windowchecks.h"

namespace orin::tests {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::StartsWith;

std::vector<char> Contents(const std::string& file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

void Replace(const std::string& file, const std::vector<char>& bytes) {
  std::ofstream(file, std::ios::binary)
      .write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
}

/// The message of the exception that reading the whole image raises; empty when it raises none.
std::string ReadingFails(const std::string& file, const Layout& layout) {
  try {
    drivers::PixelReader reader(file, 0, AllChannels(layout.samples));
    gobs::Raster block({layout.width, layout.height, layout.samples, reader.Format().type}, {});
    reader.Read(block);
    return "";
  } catch (const Exception& failure) {
    return failure.what();
  }
}

class SparseTiles : public ::testing::TestWithParam<uint16_t> {};

TEST_P(SparseTiles, HoldTheDeclaredNoDataValue) {
  const ScratchFolder folder;
  for (const bool planar : {false, true})
    for (const uint32_t tile : {0u, 16u}) {
      Layout layout;
      layout.samples = 3;
      layout.bits = 16;
      layout.planar = planar;
      layout.tile = tile;
      layout.compression = GetParam();
      layout.noData = " 513 ";
      WriteImage(folder.File("image.tif"), layout, {1, 2});
      drivers::PixelReader reader(folder.File("image.tif"), 0, {2, 1});
      const ExpectedSample expected = [&](uint32_t x, uint32_t y, uint32_t channel) {
        const uint32_t column = tile ? x / tile : 0, row = y / layout.TileHeight();
        const uint32_t across = tile ? 3 : 1, down = tile ? 2 : 6;
        const uint32_t index = row * across + column + (planar ? channel * across * down : 0);
        if (index != 1 && index != 2) return SampleAt(layout, x, y, channel);
        return std::vector<uint8_t>{1, 2};  // 513
      };
      EXPECT_EQ("",
                WrongSample(reader, {2, 1}, {2, 2, 0, 0}, layout.width, layout.height, expected))
          << (planar ? "planes" : "chunky") << ", tile " << tile;
    }
}

INSTANTIATE_TEST_SUITE_P(RawAndCompressed, SparseTiles,
                         ::testing::Values(COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE));

TEST(SparseFill, IsZeroWhereTheTypeCannotHoldTheNoDataValue) {
  const ScratchFolder folder;
  struct Case {
    const char* noData;
    uint16_t bits, format;
    std::vector<uint8_t> sample;
  };
  const Case cases[] = {
      {"255", 8, SAMPLEFORMAT_UINT, {255}},
      {"256", 8, SAMPLEFORMAT_UINT, {0}},
      {"-1", 8, SAMPLEFORMAT_UINT, {0}},
      {"-1", 8, SAMPLEFORMAT_INT, {255}},
      {"1.5", 16, SAMPLEFORMAT_INT, {0, 0}},
      {"nan", 16, SAMPLEFORMAT_INT, {0, 0}},
      {"18446744073709551615", 64, SAMPLEFORMAT_UINT, {255, 255, 255, 255, 255, 255, 255, 255}},
      {"1", 32, SAMPLEFORMAT_IEEEFP, {0, 0, 0x80, 0x3F}},
      {"nan", 32, SAMPLEFORMAT_IEEEFP, {0, 0, 0xC0, 0x7F}},
      {"-inf", 32, SAMPLEFORMAT_IEEEFP, {0, 0, 0x80, 0xFF}},
      {"1e300", 32, SAMPLEFORMAT_IEEEFP, {0, 0, 0x80, 0x7F}},  // as raster programs read it
      {"3", 32, SAMPLEFORMAT_COMPLEXINT, {3, 0, 0, 0}},
      {"rubbish", 8, SAMPLEFORMAT_UINT, {0}},
  };
  for (const Case& tested : cases) {
    Layout layout;
    layout.width = layout.height = layout.tile = 16;
    layout.bits = tested.bits;
    layout.sampleFormat = tested.format;
    layout.noData = tested.noData;
    WriteImage(folder.File("image.tif"), layout, {0});
    drivers::PixelReader reader(folder.File("image.tif"), 0, {1});
    EXPECT_EQ("", WrongSample(reader, {1}, {}, 16, 16,
                              [&](uint32_t, uint32_t, uint32_t) { return tested.sample; }))
        << tested.noData << " in " << tested.bits << " bits of format " << tested.format;
  }
}

TEST(Truncated, FilesFailClearlyOrDeliverTheRightPixels) {
  const ScratchFolder folder;
  int failures = 0;
  for (const uint16_t compression : {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE, COMPRESSION_LZW,
                                     COMPRESSION_PACKBITS, COMPRESSION_ZSTD})
    for (const uint32_t tile : {0u, 16u})
      for (const char* mode : {"w", "wb8"}) {
        Layout layout;
        layout.samples = 2;
        layout.bits = 16;
        layout.tile = tile;
        layout.compression = compression;
        layout.mode = mode;
        const std::string good = folder.File("good.tif"), cut = folder.File("cut.tif");
        WriteImage(good, layout);
        const std::vector<char> bytes = Contents(good);
        for (size_t length = 0; length < bytes.size(); length += 1 + bytes.size() / 97) {
          Replace(cut, {bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(length)});
          const std::string failure = ReadingFails(cut, layout);
          failures += !failure.empty();
          if (failure.empty()) EXPECT_EQ("", WrongSample(cut, layout, {1, 2})) << length;
          else EXPECT_THAT(failure, StartsWith(cut + ": cannot be read: ")) << length;
        }
      }
  EXPECT_GT(failures, 1000);
}

TEST(Damaged, BytesAnywhereNeverCrashTheReader) {
  const ScratchFolder folder;
  uint32_t state = 1;
  const auto random = [&state] { return state = state * 1664525 + 1013904223, state >> 8; };
  const std::string good = folder.File("good.tif"), bad = folder.File("bad.tif");
  int answers = 0;
  for (const uint16_t compression :
       {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE, COMPRESSION_LZW, COMPRESSION_PACKBITS}) {
    Layout layout;
    layout.samples = 2;
    layout.tile = 16;
    layout.compression = compression;
    WriteImage(good, layout);
    const std::vector<char> bytes = Contents(good);
    for (int round = 0; round < 300; ++round) {
      std::vector<char> damaged = bytes;
      for (uint32_t i = 1 + random() % 4; i > 0; --i)
        damaged[round % 2 ? random() % damaged.size() : damaged.size() - 1 - random() % 250] =
            static_cast<char>(random());
      Replace(bad, damaged);
      try {
        drivers::PixelReader reader(bad, 0, {1});
        const uint32_t width = std::min(reader.Format().width, 64u);
        const uint32_t height = std::min(reader.Format().height, 64u);
        gobs::Raster block({width, height, 1, reader.Format().type}, {1, 1, 0, 0});
        reader.Read(block);
        ++answers;
      } catch (const Exception& failure) {
        EXPECT_THAT(failure.what(), StartsWith(bad + ": cannot be read: "));
        ++answers;
      }
    }
  }
  EXPECT_EQ(1200, answers);
}

TEST(Damaged, TileIsNamedWithTheReason) {
  const ScratchFolder folder;
  Layout layout;
  layout.tile = 16;
  layout.compression = COMPRESSION_ADOBE_DEFLATE;
  const std::string file = folder.File("image.tif");
  WriteImage(file, layout);
  TIFF* tiff = TIFFOpen(file.c_str(), "r");
  ASSERT_NE(nullptr, tiff);
  const uint64_t offset = TIFFGetStrileOffset(tiff, 3);
  TIFFClose(tiff);
  std::fstream stream(file, std::ios::binary | std::ios::in | std::ios::out);
  stream.seekp(static_cast<std::streamoff>(offset)).write("\x78\x9c\xff\xff\xff\xff\xff\xff", 8);
  stream.close();
  EXPECT_THAT(ReadingFails(file, layout),
              AllOf(StartsWith(file + ": cannot be read: tile 3: "), HasSubstr("Decoding error")));
}

/// Writes a directory whose first `count` strips or tiles hold so many bytes of no use.
void WriteClaims(const std::string& file, const Layout& layout, uint32_t count, uint32_t bytes) {
  TIFF* tiff = TIFFOpen(file.c_str(), "w");
  ASSERT_NE(nullptr, tiff);
  SetTags(tiff, layout);
  TIFFWriteCheck(tiff, layout.tile != 0, "");
  std::vector<uint8_t> stored(bytes, 1);
  for (uint32_t i = 0; i < count; ++i)
    ASSERT_EQ(tmsize_t{bytes}, layout.tile ? TIFFWriteRawTile(tiff, i, stored.data(), bytes)
                                           : TIFFWriteRawStrip(tiff, i, stored.data(), bytes));
  TIFFWriteDirectory(tiff);
  TIFFClose(tiff);
}

uint64_t PeakMegabytes() {
  struct rusage usage;
  getrusage(RUSAGE_SELF, &usage);
  return static_cast<uint64_t>(usage.ru_maxrss) / 1024;
}

TEST(Huge, ClaimsOfFewBytesFailWithoutTakingMemory) {
  const ScratchFolder folder;
  const uint64_t before = PeakMegabytes();
  for (const uint16_t compression : {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE}) {
    Layout layout;
    layout.width = 65535, layout.height = layout.rowsPerStrip = 900;
    layout.samples = 65535;
    layout.compression = compression;
    const std::string file = folder.File("image.tif");
    WriteClaims(file, layout, 1, 20);
    drivers::PixelReader reader(file, 0, {7});
    gobs::Raster block({100, 100, 1, gobs::eDT_8U}, {});
    try {
      reader.Read(block);
      ADD_FAILURE() << "the pixels are not there";
    } catch (const Exception& failure) {
      EXPECT_THAT(failure.what(), StartsWith(file + ": cannot be read: strip 0: "));
    }
  }
  EXPECT_LT(PeakMegabytes(), before + 64);
}

TEST(Huge, TilesFailWithoutTakingMemory) {
  const ScratchFolder folder;
  Layout layout;
  layout.width = layout.height = layout.tile = 1u << 20;
  layout.samples = 1024;
  layout.bits = 128;
  layout.sampleFormat = SAMPLEFORMAT_COMPLEXIEEEFP;
  for (const uint16_t compression : {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE}) {
    layout.compression = compression;
    const std::string file = folder.File("image.tif");
    WriteClaims(file, layout, 1, 20);
    try {
      drivers::PixelReader reader(file, 0, {1});
      gobs::Raster block({8, 8, 1, reader.Format().type}, {});
      reader.Read(block);
      ADD_FAILURE() << "the pixels are not there";
    } catch (const Exception& failure) {
      EXPECT_THAT(failure.what(), StartsWith(file + ": cannot be read: "));
    }
  }
}

TEST(Huge, SparseImagesAreReadWhereverTheWindowLies) {
  const ScratchFolder folder;
  Layout layout;
  layout.width = layout.height = 66000;
  layout.rowsPerStrip = 4096;
  layout.bits = 32;
  layout.compression = COMPRESSION_ADOBE_DEFLATE;
  layout.noData = "42";
  WriteClaims(folder.File("image.tif"), layout, 0, 0);
  drivers::PixelReader reader(folder.File("image.tif"), 0, {1});
  EXPECT_EQ(
      "", WrongSample(reader, {1}, {3, 3, 65990, 65990}, 10, 10, [](uint32_t, uint32_t, uint32_t) {
        return std::vector<uint8_t>{42, 0, 0, 0};
      }));
}

TEST(Unsupported, LayoutsAreRefusedByName) {
  const ScratchFolder folder;
  const std::string file = folder.File("image.tif");
  const auto refusal = [&](const Layout& layout) {
    WriteClaims(file, layout, 1, 20);
    return ReadingFails(file, layout);
  };
  Layout half;
  half.bits = 16, half.sampleFormat = SAMPLEFORMAT_IEEEFP;
  EXPECT_THAT(refusal(half),
              AllOf(StartsWith(file + ": "), HasSubstr("16 bits with sample format 3")));
  Layout wide;
  wide.bits = 48;
  EXPECT_THAT(refusal(wide), AllOf(StartsWith(file + ": "), HasSubstr("48 bits")));
  Layout subsampled;
  subsampled.samples = 3, subsampled.photometric = PHOTOMETRIC_YCBCR;
  EXPECT_THAT(refusal(subsampled), AllOf(StartsWith(file + ": "), HasSubstr("subsampled YCbCr")));
}

TEST(NoTiff, IsSaidToBeNone) {
  const ScratchFolder folder;
  for (const std::string text : {"", "II", "II*", "hello, world"}) {
    Replace(folder.File("image.tif"), {text.begin(), text.end()});
    EXPECT_THAT(ReadingFails(folder.File("image.tif"), Layout{}),
                StartsWith(folder.File("image.tif") + ": cannot be read: "));
  }
  EXPECT_THAT(ReadingFails(folder.File("absent.tif"), Layout{}), HasSubstr("No such file"));
}

}  // namespace
}  // namespace orin::tests
