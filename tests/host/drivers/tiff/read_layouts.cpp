/// Every layout, type and lossless codec delivers the values that were written.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <random>
#include <tuple>

#include "host/services/exception.h"
#include "tests/host/drivers/tiff/windowchecks.h"

namespace orin::tests {
namespace {

struct SampleType {
  const char* name;
  uint16_t bits;
  uint16_t format;
};

constexpr SampleType kTypes[] = {
    {"int8", 8, SAMPLEFORMAT_INT},
    {"uint8", 8, SAMPLEFORMAT_UINT},
    {"int16", 16, SAMPLEFORMAT_INT},
    {"uint16", 16, SAMPLEFORMAT_UINT},
    {"int32", 32, SAMPLEFORMAT_INT},
    {"uint32", 32, SAMPLEFORMAT_UINT},
    {"int64", 64, SAMPLEFORMAT_INT},
    {"uint64", 64, SAMPLEFORMAT_UINT},
    {"float32", 32, SAMPLEFORMAT_IEEEFP},
    {"float64", 64, SAMPLEFORMAT_IEEEFP},
    {"complexInt16", 32, SAMPLEFORMAT_COMPLEXINT},
    {"complexInt32", 64, SAMPLEFORMAT_COMPLEXINT},
    {"complexFloat32", 64, SAMPLEFORMAT_COMPLEXIEEEFP},
    {"complexFloat64", 128, SAMPLEFORMAT_COMPLEXIEEEFP},
};

struct Arrangement {
  const char* name;
  uint16_t samples;
  bool planar;
  uint32_t tile;
};

constexpr Arrangement kArrangements[] = {
    {"one channel in strips", 1, false, 0},  {"one channel in tiles", 1, false, 16},
    {"three chunky in strips", 3, false, 0}, {"three chunky in tiles", 3, false, 16},
    {"three planes in strips", 3, true, 0},  {"three planes in tiles", 3, true, 16},
};

constexpr const char* kModes[] = {"w", "wb", "w8", "wb8"};

/// Writes the layout in all arrangements and file forms, reads them back, and tells what differs.
void ExpectReadsBack(Layout layout, const std::string& what) {
  const ScratchFolder folder;
  for (const Arrangement& arrangement : kArrangements)
    for (const char* mode : kModes) {
      layout.samples = arrangement.samples;
      layout.planar = arrangement.planar;
      layout.tile = arrangement.tile;
      layout.mode = mode;
      // libtiff 4.5 writes these planes of bytes in the wrong order into a big-endian file.
      if (layout.predictor == PREDICTOR_FLOATINGPOINT && mode[1] == 'b') continue;
      const std::string file = folder.File("image.tif");
      WriteImage(file, layout);
      EXPECT_EQ("", WrongSample(file, layout, AllChannels(layout.samples)))
          << what << ", " << arrangement.name << ", mode " << mode;
      if (layout.samples == 3) {
        EXPECT_EQ("", WrongSample(file, layout, {3, 1}))
            << what << ", channels 3 and 1, " << arrangement.name << ", mode " << mode;
      }
    }
}

class EveryCodec : public ::testing::TestWithParam<std::tuple<const char*, uint16_t, uint16_t>> {};

TEST_P(EveryCodec, DeliversWhatWasWrittenInEveryTypeAndArrangement) {
  const auto [name, compression, predictor] = GetParam();
  ASSERT_TRUE(TIFFIsCODECConfigured(compression)) << "libtiff has no " << name;
  for (const SampleType& type : kTypes) {
    const bool isComplex = type.format >= SAMPLEFORMAT_COMPLEXINT;
    const bool isFloat = type.format == SAMPLEFORMAT_IEEEFP;
    if (predictor == PREDICTOR_FLOATINGPOINT && !isFloat) continue;
    if (predictor == PREDICTOR_HORIZONTAL && (isFloat || isComplex)) continue;
    // LERC: neither complex samples nor 64-bit integers.
    if (compression == COMPRESSION_LERC && (isComplex || (type.bits == 64 && !isFloat))) continue;
    Layout layout;
    layout.bits = type.bits;
    layout.sampleFormat = type.format;
    layout.compression = compression;
    layout.predictor = predictor;
    ExpectReadsBack(layout, type.name);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Lossless, EveryCodec,
    ::testing::Values(
        std::tuple{"none", COMPRESSION_NONE, 1}, std::tuple{"LZW", COMPRESSION_LZW, 1},
        std::tuple{"LZWwithDifferences", COMPRESSION_LZW, 2},
        std::tuple{"PackBits", COMPRESSION_PACKBITS, 1},
        std::tuple{"Deflate", COMPRESSION_ADOBE_DEFLATE, 1},
        std::tuple{"DeflateWithDifferences", COMPRESSION_ADOBE_DEFLATE, 2},
        std::tuple{"DeflateWithFloatDifferences", COMPRESSION_ADOBE_DEFLATE, 3},
        std::tuple{"OldDeflate", COMPRESSION_DEFLATE, 1}, std::tuple{"LZMA", COMPRESSION_LZMA, 1},
        std::tuple{"ZSTD", COMPRESSION_ZSTD, 1}, std::tuple{"LERC", COMPRESSION_LERC, 1}),
    [](const auto& tested) { return std::string(std::get<0>(tested.param)); });

TEST(OddWidths, AreWidenedToTheNextWholeType) {
  for (const uint16_t bits : {2, 3, 4, 5, 6, 7, 9, 10, 11, 12, 13, 14, 15, 17, 20, 23, 25, 28, 31})
    for (const uint16_t format : {SAMPLEFORMAT_UINT, SAMPLEFORMAT_INT})
      for (const uint16_t compression : {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE}) {
        Layout layout;
        layout.bits = bits;
        layout.sampleFormat = format;
        layout.compression = compression;
        ExpectReadsBack(layout, std::to_string(bits) + " bits, format " + std::to_string(format));
      }
}

TEST(OddWidths, OfThreeBytesFollowTheFilesByteOrder) {
  Layout layout;
  layout.bits = 24;
  ExpectReadsBack(layout, "24 bits");
}

class BilevelCodec : public ::testing::TestWithParam<uint16_t> {};

TEST_P(BilevelCodec, DeliversOneBytePerBit) {
  ASSERT_TRUE(TIFFIsCODECConfigured(GetParam())) << "libtiff has no codec " << GetParam();
  const ScratchFolder folder;
  Layout layout;
  layout.bits = 1;
  layout.compression = GetParam();
  layout.photometric = PHOTOMETRIC_MINISWHITE;
  if (GetParam() == COMPRESSION_JBIG)
    layout.rowsPerStrip = layout.height;  // libtiff writes one strip
  const std::string file = folder.File("bits.tif");
  WriteImage(file, layout);
  EXPECT_EQ(gobs::eDT_BIT, drivers::PixelReader(file, 0, {1}).Format().type);
  EXPECT_EQ("", WrongSample(file, layout, {1}));
}

INSTANTIATE_TEST_SUITE_P(OneBit, BilevelCodec,
                         ::testing::Values(COMPRESSION_NONE, COMPRESSION_CCITTRLE,
                                           COMPRESSION_CCITTFAX3, COMPRESSION_CCITTFAX4,
                                           COMPRESSION_PACKBITS, COMPRESSION_LZW,
                                           COMPRESSION_JBIG));

TEST(WebP, LosslessDeliversWhatWasWritten) {
  ASSERT_TRUE(TIFFIsCODECConfigured(COMPRESSION_WEBP)) << "libtiff has no WebP";
  const ScratchFolder folder;
  for (const uint16_t samples : {3, 4})
    for (const uint32_t tile : {0u, 16u}) {
      Layout layout;
      layout.samples = samples;
      layout.tile = tile;
      layout.compression = COMPRESSION_WEBP;
      layout.photometric = PHOTOMETRIC_RGB;
      WriteImage(folder.File("image.tif"), layout);
      // The encoder is free to change colours under a transparent pixel: only alpha is compared.
      const auto channels = samples == 3 ? AllChannels(3) : std::vector<unsigned>{4};
      EXPECT_EQ("", WrongSample(folder.File("image.tif"), layout, channels));
    }
}

TEST(FloatDifferences, ReadTheSameFromEitherByteOrder) {
  const ScratchFolder folder;
  Layout layout;
  layout.bits = 32;
  layout.sampleFormat = SAMPLEFORMAT_IEEEFP;
  layout.compression = COMPRESSION_ADOBE_DEFLATE;
  layout.predictor = PREDICTOR_FLOATINGPOINT;
  WriteImage(folder.File("little.tif"), layout);
  TIFF* little = TIFFOpen(folder.File("little.tif").c_str(), "r");
  ASSERT_NE(nullptr, little);
  layout.mode = "wb";
  TIFF* big = TIFFOpen(folder.File("big.tif").c_str(), "wb");
  ASSERT_NE(nullptr, big);
  SetTags(big, layout);
  for (uint32_t strip = 0; strip < 6; ++strip) {  // the compressed bytes know no byte order
    std::vector<uint8_t> bytes(TIFFGetStrileByteCount(little, strip));
    const auto size = static_cast<tmsize_t>(bytes.size());
    ASSERT_EQ(size, TIFFReadRawStrip(little, strip, bytes.data(), size));
    ASSERT_EQ(size, TIFFWriteRawStrip(big, strip, bytes.data(), size));
  }
  TIFFClose(little);
  TIFFClose(big);
  EXPECT_EQ("", WrongSample(folder.File("big.tif"), layout, {1}));
}

TEST(Jpeg, YCbCrIsDeliveredAsTheColoursThatWereWritten) {
  const ScratchFolder folder;
  for (const uint32_t tile : {0u, 32u}) {
    Layout layout;
    layout.width = layout.height = 64;
    layout.samples = 3;
    layout.tile = tile;
    layout.rowsPerStrip = 32;
    layout.compression = COMPRESSION_JPEG;
    layout.photometric = PHOTOMETRIC_YCBCR;
    const std::string file = folder.File("image.tif");
    TIFF* tiff = TIFFOpen(file.c_str(), "w");
    ASSERT_NE(nullptr, tiff);
    SetTags(tiff, layout);
    const std::array<uint8_t, 3> colour{200, 60, 90};  // flat: the codec's loss is one unit at most
    std::vector<uint8_t> bytes;
    for (uint32_t i = 0; i < layout.TileWidth() * 32; ++i)
      bytes.insert(bytes.end(), colour.begin(), colour.end());
    const auto size = static_cast<tmsize_t>(bytes.size());
    for (uint32_t i = 0; i < (tile ? 4u : 2u); ++i)
      ASSERT_EQ(size, tile ? TIFFWriteEncodedTile(tiff, i, bytes.data(), size)
                           : TIFFWriteEncodedStrip(tiff, i, bytes.data(), size));
    TIFFClose(tiff);
    drivers::PixelReader reader(file, 0, {3, 1, 2});
    gobs::Raster block({64, 64, 3, gobs::eDT_8U}, {1, 1, 0, 0});
    reader.Read(block);
    for (uint32_t i = 0; i < block.byteSize; i += 3) {
      ASSERT_NEAR(90, block.data[i], 2);
      ASSERT_NEAR(200, block.data[i + 1], 2);
      ASSERT_NEAR(60, block.data[i + 2], 2);
    }
  }
}

TEST(ComplexBytes, KeepTheirPartsInOrderInABigEndianFile) {
  const ScratchFolder folder;
  Layout layout;
  layout.width = 2, layout.height = 1, layout.rowsPerStrip = 1;
  layout.bits = 16;
  layout.sampleFormat = SAMPLEFORMAT_COMPLEXINT;
  layout.mode = "wb";
  TIFF* tiff = TIFFOpen(folder.File("image.tif").c_str(), layout.mode);
  ASSERT_NE(nullptr, tiff);
  SetTags(tiff, layout);
  uint8_t stored[] = {1, 2, 3, 4};  // (1, 2), (3, 4): single bytes have no byte order
  ASSERT_EQ(4, TIFFWriteRawStrip(tiff, 0, stored, 4));
  TIFFClose(tiff);
  drivers::PixelReader reader(folder.File("image.tif"), 0, {1});
  gobs::Raster block({2, 1, 1, gobs::DataTypeOf<int8_t>(true)}, {0, 0, 0, 0});
  reader.Read(block);
  EXPECT_EQ(0, std::memcmp(stored, block.data, 4));
}

TEST(Windows, OfAnySizePlaceMarginAndChannelsHoldTheRightPixels) {
  const ScratchFolder folder;
  std::mt19937 random(20240611);
  const auto pick = [&random](uint32_t low, uint32_t high) {
    return low + static_cast<uint32_t>(random() % (high - low + 1));
  };
  for (int round = 0; round < 60; ++round) {
    Layout layout;
    layout.width = pick(1, 90), layout.height = pick(1, 90);
    layout.samples = static_cast<uint16_t>(pick(1, 5));
    layout.bits = std::array<uint16_t, 4>{8, 12, 16, 32}[pick(0, 3)];
    layout.planar = pick(0, 1) == 1;
    layout.tile = pick(0, 2) * 16;
    layout.rowsPerStrip = pick(1, layout.height);
    layout.compression = pick(0, 1) ? COMPRESSION_NONE : COMPRESSION_LZW;
    WriteImage(folder.File("image.tif"), layout);
    std::vector<unsigned> channels;
    for (uint32_t i = pick(1, 4); i > 0; --i) channels.push_back(pick(1, layout.samples));
    drivers::PixelReader reader(folder.File("image.tif"), 0, channels);
    for (int window = 0; window < 12; ++window) {
      const uint32_t x = pick(0, layout.width - 1), y = pick(0, layout.height - 1);
      const uint32_t width = pick(1, layout.width - x), height = pick(1, layout.height - y);
      ASSERT_EQ("", WrongSample(reader, channels, {pick(0, 7), pick(0, 7), x, y}, width, height,
                                [&](uint32_t column, uint32_t row, uint32_t channel) {
                                  return SampleAt(layout, column, row, channel);
                                }))
          << "round " << round << ", window " << window;
    }
  }
}

TEST(LongStrips, AreDecodedInPiecesAndInAnyOrder) {
  const ScratchFolder folder;
  for (const bool planar : {false, true}) {
    Layout layout;
    layout.width = 2100, layout.height = 2050;  // one strip of 17 MB a plane
    layout.samples = 2;
    layout.bits = 32;
    layout.planar = planar;
    layout.rowsPerStrip = layout.height;
    layout.compression = COMPRESSION_ADOBE_DEFLATE;
    WriteImage(folder.File("image.tif"), layout);
    drivers::PixelReader reader(folder.File("image.tif"), 0, {2, 1});
    for (const uint32_t y : {0u, 700u, 2040u, 650u, 1000u})
      EXPECT_EQ("", WrongSample(reader, {2, 1}, {1, 3, 100, y}, 50, 10,
                                [&](uint32_t column, uint32_t row, uint32_t channel) {
                                  return SampleAt(layout, column, row, channel);
                                }))
          << "row " << y << (planar ? ", planes" : ", chunky");
  }
}

TEST(ReadTile, DeliversAWholeTileWithZerosBelowTheImage) {
  const ScratchFolder folder;
  Layout layout;
  layout.samples = 2;
  layout.tile = 16;
  layout.compression = COMPRESSION_LZW;
  WriteImage(folder.File("image.tif"), layout);
  drivers::PixelReader reader(folder.File("image.tif"), 0, {1});
  std::vector<uint8_t> tile(16 * reader.Format().TileRowBytes(), 0xA5);
  reader.ReadTile(
      4, tile.data());  // second row, second column of 3 x 2; rows 16 to 28 are the image's
  for (uint32_t y = 0; y < 16; ++y)
    for (uint32_t x = 0; x < 16; ++x)
      for (uint32_t c = 0; c < 2; ++c) {
        const uint8_t expected = y < 13 ? SampleAt(layout, 16 + x, 16 + y, c)[0] : 0;
        ASSERT_EQ(expected, tile[(y * 16 + x) * 2 + c]) << x << ", " << y;
      }
}

}  // namespace
}  // namespace orin::tests
