/// Which channels of a level are there and up to date, and when that changes.
// SPDX-License-Identifier: MIT
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

const Layout kImage{
    .width = 200, .height = 160, .samples = 3, .tile = 32, .photometric = PHOTOMETRIC_RGB};

class Validity : public TiffStore {
 protected:
  Validity() : file_(folder_.File("image.tif")) { WriteImage(file_, kImage); }
  std::string Valid() const { return ValidityOf(LevelsOf(file_).at(0)); }
  std::string file_;
};

TEST_F(Validity, IsInTheMetadataThatOtherProgramsRead) {
  Build(file_, kImage, {.level = 2, .method = "BICUBIC"});
  const std::string text = DirectoriesOf(file_).at(1).metadata;
  for (const char* item : {">BICUBIC<", "name=\"RESAMPLING\"", "name=\"ORIN_FACTOR\"", ">2<",
                           "name=\"ORIN_SOURCE_LEVEL\"", ">1<", "name=\"ORIN_PROGRAM\"",
                           ">Orin Overviews ", "name=\"ORIN_VALID\"", ">111<"})
    EXPECT_NE(text.npos, text.find(item)) << item << " in " << text;
}

TEST_F(Validity, OfALevelIsDescribedWithAllThatIsKnown) {
  Build(file_, kImage, {.level = 2, .method = "MODE"});
  const LevelDescription level = LevelsOf(file_).at(0);
  EXPECT_EQ(2u, level.level);
  EXPECT_EQ(100u, level.width);
  EXPECT_EQ(80u, level.height);
  EXPECT_EQ(datasources::LevelPlace::kInternal, level.place);
  EXPECT_EQ(file_, level.file);
  EXPECT_EQ("MODE", level.method);
  EXPECT_EQ(1u, level.sourceLevel);
  EXPECT_TRUE(level.program.starts_with("Orin Overviews "));
  EXPECT_EQ("111", ValidityOf(level));
}

TEST_F(Validity, NamesTheLevelThatWasReadAsTheSource) {
  Build(file_, kImage, {.level = 2});
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.CreateLevel(4);
  const std::unique_ptr<IRasterWriter> target(accessor.CreateRasterWriter(4));
  const std::unique_ptr<IRasterWriter> source(accessor.CreateRasterWriter(2));
  source->GetRaster(0);
  WriteBlocks(*target, LevelLayout(kImage, 4), 50);
  accessor.SetLevelValid(4, true);
  EXPECT_EQ(2u, LevelsOf(*dataset).at(1).sourceLevel);
}

TEST_F(Validity, IsClearedByTheFirstBlockOfARebuildNotBefore) {
  Build(file_, kImage, {.level = 2});
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.SetResamplingName("NEAREST");
  accessor.CreateLevel(2);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
  EXPECT_EQ("111", Valid());
  unsigned blocks = 0;
  WriteBlocks(*writer, LevelLayout(kImage, 2), 40, [&](unsigned block) {
    EXPECT_EQ(block == 0 ? "111" : "000", Valid());
    return ++blocks > 0;
  });
  EXPECT_LT(1u, blocks);
  EXPECT_EQ("000", Valid());
  accessor.SetLevelValid(2, true);
  EXPECT_EQ("111", Valid());
}

TEST_F(Validity, OfARebuildIsWholeAgainAndTheFileIsAsLongAsBefore) {
  Build(file_, kImage, {.level = 2});
  const auto size = BytesOf(file_).size();
  for (const unsigned edge : {31u, 100u, 32u}) {
    Build(file_, kImage, {.level = 2, .edge = edge});
    EXPECT_EQ(size, BytesOf(file_).size()) << edge;
    EXPECT_EQ("111", Valid()) << edge;
    EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2))) << edge;
  }
}

TEST_F(Validity, OfChannelsThatShareTheRebuiltOnesTilesStandsOverAWholeTileTable) {
  Build(file_, kImage, {.level = 2});
  const auto before = DirectoriesOf(file_);
  const auto table = BytesOf(file_);
  const std::ifstream reader(file_);  // while it is there, what it may have read stays
  Build(file_, kImage, {.level = 2, .channels = {1}});
  const auto after = DirectoriesOf(file_);
  EXPECT_NE(before.at(1).offset, after.at(1).offset);  // linked in by one write
  EXPECT_EQ("111", Valid());
  EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
  const auto now = BytesOf(file_);
  const auto end = static_cast<ptrdiff_t>(table.size());
  const auto first = static_cast<ptrdiff_t>(before.at(1).offset);
  unsigned changed = 0;  // of the old directory: one character, for the channel
  for (ptrdiff_t at = first; at < end; ++at) changed += table.at(at) != now.at(at);
  EXPECT_EQ(1u, changed);
}

TEST_F(Validity, OfAChannelThatIsNamedTwiceIsNotAnotherChannels) {
  Layout pair = kImage;
  pair.samples = 2;
  pair.photometric = PHOTOMETRIC_MINISBLACK;
  WriteImage(file_, pair);
  Build(file_, pair, {.level = 2, .channels = {1, 1}});
  EXPECT_EQ("1-", Valid());
  const auto dataset = Open(file_, datasources::kReadOnly);
  datasources::BasicOverviewWriterAccessor second(dataset.get(), {2});
  const std::unique_ptr<IRasterWriter> reader(second.CreateRasterWriter(2));
  gobs::Raster block({100, 80, 1, gobs::eDT_8U}, {});
  reader->Read(block);
  EXPECT_EQ(100 * 80, std::count(block.data, block.data + block.byteSize, 0));
}

TEST_F(Validity, IsSwitchedInPlace) {
  Build(file_, kImage, {.level = 2});
  const auto size = BytesOf(file_).size();
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.SetValid(2, 2, false);
  EXPECT_EQ("101", Valid());
  accessor.SetLevelValid(2, false);
  EXPECT_EQ("000", Valid());
  accessor.SetValid(3, 2, true);
  EXPECT_EQ("001", Valid());
  EXPECT_EQ(size, BytesOf(file_).size());
}

TEST_F(Validity, IsRefusedToALevelWithMissingTiles) {
  const auto before = BytesOf(file_);
  {
    const auto dataset = Open(file_, datasources::kUpdate);
    datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
    accessor.CreateLevel(2);
    EXPECT_THROW(accessor.SetLevelValid(2, true), Exception);
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
    EXPECT_THROW(accessor.SetLevelValid(2, true), Exception);
    WriteBlocks(*writer, LevelLayout(kImage, 2), 32, [](unsigned block) { return block < 11; });
    try {
      accessor.SetLevelValid(2, true);
      ADD_FAILURE() << "an incomplete level was marked valid";
    } catch (const Exception& refused) {
      EXPECT_EQ(file_ + ": level 2 is not complete and cannot be marked valid.",
                refused.GetMessage());
    }
  }
  EXPECT_EQ(before, BytesOf(file_));
}

TEST_F(Validity, NeedsATileThatIsWrittenAgainToBeCompleteAgain) {
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.CreateLevel(2);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
  WriteBlocks(*writer, LevelLayout(kImage, 2), 32);
  WriteBlocks(*writer, LevelLayout(kImage, 2), 10, [](unsigned block) { return block < 1; });
  EXPECT_THROW(accessor.SetLevelValid(2, true), Exception);
  WriteBlocks(*writer, LevelLayout(kImage, 2), 20);  // covers the first 10 x 10 pixels twice
  accessor.SetLevelValid(2, true);
  EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
}

TEST_F(Validity, OfACreatedLevelIsListedBeforeItIsInTheFile) {
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 3});
  accessor.SetResamplingName("MODE");
  accessor.CreateLevel(2);
  const auto levels = LevelsOf(*dataset);
  ASSERT_EQ(1u, levels.size());
  EXPECT_EQ("0-0", ValidityOf(levels[0]));
  EXPECT_EQ("MODE", levels[0].method);
  EXPECT_EQ(100u, levels[0].width);
  EXPECT_EQ("200x160", SizesOf(file_));
}

TEST_F(Validity, OfALevelWithoutPixelsOrInAReadOnlyFileCannotBe) {
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1});
  EXPECT_NO_THROW(accessor.CreateLevel(160));
  EXPECT_THROW(accessor.CreateLevel(161), Exception);
  EXPECT_THROW(accessor.CreateLevel(0), Exception);
  EXPECT_THROW(delete accessor.CreateRasterWriter(7), Exception);
  EXPECT_THROW(accessor.SetLevelValid(7, true), Exception);
  const auto readOnly = Open(file_, datasources::kReadOnly);
  datasources::BasicOverviewWriterAccessor refused(readOnly.get(), {1});
  EXPECT_THROW(refused.CreateLevel(2), Exception);
}

TEST_F(Validity, OfAFinishedLevelIsSeenByReadersOpenedAfterIt) {
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.CreateLevel(2);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
  gobs::Raster block({4, 1, 3, gobs::eDT_8U}, {});
  EXPECT_THROW(writer->Read(block), Exception);
  WriteBlocks(*writer, LevelLayout(kImage, 2), 64);
  accessor.SetLevelValid(2, true);
  writer->Read(block);
  EXPECT_EQ(SampleAt(kImage, 3, 0, 1).at(0), block.data[3 * 3 + 1]);
}

}  // namespace
}  // namespace orin::tests
