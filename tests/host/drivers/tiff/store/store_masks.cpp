/// Masks that are stored with levels, and read with them.
// SPDX-License-Identifier: MIT
#include <filesystem>

#include "basic/gobs/mask/mask.h"
#include "host/datasources/genericlayer.h"
#include "host/drivers/tiff/tiffmask.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"
#include "tests/testing/fakeraster.h"

namespace orin::tests {
namespace {

const Layout kImage{.width = 200, .height = 160, .samples = 3, .tile = 32};

using IsValid = std::function<bool(uint32_t, uint32_t)>;

bool Checks(uint32_t x, uint32_t y) { return (x / 7 + y / 5) % 2 == 0; }
bool Columns(uint32_t x, uint32_t) { return x % 3 != 0; }
bool Corner(uint32_t x, uint32_t y) { return x > 60 && y > 40; }
bool AnyOfThem(uint32_t x, uint32_t y) { return Checks(x, y) || Columns(x, y) || Corner(x, y); }

/// Adds a mask of the image's size, all valid, as libtiff writes one.
void AddImageMask(const std::string& file, uint16_t bits) {
  TIFF* tiff = TIFFOpen(file.c_str(), "a");
  TIFFSetField(tiff, TIFFTAG_SUBFILETYPE, FILETYPE_MASK);
  TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, kImage.width);
  TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, kImage.height);
  TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, bits);
  TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, 1);
  TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_MASK);
  TIFFSetField(tiff, TIFFTAG_COMPRESSION, COMPRESSION_PACKBITS);
  TIFFSetField(tiff, TIFFTAG_ROWSPERSTRIP, 50);
  std::vector<uint8_t> row(kImage.width, 255);
  for (uint32_t y = 0; y < kImage.height; ++y) TIFFWriteScanline(tiff, row.data(), y);
  TIFFClose(tiff);
}

/// Writes level 2 of value 1 with that validity in blocks of that edge.
/// \param most  blocks that get a validity
void WriteLevel(IRasterDataset& dataset, const IsValid& isValid, unsigned edge,
                const std::vector<unsigned>& channels, unsigned most = 1000) {
  datasources::BasicOverviewWriterAccessor accessor(&dataset, channels);
  accessor.SetResamplingName("NEAREST");
  accessor.CreateLevel(2);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
  unsigned number = 0;
  for (uint32_t y = 0; y < writer->GetHeight(); y += edge)
    for (uint32_t x = 0; x < writer->GetWidth(); x += edge) {
      gobs::Raster block(
          {std::min(edge, writer->GetWidth() - x), std::min(edge, writer->GetHeight() - y),
           writer->GetChannelCount(), writer->GetDataType()},
          {0, 0, x, y});
      std::fill_n(block.data, block.byteSize, uint8_t{1});
      if (number++ < most) {
        block.validity = std::make_unique<gobs::Mask>(block.width, block.height, block.Window());
        for (uint32_t j = 0; j < block.height; ++j)
          for (uint32_t i = 0; i < block.width; ++i)
            block.validity->SetValid(i, j, isValid(x + i, y + j));
      }
      writer->Write(block);
    }
  accessor.SetLevelValid(2, true);
}

/// The first pixel of directory `index` that is not as it should be; empty when all are.
std::string WrongMask(const std::string& file, size_t index, const IsValid& isValid) {
  const Seen seen = DirectoriesOf(file).at(index);
  const auto mask = drivers::OpenTiffMask(file, seen.offset);
  std::vector<uint8_t> row(mask->Width());
  for (uint32_t y = 0; y < mask->Height(); ++y) {
    mask->Read(0, y, mask->Width(), 1, row.data());
    for (uint32_t x = 0; x < mask->Width(); ++x)
      if ((row[x] != 0) != isValid(x, y)) return std::to_string(x) + ", " + std::to_string(y);
  }
  return "";
}

/// Where the tiles of directory `index` stand.
std::vector<uint64_t> TilesOf(const std::string& file, uint16_t index) {
  TIFF* tiff = TIFFOpen(file.c_str(), "r");
  const std::unique_ptr<TIFF, void (*)(TIFF*)> closer(tiff, &TIFFClose);
  if (!tiff || !TIFFSetDirectory(tiff, index)) return {};
  std::vector<uint64_t> tiles;
  for (uint32_t i = 0; i < TIFFNumberOfTiles(tiff); ++i)
    tiles.push_back(TIFFGetStrileOffset(tiff, i));
  return tiles;
}

/// "0 4 1 5": the subfile types in the order of the chain.
std::string TypesOf(const std::string& file) {
  std::string types;
  for (const Seen& seen : DirectoriesOf(file))
    types += (types.empty() ? "" : " ") + std::to_string(seen.subfile);
  return types;
}

class StoredMasks : public TiffStore, public ::testing::WithParamInterface<const char*> {
 protected:
  StoredMasks() : file_(folder_.File("image.tif")) {
    Layout layout = kImage;
    layout.mode = GetParam();
    WriteImage(file_, layout);
    AddImageMask(file_, 1);
  }
  std::string file_;
};

INSTANTIATE_TEST_SUITE_P(Files, StoredMasks, ::testing::Values("w", "wb", "w8", "wb8"));

TEST_P(StoredMasks, AreGatheredFromBlocksThatCutTiles) {
  for (const unsigned edge : {100u, 32u, 37u, 7u}) {
    WriteLevel(*Open(file_, datasources::kUpdate), Checks, edge, {1, 2, 3});
    EXPECT_EQ("0 4 1 5", TypesOf(file_)) << edge;
    EXPECT_EQ("", WrongMask(file_, 3, Checks)) << edge;
    WriteLevel(*Open(file_, datasources::kUpdate), Columns, edge, {1, 2, 3});
    EXPECT_EQ("", WrongMask(file_, 3, Columns)) << edge;
  }
}

TEST_P(StoredMasks, OfALevelThatIsNotCompleteAreNotStored) {
  const auto before = BytesOf(file_);
  EXPECT_THROW(WriteLevel(*Open(file_, datasources::kUpdate), Checks, 37, {1, 2, 3}, 4), Exception);
  EXPECT_EQ(before, BytesOf(file_));
}

TEST_P(StoredMasks, AreReadWithTheBlocksOfTheirLevel) {
  WriteLevel(*Open(file_, datasources::kUpdate), Checks, 100, {1, 2, 3});
  const auto dataset = Open(file_, datasources::kReadOnly);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {2});
  const std::unique_ptr<IRasterWriter> level(accessor.CreateRasterWriter(2));
  gobs::Raster block({20, 10, 1, gobs::eDT_8U}, {3, 3, 0, 70});
  level->Read(block);
  ASSERT_NE(nullptr, block.validity);
  for (int y = -3; y < 13; ++y)
    for (int x = -3; x < 23; ++x)
      EXPECT_EQ(Checks(std::max(x, 0), std::min(70 + y, 79)), block.validity->IsValid(x, y))
          << x << ", " << y;
}

TEST_P(StoredMasks, BesideTheImageJoinTheChannelsOfOneRun) {
  const std::string sideCar = file_ + ".ovr";
  for (const unsigned edge : {100u, 37u}) {
    auto dataset = OpenGeneric(file_);
    WriteLevel(*dataset, Checks, edge, {2});
    WriteLevel(*dataset, Columns, edge, {1});
    WriteLevel(*dataset, Corner, edge, {3});
    EXPECT_EQ("1 4", TypesOf(sideCar));
    EXPECT_EQ("", WrongMask(sideCar, 1, AnyOfThem)) << edge;
    WriteLevel(*dataset, Columns, edge, {1});  // a channel again: another round
    EXPECT_EQ("", WrongMask(sideCar, 1, AnyOfThem)) << "it waits for the others";
    dataset.reset();
    EXPECT_EQ("", WrongMask(sideCar, 1, Columns));
    WriteLevel(*OpenGeneric(file_), Checks, edge, {3});
    EXPECT_EQ("", WrongMask(sideCar, 1, Checks));
    std::filesystem::remove(sideCar);
  }
}

TEST_P(StoredMasks, BesideTheImageAppearWithAllChannelsOfTheirLevel) {
  const std::string sideCar = file_ + ".ovr";
  const auto dataset = OpenGeneric(file_);
  WriteLevel(*dataset, Checks, 100, {1});
  WriteLevel(*dataset, Checks, 100, {2});
  EXPECT_FALSE(std::filesystem::exists(sideCar));
  EXPECT_EQ("11-", ValidityOf(LevelsOf(*dataset).at(0)));
  WriteLevel(*dataset, Checks, 100, {3});
  EXPECT_EQ("1 4", TypesOf(sideCar));
  EXPECT_EQ("111", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
  EXPECT_EQ("", WrongMask(sideCar, 1, Checks));
}

TEST_P(StoredMasks, OfFinishedChannelsStayWhenTheNextOneFails) {
  const std::string sideCar = file_ + ".ovr";
  {
    const auto dataset = OpenGeneric(file_);
    WriteLevel(*dataset, Corner, 37, {1});
    WriteLevel(*dataset, Columns, 37, {3});
    EXPECT_THROW(WriteLevel(*dataset, Checks, 37, {2}, 4), Exception);
  }
  EXPECT_EQ("101", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
  EXPECT_EQ("1 4", TypesOf(sideCar));
  EXPECT_EQ("", WrongMask(sideCar, 1,
                          [](uint32_t x, uint32_t y) { return Corner(x, y) || Columns(x, y); }));
}

TEST_P(StoredMasks, OfFinishedChannelsStandBesideTheImageWhenTheRunEnds) {
  WriteLevel(*OpenGeneric(file_), Checks, 100, {2});
  EXPECT_EQ("-1-", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
  EXPECT_EQ("", WrongMask(file_ + ".ovr", 1, Checks));
  {
    const auto dataset = OpenGeneric(file_);  // in the file they are joined as well
    WriteLevel(*dataset, Columns, 100, {1});
    WriteLevel(*dataset, Corner, 100, {3});
  }
  EXPECT_EQ("", WrongMask(file_ + ".ovr", 1,
                          [](uint32_t x, uint32_t y) { return Corner(x, y) || Columns(x, y); }));
}

TEST_P(StoredMasks, ThatStayTheSameKeepTheirTiles) {
  const std::string sideCar = file_ + ".ovr";
  WriteLevel(*OpenGeneric(file_), Checks, 100, {1});
  const std::ifstream reader(sideCar);  // while it is there, nothing moves
  const uint64_t first = DirectoriesOf(sideCar).at(1).offset;
  const auto tiles = TilesOf(sideCar, 1);
  ASSERT_FALSE(tiles.empty());
  WriteLevel(*OpenGeneric(file_), Checks, 100, {1});
  EXPECT_NE(first, DirectoriesOf(sideCar).at(1).offset);
  EXPECT_EQ(tiles, TilesOf(sideCar, 1));
  EXPECT_EQ("", WrongMask(sideCar, 1, Checks));
  const auto end = std::filesystem::file_size(sideCar);
  WriteLevel(*OpenGeneric(file_), Columns, 100, {1});
  for (const uint64_t tile : TilesOf(sideCar, 1)) EXPECT_GE(tile, end);
  EXPECT_EQ("", WrongMask(sideCar, 1, Columns));
}

TEST_F(TiffStore, AMaskOfEightBitsInTheImageCounts) {
  const std::string other = folder_.File("bytes.tif");
  WriteImage(other, kImage);
  AddImageMask(other, 8);
  const auto dataset = Open(other, datasources::kReadOnly);
  EXPECT_TRUE(dataset->GetSource()->HasMask());
  uint8_t byte = 0;
  dataset->GetSource()->OpenMask()->Read(199, 159, 1, 1, &byte);
  EXPECT_EQ(255, byte);
}

/// A driver whose one image of two channels is transparent everywhere.
class Transparent final : public datasources::IFormatDriver {
 public:
  std::vector<ZMBInfo_s> Formats() const override { return {}; }
  ZMBFormatType Identify(const std::string&) const override { return kFormatUnknown; }
  std::unique_ptr<datasources::IRasterSource> Open(const std::string&,
                                                   datasources::AccessMode) override {
    return std::make_unique<Image>();
  }

 private:
  class Image final : public datasources::IRasterSource {
   public:
    unsigned Width() const override { return 20; }
    unsigned Height() const override { return 10; }
    unsigned ChannelCount() const override { return 2; }
    gobs::DataType TypeOf(unsigned) const override { return gobs::eDT_8U; }
    datasources::AuxiliaryData MetadataOf(const std::vector<unsigned>&) const override {
      return {};
    }
    std::unique_ptr<datasources::IRasterReader> OpenReader(
        const std::vector<unsigned>& channels) override {
      auto pixels = std::make_unique<orin::testing::FakeRaster>();
      pixels->width = Width();
      pixels->height = Height();
      pixels->channels = static_cast<unsigned>(channels.size());
      return pixels;
    }
    unsigned AlphaChannel() const override { return 2; }
    datasources::ILevelStore* Levels() override { return nullptr; }
  };
};

TEST_F(TiffStore, AlphaOfAnyFormatIsReadWithItsBlocksAndNamedInItsSideCar) {
  const std::string file = folder_.File("image.png");
  Transparent driver;
  const auto source = datasources::OpenGeneric(driver, file);
  const auto reader = source->OpenReader({1});
  EXPECT_EQ("0", reader->GetAuxiliaryData().GetFileMetadataValue(datasources::kNoDataKey));
  gobs::Raster block({20, 10, 1, gobs::eDT_8U}, {1, 1, 0, 0});
  reader->Read(block);
  ASSERT_NE(nullptr, block.validity);
  EXPECT_EQ(false, block.validity->Uniform());
  gobs::Raster level({10, 5, 1, gobs::eDT_8U}, {});
  std::fill_n(level.data, level.byteSize, uint8_t{0});
  for (const unsigned channel : {1u, 2u}) {
    source->Levels()->Create(2, {channel}, "NEAREST");
    const auto writer = source->Levels()->OpenWriter(2, {channel});
    writer->Write(level);
    source->Levels()->SetValid(2, {channel}, true);
  }
  TIFF* tiff = TIFFOpen((file + ".ovr").c_str(), "r");
  ASSERT_NE(nullptr, tiff);
  uint16_t count = 0;
  uint16_t* meanings = nullptr;
  ASSERT_EQ(1, TIFFGetField(tiff, TIFFTAG_EXTRASAMPLES, &count, &meanings));
  ASSERT_EQ(1, count);
  EXPECT_EQ(EXTRASAMPLE_UNASSALPHA, meanings[0]);
  TIFFClose(tiff);
}

}  // namespace
}  // namespace orin::tests
