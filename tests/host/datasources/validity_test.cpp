// SPDX-License-Identifier: MIT
#include "host/datasources/validity.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstring>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "basic/gobs/mask/mask.h"
#include "host/datasources/validityreader.h"
#include "tests/testing/fakeraster.h"

namespace {

using namespace orin::datasources;
using orin::gobs::Raster;
using ::testing::ElementsAre;
using Picture = std::vector<std::string>;

/// A validity drawn in rows of text: '.' is no data.
class Drawn final : public IValidityReader {
 public:
  explicit Drawn(Picture rows) : rows_(std::move(rows)) {}
  uint32_t Width() const override { return static_cast<uint32_t>(rows_.front().size()); }
  uint32_t Height() const override { return static_cast<uint32_t>(rows_.size()); }
  void Read(uint32_t x, uint32_t y, uint32_t width, uint32_t height, uint8_t* bytes) override {
    for (uint32_t row = y; row < y + height; ++row)
      for (uint32_t column = x; column < x + width; ++column)
        *bytes++ = rows_.at(row).at(column) == '.' ? 0 : 255;
  }

 private:
  Picture rows_;
};

std::unique_ptr<IValidityReader> Draw(Picture rows) {
  return std::make_unique<Drawn>(std::move(rows));
}

/// The block's validity with its margins.
Picture PictureOf(const Raster& block) {
  Picture picture;
  for (int64_t y = -int64_t{block.marginY}; y < int64_t{block.height} + block.marginY; ++y) {
    picture.emplace_back();
    for (int64_t x = -int64_t{block.marginX}; x < int64_t{block.width} + block.marginX; ++x)
      picture.back() += block.validity->IsValid(x, y) ? '#' : '.';
  }
  return picture;
}

Picture PictureOf(IValidityReader& reader) {
  Picture picture;
  std::vector<uint8_t> row(reader.Width());
  for (uint32_t y = 0; y < reader.Height(); ++y) {
    reader.Read(0, y, reader.Width(), 1, row.data());
    picture.emplace_back();
    for (const uint8_t byte : row) picture.back() += byte ? '#' : '.';
  }
  return picture;
}

TEST(Validity, MarginsHoldTheNeighboursAndBeyondTheRasterItsEdge) {
  Drawn raster({"#.##",  //
                "##.#",  //
                ".###"});
  Raster block({2, 2, 1, orin::gobs::eDT_8U}, {2, 2, 1, 0});
  AddValidity(raster, block);
  EXPECT_THAT(PictureOf(block), ElementsAre("##.###",  //
                                            "##.###",  //
                                            "##.###",  //
                                            "###.##",  //
                                            "..####",  //
                                            "..####"));
}

TEST(Validity, IsWhatAllOfSeveralSay) {
  Raster block({3, 1, 1, orin::gobs::eDT_8U}, {});
  Drawn one({"#.#"}), two({"##."});
  AddValidity(one, block);
  AddValidity(two, block);
  EXPECT_THAT(PictureOf(block), ElementsAre("#.."));
  ValidityReaders readers;
  readers.push_back(nullptr);
  readers.push_back(Draw({"#.#"}));
  readers.push_back(Draw({"##."}));
  EXPECT_THAT(PictureOf(*AllOf(std::move(readers))), ElementsAre("#.."));
  EXPECT_EQ(nullptr, AllOf({}));
}

TEST(Validity, OfALevelWithoutAMaskIsThatOfTheImageAtThePixelsCentre) {
  const auto level = CentresOf(Draw({"#######",  //
                                     "#.##.##",  //
                                     "#######",  //
                                     "###.#.#",  //
                                     "......."}),
                               2, 3, 2);
  EXPECT_THAT(PictureOf(*level), ElementsAre(".##",  //
                                             "#.."));
}

/// A block whose second channel is `alpha`.
template <class T>
Raster* FillAlpha(Raster& block, const std::vector<T>& alpha) {
  T* sample = reinterpret_cast<T*>(block.data);
  for (const T value : alpha) {
    *sample++ = T{0};
    *sample++ = value;
  }
  return &block;
}

TEST(Validity, AlphaOfZeroIsNoDataInEveryType) {
  Raster bytes({4, 1, 2, orin::gobs::DataTypeOf<uint8_t>()}, {});
  AddOpacity(1, *FillAlpha<uint8_t>(bytes, {0, 1, 128, 255}));
  EXPECT_THAT(PictureOf(bytes), ElementsAre(".###"));
  Raster words({4, 1, 2, orin::gobs::DataTypeOf<uint16_t>()}, {});
  AddOpacity(1, *FillAlpha<uint16_t>(words, {256, 0, 1, 65535}));
  EXPECT_THAT(PictureOf(words), ElementsAre("#.##"));
  Raster floats({4, 1, 2, orin::gobs::DataTypeOf<float>()}, {});
  AddOpacity(1, *FillAlpha<float>(floats, {-0.0f, 0.0f, 1e-30f, 1.0f}));
  EXPECT_THAT(PictureOf(floats), ElementsAre("..##"));
}

std::unique_ptr<IRasterReader> PixelsDeclaring(const std::string& noData, unsigned channels) {
  auto raster = std::make_unique<orin::testing::FakeRaster>();
  raster->channels = channels;
  AuxiliaryData::Items items;
  if (!noData.empty()) items[kNoDataKey] = noData;
  raster->metadata = AuxiliaryData(items, std::vector<AuxiliaryData::Items>(channels));
  return raster;
}

TEST(Validity, AReaderWithAMaskDeclaresAFillWhereItsFileDeclaresNothing) {
  const auto undeclared = WithValidity(PixelsDeclaring("", 3), {Draw({"#"}), 0, {}});
  EXPECT_EQ("0", undeclared->GetAuxiliaryData().GetFileMetadataValue(kNoDataKey));
  EXPECT_TRUE(undeclared->GetAuxiliaryData().Facts().noDataIsFill);
  const auto declared = WithValidity(PixelsDeclaring("9", 3), {Draw({"#"}), 0, {}});
  EXPECT_EQ("9", declared->GetAuxiliaryData().GetFileMetadataValue(kNoDataKey));
  EXPECT_FALSE(declared->GetAuxiliaryData().Facts().noDataIsFill);
}

TEST(Validity, AReaderWithNeitherMaskNorAlphaStaysWhatItIs) {
  auto pixels = PixelsDeclaring("", 3);
  const IRasterReader* const before = pixels.get();
  EXPECT_EQ(before, WithValidity(std::move(pixels), {}).get());
}

}  // namespace
