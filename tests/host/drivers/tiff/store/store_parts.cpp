/// The small parts of the level store, each by itself.
// SPDX-License-Identifier: MIT
#include <random>

#include "host/drivers/tiff/appender.h"
#include "host/drivers/tiff/file/levelfactor.h"
#include "host/drivers/tiff/jpegquality.h"
#include "host/drivers/tiff/leveldirectories.h"
#include "host/drivers/tiff/levelmetadata.h"
#include "host/drivers/tiff/tileencoder.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

using drivers::Appender;
using drivers::FactorOf;
using drivers::LevelMetadata;
using drivers::PositionedFile;

TEST(Factor, OfASizeIsTheOneThatMadeIt) {
  struct Case {
    uint32_t width, height, levelWidth, levelHeight;
    unsigned factor;
  };
  for (const Case& c :
       std::vector<Case>{{1001, 777, 500, 388, 2},
                         {1001, 777, 501, 389, 2},  // rounded up
                         {1001, 777, 501, 388, 2},  // each axis its own way
                         {1000, 1000, 333, 333, 3},
                         {1000, 1000, 334, 334, 3},
                         {20000, 20000, 78, 78, 256},  // 254 to 259: the power of two
                         {20000, 20000, 79, 79, 256},
                         {20000, 20000, 30, 30, 667},
                         {1000, 1, 500, 1, 2},
                         {1000, 1, 250, 1, 4},
                         {3000, 3000, 1, 1, 2048}})
    EXPECT_EQ(c.factor, FactorOf(c.width, c.height, c.levelWidth, c.levelHeight))
        << c.width << "x" << c.height << " to " << c.levelWidth << "x" << c.levelHeight;
}

TEST(Factor, IsNoneWhereTheAxesDisagreeOrNothingIsReduced) {
  EXPECT_FALSE(FactorOf(1000, 1000, 500, 250));
  EXPECT_FALSE(FactorOf(1000, 1000, 1000, 1000));
  EXPECT_FALSE(FactorOf(1000, 1000, 999, 999));
  EXPECT_FALSE(FactorOf(1000, 1000, 2000, 2000));
  EXPECT_FALSE(FactorOf(1000, 1000, 0, 0));
}

TEST(Factor, OfAnySizeLeadsBackToThatSize) {
  std::mt19937 random(5);
  for (int i = 0; i < 20000; ++i) {
    const uint32_t width = 2 + random() % 50000, height = 2 + random() % 50000;
    const uint32_t level = 2 + random() % std::min(std::min(width, height) - 1, 600u);
    const bool up = random() % 2 != 0;
    const auto reduced = [&](uint32_t size, uint32_t by) {
      return (size + (up ? by - 1 : 0)) / by;
    };
    const auto factor = FactorOf(width, height, reduced(width, level), reduced(height, level));
    ASSERT_TRUE(factor) << width << "x" << height << " by " << level;
    for (const auto& [size, by] : {std::pair{width, level}, std::pair{height, level}}) {
      const uint32_t stored = reduced(size, by);
      EXPECT_TRUE(size / *factor == stored || (size + *factor - 1) / *factor == stored)
          << width << "x" << height << " by " << level << ": " << *factor;
    }
  }
}

TEST(Metadata, OfALevelIsReadBackAndItsValidityIsFound) {
  model::LevelRecord written;
  written.method = "A<&>B";
  written.level = 8;
  written.sourceLevel = 4;
  written.program = "Orin \"x\"";
  written.validity = "10-1";
  const std::string text = drivers::ComposeLevelMetadata(written);
  const LevelMetadata read = drivers::ParseLevelMetadata(text);
  EXPECT_EQ(written.method, read.method);
  EXPECT_EQ(8u, read.level);
  EXPECT_EQ(4u, read.sourceLevel);
  EXPECT_EQ(written.program, read.program);
  EXPECT_EQ("10-1", read.validity);
  EXPECT_EQ("10-1", text.substr(read.validityAt, 4));
  EXPECT_EQ(model::TextOf(written.image), text.substr(read.imageAt, model::kImageTextLength));
  EXPECT_EQ(model::TextOf(written.content), text.substr(read.contentAt, model::kContentTextLength));
}

TEST(Metadata, HasItsValidityWhereTheItemStandsThatCounts) {
  const char* texts[] = {
      "<!-- <Item name=\"ORIN_VALID\">10</Item> --><Item name=\"ORIN_VALID\">10</Item>",
      "<Item name=\"ORIN_VALID\">10</Item><Item name=\"ORIN_VALID\">10</Item>",
      "<Item name=\"x\">name=\"ORIN_VALID\">10</Item><Item name='ORIN_VALID'>10</Item>",
  };
  for (std::string text : texts) {
    const size_t last = text.rfind("10");
    EXPECT_EQ(last, drivers::ParseLevelMetadata(text).validityAt) << text;
    text.replace(last, 2, "01");
    EXPECT_EQ("01", drivers::ParseLevelMetadata(text).validity) << text;
  }
}

TEST(Metadata, WithoutAWholeValidityHasNone) {
  for (const char* text :
       {"", "<GDALMetadata>", "<GDALMetadata><Item name=\"ORIN_VALID\">12</Item></GDALMetadata>",
        "<GDALMetadata><Item name=\"ORIN_VALID\">&#49;</Item></GDALMetadata>",
        "<Item name=\"ORIN_VALID\""})
    EXPECT_EQ("", drivers::ParseLevelMetadata(text).validity) << text;
}

class Parts : public TiffStore {};

constexpr uint64_t kFirst = 2 * drivers::kMarkerBytes;  // of a few bytes: a marker goes before

TEST_F(Parts, JpegQualityIsFoundInTheTablesOfAFile) {
  for (const int quality : {10, 35, 50, 75, 90, 100}) {
    const std::string file = folder_.File("quality.tif");
    TIFF* tiff = TIFFOpen(file.c_str(), "w");
    const Layout layout{.width = 64, .height = 64, .tile = 64, .compression = COMPRESSION_JPEG};
    SetTags(tiff, layout);
    TIFFSetField(tiff, TIFFTAG_JPEGQUALITY, quality);
    auto bytes = TileBytes(layout, 0, 0, 64, 0);
    TIFFWriteEncodedTile(tiff, 0, bytes.data(), tmsize_t(bytes.size()));
    uint32_t count = 0;
    uint8_t* tables = nullptr;
    ASSERT_EQ(1, TIFFGetField(tiff, TIFFTAG_JPEGTABLES, &count, &tables));
    EXPECT_EQ(quality, drivers::JpegQualityOf({tables, tables + count}));
    TIFFClose(tiff);
  }
  EXPECT_EQ(std::nullopt, drivers::JpegQualityOf({}));
  EXPECT_EQ(std::nullopt, drivers::JpegQualityOf({0xFF, 0xD8, 0xFF, 0xDB, 0x00, 0x43, 0x00, 0x01}));
}

TEST_F(Parts, AppendedBytesStartAtEvenPositionsAndCanBeGivenUp) {
  const std::string name = folder_.File("bytes");
  std::ofstream(name) << "odd";
  PositionedFile file(name, PositionedFile::Mode::kUpdate);
  Appender appender(file, false, {});
  EXPECT_EQ(3u, appender.End());
  EXPECT_EQ(kFirst, appender.Append({1, 2, 3}));
  EXPECT_EQ(kFirst + 4, appender.Append({4}));
  appender.CutBackTo(3);
  EXPECT_EQ(3u, file.Size());
  EXPECT_EQ(kFirst, appender.Append({9}));
}

TEST_F(Parts, BytesOfAnotherProgramAreNeverCutOff) {
  const std::string name = folder_.File("bytes");
  std::ofstream(name) << "before";
  PositionedFile file(name, PositionedFile::Mode::kUpdate);
  Appender appender(file, false, {});
  appender.Append({1, 2});
  std::ofstream(name, std::ios::app) << "others";
  appender.CutBackTo(6);
  EXPECT_EQ(kFirst + 8, file.Size());
}

TEST(Coding, OfLevelsWithVeryManyChannelsHasSmallerTiles) {
  const auto edge = [](uint32_t channels) {
    const auto image = drivers::PlainCoding(5000, 5000, channels, gobs::eDT_8U, "");
    return drivers::CodingOfLevel(image, 2, "image").format.tileWidth;
  };
  EXPECT_EQ(256u, edge(3));
  EXPECT_EQ(256u, edge(1024));  // 64 MiB
  EXPECT_EQ(128u, edge(1025));
  EXPECT_EQ(32u, edge(65535));  // 64 MiB less 1 KiB
}

TEST_F(Parts, BytesOfAnotherProgramAreNeverWrittenOver) {
  const std::string name = folder_.File("bytes");
  std::ofstream(name) << "before";
  PositionedFile file(name, PositionedFile::Mode::kUpdate);
  Appender appender(file, false, {});
  std::ofstream(name, std::ios::app) << "others";
  EXPECT_EQ(kFirst, appender.Append({1, 2}));
  const std::vector<char> bytes = BytesOf(name);
  EXPECT_EQ("beforeothers", std::string(bytes.begin(), bytes.begin() + 12));
  appender.CutBackTo(6);
  EXPECT_EQ(kFirst + 2, file.Size());
}

TEST_F(Parts, KeptBytesAreNotGivenUp) {
  const std::string name = folder_.File("bytes");
  std::ofstream(name) << "before";
  PositionedFile file(name, PositionedFile::Mode::kUpdate);
  Appender appender(file, false, {});
  appender.Append({1, 2});
  appender.Keep();
  appender.Append({3, 4});
  appender.CutBackTo(6);
  EXPECT_EQ(kFirst + 4, file.Size());
  appender.CutBackTo(kFirst + 2);
  EXPECT_EQ(kFirst + 2, file.Size());
}

TEST_F(Parts, DirectoryIsReadByLibtiffAsItWasComposed) {
  for (const bool isBig : {false, true})
    for (const std::endian order : {std::endian::little, std::endian::big}) {
      const std::string name = folder_.File("composed.tif");
      const std::string mode =
          std::string("w") + (isBig ? "8" : "") + (order == std::endian::little ? "l" : "b");
      WriteImage(name, {.width = 5, .height = 5, .mode = mode.c_str()});
      const size_t link = LinkOfFirst(name);
      PositionedFile file(name, PositionedFile::Mode::kUpdate);
      Appender appender(file, isBig, {order});
      const uint64_t at = appender.AppendDirectory(
          {drivers::TextEntry(TIFFTAG_SOFTWARE, "a longer text"),
           drivers::NumbersEntry(TIFFTAG_IMAGEWIDTH, TIFF_LONG, {70000}),
           drivers::NumbersEntry(TIFFTAG_IMAGELENGTH, TIFF_SHORT, {300}),
           drivers::NumbersEntry(TIFFTAG_BITSPERSAMPLE, TIFF_SHORT, {8, 8, 8}),
           drivers::NumbersEntry(TIFFTAG_SAMPLESPERPIXEL, TIFF_SHORT, {3}),
           drivers::NumbersEntry(TIFFTAG_PHOTOMETRIC, TIFF_SHORT, {2}),
           drivers::NumbersEntry(TIFFTAG_STRIPOFFSETS, TIFF_LONG, {8}),
           drivers::NumbersEntry(TIFFTAG_STRIPBYTECOUNTS, TIFF_LONG, {25})},
          0);
      EXPECT_EQ(0u, at % 2);
      appender.Link(link, at);
      TIFF* tiff = TIFFOpen(name.c_str(), "rm");
      ASSERT_TRUE(TIFFSetDirectory(tiff, 1));
      uint32_t width = 0, height = 0;
      uint16_t bits = 0;
      char* text = nullptr;
      EXPECT_TRUE(TIFFGetField(tiff, TIFFTAG_IMAGEWIDTH, &width) &&
                  TIFFGetField(tiff, TIFFTAG_IMAGELENGTH, &height) &&
                  TIFFGetField(tiff, TIFFTAG_BITSPERSAMPLE, &bits) &&
                  TIFFGetField(tiff, TIFFTAG_SOFTWARE, &text));
      EXPECT_EQ(70000u, width);
      EXPECT_EQ(300u, height);
      EXPECT_EQ(8u, bits);
      EXPECT_STREQ("a longer text", text);
      TIFFClose(tiff);
    }
}

TEST_F(Parts, DirectoryTakesTheRoomReservedForItWhateverTheOrderOfItsEntries) {
  const auto software = drivers::TextEntry(TIFFTAG_SOFTWARE, "odd text, with its end");  // 23 bytes
  const auto bits = drivers::NumbersEntry(TIFFTAG_BITSPERSAMPLE, TIFF_SHORT, {8, 8, 8, 8, 8});
  const auto gap = drivers::TextEntry(TIFFTAG_ARTIST, "even, with its end...");  // 22 bytes
  for (const bool isBig : {false, true})
    for (const auto& entries :
         {std::vector{bits, gap, software}, std::vector{software, gap, bits}}) {
      const auto made = PositionedFile::Make(folder_.File("room"), {});
      PositionedFile& file = *made;
      Appender appender(file, isBig, {});
      appender.AppendDirectory(entries, 0);
      EXPECT_EQ(appender.End(), file.Size());
      EXPECT_EQ(0u, file.Size() % 2);
      file.Remove();
    }
}

TEST_F(Parts, AppenderStopsAtFourGiBOfAClassicFileOnly) {
  const std::string name = folder_.File("long.tif");
  const auto made = PositionedFile::Make(name, {});
  PositionedFile& file = *made;
  const uint64_t limit = uint64_t{1} << 32;
  const auto expectRefusal = [&](drivers::Appender& appender, size_t bytes) {
    const uint64_t size = file.Size();
    try {
      appender.Append(std::vector<uint8_t>(bytes));
      ADD_FAILURE() << "it went on with " << bytes;
    } catch (const Exception& refused) {
      EXPECT_EQ(0u, refused.GetMessage().find(name + ": would pass 4 GiB")) << refused.GetMessage();
    }
    EXPECT_EQ(size, file.Size());
  };
  file.Truncate(limit - 192);
  drivers::Appender classic(file, false, {});
  expectRefusal(classic, 128);  // behind the marker
  EXPECT_EQ(limit - 192 + drivers::kMarkerBytes, classic.Append(std::vector<uint8_t>(20)));
  expectRefusal(classic, 108);
  EXPECT_EQ(limit - 108, classic.Append(std::vector<uint8_t>(107)));  // up to the last byte
  EXPECT_EQ(limit - 1, file.Size());
  drivers::Appender another(file, false, {});
  expectRefusal(another, 1);
  drivers::Appender big(file, true, {});
  EXPECT_EQ(limit + drivers::kMarkerBytes, big.Append(std::vector<uint8_t>(100)));
}

TEST_F(Parts, EncoderNamesTheFileAndTheCodecsReason) {
  drivers::LevelCoding coding = drivers::PlainCoding(16, 16, 1, gobs::DataTypeOf<float>(), "");
  coding.format.tileWidth = coding.format.tileHeight = 16;
  coding.format.compression = COMPRESSION_JPEG;
  EXPECT_FALSE(drivers::TileEncoder::CanEncode(coding));
  try {
    drivers::TileEncoder(coding, "scene.tif").Encode(std::vector<uint8_t>(1024), 0);
    ADD_FAILURE() << "JPEG took floats";
  } catch (const Exception& refused) {
    EXPECT_EQ(0u, refused.GetMessage().find("scene.tif: a tile cannot be encoded: "))
        << refused.GetMessage();
  }
}

TEST_F(Parts, EncoderDecodesWhatItEncoded) {
  for (const uint16_t codec : {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE, COMPRESSION_LZW})
    for (const auto& [type, bits] : {std::pair{gobs::eDT_BIT, 1u},
                                     {gobs::eDT_8U, 8u},
                                     {gobs::DataTypeOf<uint16_t>(), 12u},
                                     {gobs::DataTypeOf<float>(), 32u}})
      for (const std::endian order : {std::endian::little, std::endian::big}) {
        drivers::LevelCoding coding = drivers::PlainCoding(48, 32, 1, type, "");
        coding.format.tileWidth = 48;
        coding.format.tileHeight = 32;
        coding.format.compression = codec;
        coding.format.bitsPerSample = bits;
        coding.byteOrder.order = order;
        const bool predicts = bits % 8 == 0 && codec != COMPRESSION_NONE;
        coding.predictor = predicts ? drivers::UsualPredictor(coding.format) : PREDICTOR_NONE;
        std::vector<uint8_t> samples(coding.TileBytes());
        const uint32_t bytes = coding.format.SampleBytes();
        for (size_t i = 0; i < samples.size(); ++i) {
          const bool isHigh = i % bytes == 1 && bits == 12;  // the upper part of 12 bits
          samples[i] = static_cast<uint8_t>((i * i / 7) & (bits == 1 ? 1 : isHigh ? 15 : 255));
        }
        const drivers::TileEncoder encoder(coding, "scene.tif");
        EXPECT_EQ(samples, encoder.Decode(encoder.Encode(samples, 0), 0))
            << codec << ", " << bits << " bits";
      }
}

TEST_F(Parts, LevelWithTooManyTilesIsRefusedBeforeAnythingIsReserved) {
  const auto image = drivers::PlainCoding(4294967295u, 4294967295u, 1, gobs::eDT_8U, "");
  EXPECT_NO_THROW(drivers::CodingOfLevel(image, 4000, "scene.tif"));
  try {
    drivers::CodingOfLevel(image, 2, "scene.tif");
    ADD_FAILURE() << "a level of 2^46 tiles was begun";
  } catch (const Exception& refused) {
    EXPECT_EQ("scene.tif: level 2 would have too many tiles.", refused.GetMessage());
  }
}

}  // namespace
}  // namespace orin::tests
