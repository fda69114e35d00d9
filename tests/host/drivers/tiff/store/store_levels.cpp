/// Levels of every kind of image come back from the file as they were written.
// SPDX-License-Identifier: MIT
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

struct Kind {
  const char* name;
  Layout layout;
};

Layout Rgb() { return {.width = 301, .height = 215, .samples = 3, .photometric = PHOTOMETRIC_RGB}; }

template <class Change>
Kind Of(const char* name, Change&& change, Layout layout = Rgb()) {
  change(layout);
  return {name, layout};
}

Layout Grey(uint16_t bits, uint16_t format) {
  return {.width = 301, .height = 215, .bits = bits, .sampleFormat = format};
}

std::vector<Kind> Kinds() {
  return {
      Of("ChunkyStrips", [](Layout&) {}),
      Of("ChunkyTiles", [](Layout& l) { l.tile = 64; }),
      Of("PlanarStrips", [](Layout& l) { l.planar = true; }),
      Of("PlanarTiles", [](Layout& l) { l.planar = true, l.tile = 32; }),
      Of("BigTiff", [](Layout& l) { l.mode = "w8", l.tile = 64; }),
      Of("BigEndian", [](Layout& l) { l.mode = "wb", l.bits = 16, l.tile = 64; }),
      Of("BigEndianBigTiff", [](Layout& l) { l.mode = "w8b", l.bits = 32, l.planar = true; }),
      Of("LittleEndian", [](Layout& l) { l.mode = "wl", l.bits = 16; }),
      Of("OneTile", [](Layout& l) { l.tile = 512; }),
      {"Int8", Grey(8, SAMPLEFORMAT_INT)},
      {"UInt16", Grey(16, SAMPLEFORMAT_UINT)},
      {"Int16", Grey(16, SAMPLEFORMAT_INT)},
      {"UInt32", Grey(32, SAMPLEFORMAT_UINT)},
      {"Int32", Grey(32, SAMPLEFORMAT_INT)},
      {"UInt64", Grey(64, SAMPLEFORMAT_UINT)},
      {"Int64", Grey(64, SAMPLEFORMAT_INT)},
      {"Float32", Grey(32, SAMPLEFORMAT_IEEEFP)},
      {"Float64", Grey(64, SAMPLEFORMAT_IEEEFP)},
      {"ComplexInt16", Grey(32, SAMPLEFORMAT_COMPLEXINT)},
      {"ComplexFloat32", Grey(64, SAMPLEFORMAT_COMPLEXIEEEFP)},
      {"ComplexFloat64", Grey(128, SAMPLEFORMAT_COMPLEXIEEEFP)},
      Of(
          "ComplexFloat32BigEndian", [](Layout& l) { l.mode = "wb"; },
          Grey(64, SAMPLEFORMAT_COMPLEXIEEEFP)),
      Of(
          "ComplexBigEndianDeflate",
          [](Layout& l) { l.mode = "wb", l.compression = COMPRESSION_ADOBE_DEFLATE; },
          Grey(32, SAMPLEFORMAT_COMPLEXINT)),
      {"Bits12", Grey(12, SAMPLEFORMAT_UINT)},
      Of(
          "Bits12BigEndian", [](Layout& l) { l.mode = "wb"; }, Grey(12, SAMPLEFORMAT_UINT)),
      {"Bits4", Grey(4, SAMPLEFORMAT_UINT)},
      Of(
          "Bits12Deflate", [](Layout& l) { l.compression = COMPRESSION_ADOBE_DEFLATE; },
          Grey(12, SAMPLEFORMAT_UINT)),
      Of("Deflate", [](Layout& l) { l.compression = COMPRESSION_ADOBE_DEFLATE; }),
      Of("OldDeflate", [](Layout& l) { l.compression = COMPRESSION_DEFLATE; }),
      Of("DeflatePredictor",
         [](Layout& l) { l.compression = COMPRESSION_ADOBE_DEFLATE, l.predictor = 2; }),
      Of("DeflatePredictorBigEndian16",
         [](Layout& l) {
           l.compression = COMPRESSION_ADOBE_DEFLATE, l.predictor = 2, l.bits = 16, l.mode = "wb";
         }),
      Of(
          "DeflateFloatPredictor",
          [](Layout& l) { l.compression = COMPRESSION_ADOBE_DEFLATE, l.predictor = 3; },
          Grey(32, SAMPLEFORMAT_IEEEFP)),
      Of("Lzw", [](Layout& l) { l.compression = COMPRESSION_LZW, l.predictor = 2, l.tile = 128; }),
      Of("PackBits", [](Layout& l) { l.compression = COMPRESSION_PACKBITS; }),
      Of("Lzma", [](Layout& l) { l.compression = COMPRESSION_LZMA; }),
      Of("Zstd",
         [](Layout& l) { l.compression = COMPRESSION_ZSTD, l.predictor = 2, l.planar = true; }),
      Of("WebP", [](Layout& l) { l.compression = COMPRESSION_WEBP, l.tile = 64; }),
      Of(
          "Lerc", [](Layout& l) { l.compression = COMPRESSION_LERC; },
          Grey(32, SAMPLEFORMAT_IEEEFP)),
      Of("LercPlanes", [](Layout& l) { l.compression = COMPRESSION_LERC, l.planar = true; }),
      Of("Cmyk", [](Layout& l) { l.photometric = PHOTOMETRIC_SEPARATED, l.samples = 4; }),
  };
}

class EveryKind : public TiffStore, public ::testing::WithParamInterface<Kind> {};

TEST_P(EveryKind, OfImageKeepsItsLevelsPixels) {
  const Layout& layout = GetParam().layout;
  ASSERT_TRUE(TIFFIsCODECConfigured(layout.compression))
      << "libtiff has no codec " << layout.compression;
  const std::string file = folder_.File("image.tif");
  WriteImage(file, layout);
  const auto before = BytesOf(file);

  Build(file, layout, {.level = 2, .edge = 70});
  Build(file, layout, {.level = 5, .edge = 1000});

  EXPECT_EQ("301x215 150x107 60x43", SizesOf(file));
  EXPECT_EQ("", WrongTile(file, 1, LevelLayout(layout, 2)));
  EXPECT_EQ("", WrongTile(file, 2, LevelLayout(layout, 5)));
  const auto directories = DirectoriesOf(file);
  for (const size_t i : {1, 2}) {
    EXPECT_EQ(uint32_t{FILETYPE_REDUCEDIMAGE}, directories[i].subfile);
    EXPECT_EQ(layout.compression, directories[i].compression);
    EXPECT_EQ(layout.predictor, directories[i].predictor);
    EXPECT_EQ(layout.photometric, directories[i].photometric);
  }
  EXPECT_EQ("", WrongPixels(file, layout, 2));
  EXPECT_EQ("", WrongPixels(file, layout, 5));
  EXPECT_TRUE(StartsWith(BytesOf(file), before, LinkOfFirst(file), 8));
  for (const LevelDescription& level : LevelsOf(file))
    EXPECT_EQ(std::string(layout.samples, '1'), ValidityOf(level));
}

INSTANTIATE_TEST_SUITE_P(, EveryKind, ::testing::ValuesIn(Kinds()),
                         [](const auto& kind) { return kind.param.name; });

TEST_F(TiffStore, ComplexSamplesOfTwoBytesComeBackFromAFileOfTheOtherByteOrder) {
  for (const uint16_t compression : {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE})
    for (const char* mode : {"wl", "wb"}) {
      Layout layout = Grey(16, SAMPLEFORMAT_COMPLEXINT);
      layout.compression = compression;
      layout.mode = mode;
      const std::string file = folder_.File("image.tif");
      WriteImage(file, layout);
      Build(file, layout, {.level = 2});
      EXPECT_EQ("", WrongPixels(file, layout, 2)) << mode << ", compression " << compression;
    }
}

/// A smooth image, which lossy codecs keep well.
TEST_F(TiffStore, JpegLevelKeepsYCbCrAndItsTilesStandAlone) {
  Layout layout = Rgb();
  layout.tile = 64;
  layout.compression = COMPRESSION_JPEG;
  layout.photometric = PHOTOMETRIC_YCBCR;
  layout.width = layout.height = 256;
  const std::string file = folder_.File("image.tif");
  WriteImage(file, layout);
  const auto dataset = Open(file, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.CreateLevel(2);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
  gobs::Raster block({128, 128, 3, gobs::eDT_8U}, {});
  for (uint32_t i = 0; i < block.byteSize; ++i)
    block.data[i] = i % 3 == 0 ? 200 : i % 3 == 1 ? 100 : 50;
  writer->Write(block);
  accessor.SetLevelValid(2, true);

  const auto directories = DirectoriesOf(file);
  ASSERT_EQ(2u, directories.size());
  EXPECT_EQ(COMPRESSION_JPEG, directories[1].compression);
  EXPECT_EQ(PHOTOMETRIC_YCBCR, directories[1].photometric);
  TIFF* tiff = TIFFOpen(file.c_str(), "rm");
  TIFFSetDirectory(tiff, 1);
  TIFFSetField(tiff, TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
  uint32_t tablesSize = 0;
  void* tables = nullptr;
  EXPECT_EQ(0, TIFFGetField(tiff, TIFFTAG_JPEGTABLES, &tablesSize, &tables));
  std::vector<uint8_t> tile(64 * 64 * 3);
  EXPECT_EQ(tmsize_t(tile.size()),
            TIFFReadEncodedTile(tiff, 3, tile.data(), tmsize_t(tile.size())));
  EXPECT_NEAR(200, tile[0], 3);
  EXPECT_NEAR(100, tile[1], 3);
  EXPECT_NEAR(50, tile[2], 3);
  TIFFClose(tiff);
}

TEST_F(TiffStore, PaletteNoDataAndExtraSamplesAreInherited) {
  const Layout layout{.width = 80, .height = 60, .photometric = PHOTOMETRIC_PALETTE, .noData = "7"};
  const std::string file = folder_.File("image.tif");
  TIFF* tiff = TIFFOpen(file.c_str(), "w");
  SetTags(tiff, layout);
  std::vector<uint16_t> red(256, 1), green(256, 2), blue(256, 3);
  TIFFSetField(tiff, TIFFTAG_COLORMAP, red.data(), green.data(), blue.data());
  std::vector<uint8_t> row(80);
  for (uint32_t y = 0; y < 60; ++y) TIFFWriteScanline(tiff, row.data(), y);
  TIFFClose(tiff);
  Build(file, layout, {.level = 2});

  tiff = TIFFOpen(file.c_str(), "rm");
  ASSERT_TRUE(TIFFSetDirectory(tiff, 1));
  uint16_t *r = nullptr, *g = nullptr, *b = nullptr;
  EXPECT_EQ(1, TIFFGetField(tiff, TIFFTAG_COLORMAP, &r, &g, &b));
  EXPECT_TRUE(std::equal(green.begin(), green.end(), g));
  uint32_t count = 0;
  char* noData = nullptr;
  EXPECT_EQ(1, TIFFGetField(tiff, 42113, &count, &noData));
  EXPECT_STREQ("7", noData);
  TIFFClose(tiff);
}

TEST_F(TiffStore, CodecThatCannotBeWrittenBecomesDeflate) {
  const Layout layout{.width = 64, .height = 64, .bits = 1, .compression = COMPRESSION_CCITTFAX4};
  const std::string file = folder_.File("image.tif");
  WriteImage(file, layout);
  Build(file, layout, {.level = 2});
  const auto directories = DirectoriesOf(file);
  ASSERT_EQ(2u, directories.size());
  EXPECT_EQ(COMPRESSION_ADOBE_DEFLATE, directories[1].compression);
  EXPECT_EQ("", WrongTile(file, 1, LevelLayout(layout, 2)));
}

TEST_F(TiffStore, EmptyTilesStayOutOnlyWhereTheImageLeavesOutTiles) {
  Layout layout{.width = 128, .height = 128, .tile = 32};
  const std::string sparse = folder_.File("sparse.tif");
  const std::string full = folder_.File("full.tif");
  WriteImage(sparse, layout, {5});
  WriteImage(full, layout);
  for (const std::string& file : {sparse, full}) {
    const auto dataset = Open(file, datasources::kUpdate);
    datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1});
    accessor.CreateLevel(2);
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
    gobs::Raster block({64, 64, 1, gobs::eDT_8U}, {});
    std::fill(block.data, block.data + block.byteSize, uint8_t{0});
    block.data[0] = 9;  // in tile 0
    writer->Write(block);
    accessor.SetLevelValid(2, true);
    TIFF* tiff = TIFFOpen(file.c_str(), "rm");
    TIFFSetDirectory(tiff, 1);
    EXPECT_NE(0u, TIFFGetStrileByteCount(tiff, 0));
    for (uint32_t tile = 1; tile < 4; ++tile)
      EXPECT_EQ(file == sparse, TIFFGetStrileByteCount(tiff, tile) == 0) << tile;
    TIFFClose(tiff);
  }
}

TEST_F(TiffStore, SomeChannelsOfAChunkyLevelLeaveTheOthersAsTheyWere) {
  Layout layout = Rgb();
  layout.tile = 64;
  const std::string file = folder_.File("image.tif");
  WriteImage(file, layout);
  Build(file, layout, {.level = 2, .edge = 33, .channels = {1, 3}});
  EXPECT_EQ("1-1", ValidityOf(LevelsOf(file).at(0)));
  Build(file, layout, {.level = 2, .edge = 50, .channels = {2}});
  EXPECT_EQ("111", ValidityOf(LevelsOf(file).at(0)));
  EXPECT_EQ("", WrongTile(file, 1, LevelLayout(layout, 2)));
}

TEST_F(TiffStore, ChannelsInAnotherOrderLandWhereTheyBelong) {
  for (const bool planar : {false, true}) {
    Layout layout = Rgb();
    layout.planar = planar;
    const std::string file = folder_.File(planar ? "planes.tif" : "chunky.tif");
    WriteImage(file, layout);
    Build(file, layout, {.level = 2, .edge = 64, .channels = {3, 1, 2}});
    EXPECT_EQ("", WrongTile(file, 1, LevelLayout(layout, 2)));
  }
}

}  // namespace
}  // namespace orin::tests
