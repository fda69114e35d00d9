/// The block grid, the checks of a block, and the pixels outside the raster.
// SPDX-License-Identifier: MIT
#include "host/datasources/rasterreader.h"

#include <gmock/gmock.h>

#include <vector>

#include "host/services/exception.h"
#include "tests/testing/fakeraster.h"

namespace orin::datasources {
namespace {

using gobs::Raster;
using orin::testing::FakeRaster;
using ::testing::ElementsAre;

FakeRaster Raster10x7() {
  FakeRaster raster;
  raster.width = 10;
  raster.height = 7;
  raster.storedTileWidth = 4;
  raster.storedTileHeight = 3;
  return raster;
}

TEST(RasterReader, TheGridCountsCutTilesRowByRow) {
  FakeRaster raster = Raster10x7();
  EXPECT_EQ(9u, raster.GetTileCount());
  EXPECT_EQ(0u, raster.Begin());
  EXPECT_EQ(9u, raster.End());
  EXPECT_EQ(0u, raster.FindRaster(3, 2));
  EXPECT_EQ(1u, raster.FindRaster(4, 2));
  EXPECT_EQ(3u, raster.FindRaster(0, 3));
  EXPECT_EQ(8u, raster.FindRaster(9, 6));
}

TEST(RasterReader, ATileComesWithTheMarginsThatWereSetAndIsCutAtTheEdge) {
  FakeRaster raster = Raster10x7();
  raster.SetMargin(2, 1, kMarginRepeatEdge);
  const auto tile = raster.GetRaster(8);
  EXPECT_EQ((parallelio::ProcessWindow{2, 1, 8, 6}), tile->Window());
  EXPECT_EQ(2u, tile->width);
  EXPECT_EQ(1u, tile->height);
}

TEST(RasterReader, ATileOrPixelOutsideIsRefused) {
  FakeRaster raster = Raster10x7();
  EXPECT_THROW(raster.GetRaster(9), DataException);
  EXPECT_THROW(raster.FindRaster(10, 0), DataException);
  EXPECT_THROW(raster.FindRaster(0, 7), DataException);
}

TEST(RasterReader, TheGridCanBeSetAndTheStoredTilesComeBack) {
  FakeRaster raster = Raster10x7();
  raster.SetTileSize(10, 2);
  EXPECT_EQ(10u, raster.GetTileWidth());
  EXPECT_EQ(4u, raster.GetTileCount());
  raster.SetOptimalTileSize();
  EXPECT_EQ(4u, raster.GetTileWidth());
  EXPECT_EQ(3u, raster.GetTileHeight());
}

TEST(RasterReader, MarginsReadBackAsSet) {
  FakeRaster raster = Raster10x7();
  EXPECT_EQ(0u, raster.GetMarginX());
  EXPECT_EQ(0u, raster.GetMarginY());
  raster.SetMargin(3, 1, 2);
  EXPECT_EQ(3u, raster.GetMarginX());
  EXPECT_EQ(1u, raster.GetMarginY());
}

TEST(RequireFittingBlock, AcceptsUpToTheLastPixel) {
  const FakeRaster raster = Raster10x7();
  EXPECT_NO_THROW(RequireFittingBlock(Raster({10, 7, 1, gobs::eDT_8U}, {}), raster, "f"));
  EXPECT_NO_THROW(RequireFittingBlock(Raster({1, 1, 1, gobs::eDT_8U}, {3, 3, 9, 6}), raster, "f"));
}

std::string ComplaintOf(const Raster& block, const FakeRaster& raster) {
  try {
    RequireFittingBlock(block, raster, "f.tif");
  } catch (const DataException& e) {
    return e.GetMessage();
  }
  return "none";
}

TEST(RequireFittingBlock, RefusesOtherTypesBeforeOtherPlaces) {
  const FakeRaster raster = Raster10x7();
  const char* const kType = "f.tif: a block of another pixel type or channel count was asked for.";
  const char* const kPlace = "f.tif: a block outside the raster was asked for.";
  EXPECT_EQ(kType, ComplaintOf(Raster({1, 1, 2, gobs::eDT_8U}, {0, 0, 99, 99}), raster));
  EXPECT_EQ(kType, ComplaintOf(Raster({1, 1, 1, gobs::DataTypeOf<signed char>()}, {}), raster));
  EXPECT_EQ(kPlace, ComplaintOf(Raster({2, 1, 1, gobs::eDT_8U}, {0, 0, 9, 0}), raster));
  EXPECT_EQ(kPlace, ComplaintOf(Raster({1, 2, 1, gobs::eDT_8U}, {0, 0, 0, 6}), raster));
  EXPECT_EQ(kPlace, ComplaintOf(Raster({2, 1, 1, gobs::eDT_8U}, {0, 0, 4294967295u, 0}), raster));
}

TEST(InsideOf, IsThePartOfTheBufferThatTheRasterCovers) {
  const InsideWindow corner = InsideOf(Raster({4, 4, 1, gobs::eDT_8U}, {2, 1, 0, 0}), 10, 7);
  EXPECT_EQ(0, corner.x);
  EXPECT_EQ(0, corner.y);
  EXPECT_EQ(6, corner.width);
  EXPECT_EQ(5, corner.height);
  const InsideWindow middle = InsideOf(Raster({2, 2, 1, gobs::eDT_8U}, {2, 1, 4, 3}), 10, 7);
  EXPECT_EQ(2, middle.x);
  EXPECT_EQ(2, middle.y);
  EXPECT_EQ(6, middle.width);
  EXPECT_EQ(4, middle.height);
  const InsideWindow outside = InsideOf(Raster({1, 1, 1, gobs::eDT_8U}, {0, 0, 20, 3}), 10, 7);
  EXPECT_LE(outside.width, 0);
}

/// Buffer lines of a one-channel byte block.
std::vector<std::vector<int>> LinesOf(const Raster& block) {
  std::vector<std::vector<int>> lines;
  for (unsigned y = 0; y < block.bufferLines; ++y)
    lines.emplace_back(block.data + y * block.stride, block.data + (y + 1) * block.stride);
  return lines;
}

TEST(RepeatEdges, FillsMarginsOutsideTheRasterFromItsEdgePixels) {
  Raster block({2, 2, 1, gobs::eDT_8U}, {2, 1, 0, 0});
  const uint8_t pixels[] = {0, 0, 0, 0, 0, 0,  //
                            0, 0, 1, 2, 0, 0,  //
                            0, 0, 3, 4, 0, 0,  //
                            0, 0, 0, 0, 0, 0};
  std::copy_n(pixels, sizeof pixels, block.data);
  RepeatEdges(block, InsideOf(block, 2, 2));
  EXPECT_THAT(LinesOf(block),
              ElementsAre(ElementsAre(1, 1, 1, 2, 2, 2), ElementsAre(1, 1, 1, 2, 2, 2),
                          ElementsAre(3, 3, 3, 4, 4, 4), ElementsAre(3, 3, 3, 4, 4, 4)));
}

TEST(RepeatEdges, LeavesRealNeighboursAlone) {
  Raster block({1, 1, 1, gobs::eDT_8U}, {1, 1, 1, 0});
  const uint8_t pixels[] = {0, 0, 0,  //
                            5, 6, 7,  //
                            8, 9, 4};
  std::copy_n(pixels, sizeof pixels, block.data);
  RepeatEdges(block, InsideOf(block, 3, 2));
  EXPECT_THAT(LinesOf(block),
              ElementsAre(ElementsAre(5, 6, 7), ElementsAre(5, 6, 7), ElementsAre(8, 9, 4)));
}

TEST(RepeatEdges, MovesWholePixelsOfAllChannelsAndComponents) {
  Raster block({1, 1, 2, gobs::DataTypeOf<short>(true)}, {1, 0, 0, 0});
  auto* values = reinterpret_cast<short*>(block.data);
  for (short i = 0; i < 12; ++i) values[i] = i;
  RepeatEdges(block, InsideOf(block, 1, 1));
  EXPECT_THAT(std::vector<short>(values, values + 12),
              ElementsAre(4, 5, 6, 7, 4, 5, 6, 7, 4, 5, 6, 7));
}

}  // namespace
}  // namespace orin::datasources
