/// Where levels stand in the chain of directories, and which directories count as levels.
// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <sys/stat.h>

#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

const Layout kImage{.width = 401, .height = 301, .tile = 64};

/// Adds a directory with libtiff, as other programs do.
void AddDirectory(const std::string& file, const Layout& layout, uint32_t subfile,
                  const char* metadata = nullptr) {
  Layout added = layout;
  added.mode = "a";
  TIFF* tiff = TIFFOpen(file.c_str(), "a");
  SetTags(tiff, added);
  TIFFSetField(tiff, TIFFTAG_SUBFILETYPE, subfile);
  if (metadata) {
    static const TIFFFieldInfo kMetadata{42112,        -1, -1, TIFF_ASCII,
                                         FIELD_CUSTOM, 1,  0,  const_cast<char*>("metadata")};
    TIFFMergeFieldInfo(tiff, &kMetadata, 1);
    TIFFSetField(tiff, 42112, metadata);
  }
  uint32_t index = 0;
  for (uint32_t plane = 0; plane < (layout.planar ? layout.samples : 1u); ++plane)
    for (uint32_t top = 0; top < layout.height; top += layout.tile)
      for (uint32_t left = 0; left < layout.width; left += layout.tile, ++index) {
        auto bytes = TileBytes(layout, left, top, layout.tile, plane);
        ASSERT_LT(0, TIFFWriteEncodedTile(tiff, index, bytes.data(), tmsize_t(bytes.size())));
      }
  TIFFClose(tiff);
}

Layout Sized(uint32_t width, uint32_t height) {
  Layout layout = kImage;
  layout.width = width;
  layout.height = height;
  return layout;
}

std::vector<uint32_t> SubfilesOf(const std::string& file) {
  std::vector<uint32_t> subfiles;
  for (const Seen& seen : DirectoriesOf(file)) subfiles.push_back(seen.subfile);
  return subfiles;
}

class Chain : public TiffStore {
 protected:
  Chain() : file_(folder_.File("image.tif")) { WriteImage(file_, kImage); }
  std::string file_;
};

TEST_F(Chain, StandsLargestFirstWhateverWasBuiltFirst) {
  std::vector<unsigned> order = {2, 3, 4, 8};
  do {
    const std::string file = folder_.File("order.tif");
    WriteImage(file, kImage);
    for (const unsigned level : order) Build(file, kImage, {.level = level});
    EXPECT_EQ("401x301 200x150 133x100 100x75 50x37", SizesOf(file));
    EXPECT_EQ((std::vector<unsigned>{2, 3, 4, 8}), FactorsOf(file));
    for (uint16_t i = 0; i < 4; ++i)
      EXPECT_EQ("", WrongTile(file, uint16_t(i + 1),
                              LevelLayout(kImage, std::vector<unsigned>{2, 3, 4, 8}[i])));
  } while (std::next_permutation(order.begin(), order.end()));
}

TEST_F(Chain, HasLevelsBehindTheLastPageWhoseNumberStays) {
  AddDirectory(file_, Sized(401, 301), FILETYPE_MASK);
  AddDirectory(file_, Sized(120, 90), FILETYPE_PAGE);
  AddDirectory(file_, Sized(60, 45), FILETYPE_REDUCEDIMAGE);  // of the page
  Build(file_, kImage, {.level = 4});
  Build(file_, kImage, {.level = 2});
  EXPECT_EQ("401x301 401x301 120x90 200x150 100x75 60x45", SizesOf(file_));
  EXPECT_EQ((std::vector<uint32_t>{0, FILETYPE_MASK, FILETYPE_PAGE, 1, 1, 1}), SubfilesOf(file_));
  EXPECT_EQ((std::vector<unsigned>{2, 4}), FactorsOf(file_));
}

TEST_F(Chain, ListsLevelsOfOtherProgramsByTheirFactor) {
  AddDirectory(file_, Sized(201, 151), FILETYPE_REDUCEDIMAGE,
               "<GDALMetadata><Item name=\"RESAMPLING\" sample=\"0\">X</Item>"
               "<Item name=\"RESAMPLING\">CUBIC</Item></GDALMetadata>");
  AddDirectory(file_, Sized(134, 101), FILETYPE_REDUCEDIMAGE);
  AddDirectory(file_, Sized(100, 75), FILETYPE_REDUCEDIMAGE);
  AddDirectory(file_, Sized(100, 10), FILETYPE_REDUCEDIMAGE);  // no factor fits both axes
  AddDirectory(file_, Sized(50, 37), FILETYPE_REDUCEDIMAGE | FILETYPE_MASK);  // a mask's level
  Layout twoSamples = Sized(25, 18);
  twoSamples.samples = 2;
  AddDirectory(file_, twoSamples, FILETYPE_REDUCEDIMAGE);
  Layout otherType = Sized(25, 18);
  otherType.bits = 16;
  AddDirectory(file_, otherType, FILETYPE_REDUCEDIMAGE);

  const auto levels = LevelsOf(file_);
  EXPECT_EQ((std::vector<unsigned>{2, 3, 4}), FactorsOf(file_));
  EXPECT_EQ("CUBIC", levels[0].method);
  EXPECT_EQ("", levels[1].method);
  EXPECT_EQ("", levels[0].program);
  EXPECT_EQ(201u, levels[0].width);
  for (const auto& level : levels) EXPECT_EQ("1", ValidityOf(level));
}

TEST_F(Chain, ReplacesAnotherProgramsLevelInItsPlaceWhenTheNewOneIsComplete) {
  AddDirectory(file_, Sized(201, 151), FILETYPE_REDUCEDIMAGE);
  AddDirectory(file_, Sized(101, 76), FILETYPE_REDUCEDIMAGE);
  Build(file_, kImage, {.level = 2, .goesOn = [&](unsigned) {
                          EXPECT_EQ("401x301 201x151 101x76", SizesOf(file_));
                          return true;
                        }});
  EXPECT_EQ("401x301 200x150 101x76", SizesOf(file_));
  Build(file_, kImage, {.level = 4});
  EXPECT_EQ("401x301 200x150 100x75", SizesOf(file_));
  EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
  EXPECT_EQ("", WrongTile(file_, 2, LevelLayout(kImage, 4)));
}

TEST_F(Chain, KeepsAnotherProgramsLevelWhenTheNewOneIsGivenUp) {
  AddDirectory(file_, Sized(201, 151), FILETYPE_REDUCEDIMAGE);
  const auto before = BytesOf(file_);
  Build(file_, kImage,
        {.level = 2, .edge = 64, .goesOn = [](unsigned n) { return n < 3; }, .marksValid = false});
  EXPECT_EQ(before, BytesOf(file_));
  EXPECT_EQ("1", ValidityOf(LevelsOf(file_).at(0)));
}

TEST_F(Chain, NeverWritesAnotherProgramsLevelThatWasNotCreatedAnew) {
  AddDirectory(file_, Sized(201, 151), FILETYPE_REDUCEDIMAGE);
  const auto before = BytesOf(file_);
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1});
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
  gobs::Raster block({10, 10, 1, gobs::eDT_8U}, {});
  EXPECT_THROW(writer->Write(block), Exception);
  EXPECT_THROW(accessor.SetLevelValid(2, false), Exception);
  EXPECT_EQ(before, BytesOf(file_));
}

TEST_F(Chain, RebuildByAnotherMethodTakesThePlaceOfTheOldDirectory) {
  Build(file_, kImage, {.level = 2});
  Build(file_, kImage, {.level = 4});
  const auto before = DirectoriesOf(file_);
  const std::ifstream reader(file_);  // so that it stays where it was built
  Build(file_, kImage, {.level = 2, .method = "AVERAGE"});
  EXPECT_EQ("401x301 200x150 100x75", SizesOf(file_));
  EXPECT_NE(before[1].offset, DirectoriesOf(file_)[1].offset);
  EXPECT_EQ("AVERAGE", LevelsOf(file_).at(0).method);
  EXPECT_EQ("1", ValidityOf(LevelsOf(file_).at(0)));
}

TEST_F(Chain, RepairsADanglingLinkWithTheNextLevel) {
  std::fstream stream(file_, std::ios::in | std::ios::out | std::ios::binary);
  stream.seekp(std::streamoff(LinkOfFirst(file_)));
  stream.write("\xF0\xFF\xFF\x7F", 4);
  stream.close();
  Build(file_, kImage, {.level = 4});
  Build(file_, kImage, {.level = 2});
  EXPECT_EQ("401x301 200x150 100x75", SizesOf(file_));
}

TEST_F(Chain, ThatRunsInACircleEndsWhereItStarts) {
  Build(file_, kImage, {.level = 4});
  const size_t first = DirectoriesOf(file_)[0].offset;
  const auto bytes = BytesOf(file_);
  const size_t second = DirectoriesOf(file_)[1].offset;
  const size_t link = second + 2 + 12 * size_t(uint8_t(bytes[second]));
  std::fstream stream(file_, std::ios::in | std::ios::out | std::ios::binary);
  stream.seekp(std::streamoff(link));
  const uint32_t back = uint32_t(first);
  stream.write(reinterpret_cast<const char*>(&back), 4);
  stream.close();
  EXPECT_EQ((std::vector<unsigned>{4}), FactorsOf(file_));
  Build(file_, kImage, {.level = 8});
  EXPECT_EQ("401x301 100x75 50x37", SizesOf(file_));
}

TEST_F(Chain, OfACloudOptimizedFileIsDeclaredEdited) {
  const std::string ghost =
      "GDAL_STRUCTURAL_METADATA_SIZE=000140 bytes\nLAYOUT=IFDS_BEFORE_DATA\n"
      "BLOCK_ORDER=ROW_MAJOR\nKNOWN_INCOMPATIBLE_EDITION=NO\n ";
  auto bytes = BytesOf(file_);
  // The ghost text goes behind the header over the first tile's first bytes; only its text matters
  // here.
  std::copy(ghost.begin(), ghost.end(), bytes.begin() + 8);
  std::ofstream(file_, std::ios::binary).write(bytes.data(), std::streamsize(bytes.size()));
  Build(file_, kImage,
        {.level = 2, .goesOn = [&](unsigned) {
           const auto now = BytesOf(file_);
           EXPECT_EQ(ghost, std::string(now.begin() + 8, now.begin() + 8 + long(ghost.size())));
           return true;
         }});
  const auto now = BytesOf(file_);
  const std::string text(now.begin() + 8, now.begin() + 8 + long(ghost.size()));
  EXPECT_NE(text.npos, text.find("KNOWN_INCOMPATIBLE_EDITION=YES\n")) << text;
}

TEST_F(Chain, IsUntouchedByOpeningForUpdateAndListing) {
  Build(file_, kImage, {.level = 2});
  const auto before = BytesWithoutRecords(file_);
  const timespec longAgo[2] = {{1000, 5}, {1000, 5}};
  ASSERT_EQ(0, utimensat(AT_FDCWD, file_.c_str(), longAgo, 0));
  {
    const auto dataset = Open(file_, datasources::kUpdate);
    EXPECT_EQ(1u, LevelsOf(*dataset).size());
    datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1});
    accessor.SetResamplingName("MODE");
    accessor.CreateLevel(2);
    accessor.CreateLevel(8);
    EXPECT_EQ((std::vector<unsigned>{2, 8}), accessor.GetLevels());
  }
  struct stat status;
  ASSERT_EQ(0, stat(file_.c_str(), &status));
  EXPECT_EQ(1000, status.st_mtim.tv_sec);
  EXPECT_EQ(5, status.st_mtim.tv_nsec);
  EXPECT_EQ(before, BytesWithoutRecords(file_));
}

}  // namespace
}  // namespace orin::tests
