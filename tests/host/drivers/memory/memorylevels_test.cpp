// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memorylevels.h"

#include <gmock/gmock.h>

#include "host/services/exception.h"

namespace orin::drivers {
namespace {

using datasources::IRasterWriter;
using gobs::Raster;
using ::testing::ElementsAre;

/// Levels of an 11 x 6 raster with two byte channels and a float one.
std::shared_ptr<MemoryLevelTable> Table() {
  auto table = std::make_shared<MemoryLevelTable>();
  table->file = "mem:a";
  table->width = 11;
  table->height = 6;
  table->types = {gobs::eDT_8U, gobs::eDT_8U, gobs::DataTypeOf<float>()};
  return table;
}

void Fill(IRasterWriter& writer, unsigned x, unsigned width) {
  Raster block({width, writer.GetHeight(), writer.GetChannelCount(), writer.GetDataType()},
               {0, 0, x, 0});
  std::fill_n(block.data, block.byteSize, uint8_t{9});
  writer.Write(block);
}
void FillAll(IRasterWriter& writer) { Fill(writer, 0, writer.GetWidth()); }

template <class Work>
std::string MessageOf(Work work) {
  try {
    work();
  } catch (const Exception& e) {
    return e.GetMessage();
  }
  return "nothing was thrown";
}

TEST(MemoryLevels, ALevelHasTheImagesSizeDividedAndExistsForTheChannelsAsked) {
  MemoryLevels levels(Table(), true);
  levels.Create(4, {1, 2}, "MODE");
  levels.Create(2, {3}, "AVERAGE");
  const auto list = levels.List();
  ASSERT_EQ(2u, list.size());
  EXPECT_EQ(2u, list[0].level);
  EXPECT_EQ(5u, list[0].width);
  EXPECT_EQ(3u, list[0].height);
  EXPECT_EQ("AVERAGE", list[0].method);
  EXPECT_THAT(list[0].presentChannels, ElementsAre(false, false, true));
  EXPECT_EQ(2u, list[1].width);
  EXPECT_EQ(1u, list[1].height);
  EXPECT_THAT(list[1].presentChannels, ElementsAre(true, true, false));
  EXPECT_THAT(list[1].validChannels, ElementsAre(false, false, false));
  EXPECT_EQ("mem:a", list[1].file);
}

TEST(MemoryLevels, LevelsWithoutPixelsOrBelowTwoCannotBeMade) {
  MemoryLevels levels(Table(), true);
  EXPECT_EQ("mem:a: of 11 x 6 pixels, can have no level 7.",
            MessageOf([&] { levels.Create(7, {1}, ""); }));
  EXPECT_THROW(levels.Create(1, {1}, ""), Exception);
  EXPECT_THROW(levels.Create(0, {1}, ""), Exception);
  EXPECT_TRUE(levels.List().empty());
}

TEST(MemoryLevels, ChannelsOfDifferentTypesOrUnknownOnesAreRefused) {
  MemoryLevels levels(Table(), true);
  EXPECT_THROW(levels.Create(2, {1, 3}, ""), DataException);
  EXPECT_THROW(levels.Create(2, {4}, ""), DataException);
  EXPECT_THROW(levels.Create(2, {}, ""), DataException);
  EXPECT_TRUE(levels.List().empty());
}

TEST(MemoryLevels, ALevelIsMarkedValidOnlyWhenEveryPixelOfTheChannelWasWritten) {
  MemoryLevels levels(Table(), true);
  levels.Create(2, {1, 2}, "NEAREST");
  EXPECT_EQ("mem:a: level 2 of channel 1 is not complete.", MessageOf([&] {
              levels.SetValid(2, {1, 2}, true);
            }));
  Fill(*levels.OpenWriter(2, {1}), 0, 5);
  Fill(*levels.OpenWriter(2, {2}), 0, 4);
  EXPECT_NO_THROW(levels.SetValid(2, {1}, true));
  EXPECT_THROW(levels.SetValid(2, {1, 2}, true), Exception);
  EXPECT_THAT(levels.List()[0].validChannels, ElementsAre(true, false, false));
  Fill(*levels.OpenWriter(2, {2}), 4, 1);
  EXPECT_NO_THROW(levels.SetValid(2, {1, 2}, true));
}

TEST(MemoryLevels, TheFirstWriteOfARebuildClearsValidityAndAsksForAllPixelsAgain) {
  MemoryLevels levels(Table(), true);
  levels.Create(2, {1, 2}, "NEAREST");
  FillAll(*levels.OpenWriter(2, {1, 2}));
  levels.SetValid(2, {1, 2}, true);
  const auto writer = levels.OpenWriter(2, {1});
  EXPECT_THAT(levels.List()[0].validChannels, ElementsAre(true, true, false));
  Fill(*writer, 0, 2);
  EXPECT_THAT(levels.List()[0].validChannels, ElementsAre(false, true, false));
  EXPECT_THROW(levels.SetValid(2, {1}, true), Exception);
  Fill(*writer, 2, 3);
  EXPECT_NO_THROW(levels.SetValid(2, {1}, true));
}

TEST(MemoryLevels, MarkingNotValidKeepsThePixels) {
  MemoryLevels levels(Table(), true);
  levels.Create(2, {1}, "NEAREST");
  FillAll(*levels.OpenWriter(2, {1}));
  levels.SetValid(2, {1}, true);
  levels.SetValid(2, {1}, false);
  EXPECT_THAT(levels.List()[0].validChannels, ElementsAre(false, false, false));
  EXPECT_NO_THROW(levels.SetValid(2, {1}, true));
}

TEST(MemoryLevels, WhatDoesNotExistCannotBeOpenedOrMarked) {
  MemoryLevels levels(Table(), true);
  levels.Create(2, {1}, "NEAREST");
  EXPECT_EQ("mem:a: there is no level 3 of channel 1.",
            MessageOf([&] { levels.OpenWriter(3, {1}); }));
  EXPECT_THROW(levels.OpenWriter(2, {2}), Exception);
  EXPECT_THROW(levels.OpenWriter(2, {}), Exception);
  EXPECT_THROW(levels.SetValid(2, {1, 2}, false), Exception);
  EXPECT_THROW(levels.SetValid(3, {1}, false), Exception);
}

TEST(MemoryLevels, WithoutWriteAccessLevelsCanOnlyBeRead) {
  const auto table = Table();
  MemoryLevels(table, true).Create(2, {1}, "NEAREST");
  MemoryLevels levels(table, false);
  EXPECT_EQ("mem:a: is open for reading only.", MessageOf([&] { levels.Create(4, {1}, ""); }));
  EXPECT_THROW(levels.SetValid(2, {1}, false), Exception);
  const auto writer = levels.OpenWriter(2, {1});
  EXPECT_NO_THROW(writer->GetRaster(0));
  EXPECT_THROW(FillAll(*writer), Exception);
}

TEST(MemoryLevels, AWriterRefusesBlocksThatDoNotFit) {
  MemoryLevels levels(Table(), true);
  levels.Create(2, {1}, "NEAREST");
  const auto writer = levels.OpenWriter(2, {1});
  EXPECT_THROW(writer->Write(Raster({1, 1, 1, gobs::eDT_8U}, {0, 0, 5, 0})), DataException);
  EXPECT_THROW(writer->Write(Raster({1, 1, 2, gobs::eDT_8U}, {})), DataException);
  Raster block({6, 1, 1, gobs::eDT_8U}, {});
  EXPECT_THROW(writer->Read(block), DataException);
}

TEST(MemoryLevels, CreatingAgainKeepsPixelsAndAddsChannels) {
  const auto table = Table();
  MemoryLevels levels(table, true);
  levels.Create(2, {1}, "NEAREST");
  FillAll(*levels.OpenWriter(2, {1}));
  levels.SetValid(2, {1}, true);
  levels.Create(2, {1, 2}, "NEAREST");
  EXPECT_EQ(9, table->levels.at(2).channels[0].samples[14]);
  EXPECT_THAT(levels.List()[0].presentChannels, ElementsAre(true, true, false));
  EXPECT_THAT(levels.List()[0].validChannels, ElementsAre(true, false, false));
}

TEST(MemoryLevels, TheReadingSideOfAWriterDeliversItsLevelWithMargins) {
  MemoryLevels levels(Table(), true);
  levels.Create(2, {1}, "NEAREST");
  const auto writer = levels.OpenWriter(2, {1});
  FillAll(*writer);
  writer->SetMargin(1, 1, datasources::kMarginRepeatEdge);
  const auto block = writer->GetRaster(0);
  EXPECT_EQ(7u * 5, block->byteSize);
  EXPECT_EQ(9, block->data[0]);
  EXPECT_EQ(9, block->data[34]);
  EXPECT_EQ(2u, writer->GetLevel());
  EXPECT_EQ(256u, writer->GetTileWidth());
}

}  // namespace
}  // namespace orin::drivers
