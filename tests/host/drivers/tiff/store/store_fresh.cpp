/// Levels that know whether they match their image.
// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <sys/stat.h>

#include "host/datasources/basicreader.h"
#include "host/datasources/fingerprint.h"
#include "host/drivers/tiff/tifffingerprint.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

using datasources::LevelStatus;
using drivers::FingerprintOfTiff;

const Layout kImage{.width = 200, .height = 160, .samples = 3, .tile = 64};

/// Changes the byte at `position`, as another program would.
void Flip(const std::string& file, size_t position) {
  std::fstream stream(file, std::ios::in | std::ios::out | std::ios::binary);
  stream.seekg(static_cast<std::streamoff>(position));
  const char byte = static_cast<char>(stream.get() ^ 1);
  stream.seekp(static_cast<std::streamoff>(position));
  stream.put(byte);
}

/// Bytes of the image's tile `index`, in the file.
std::pair<uint64_t, uint64_t> TileAt(const std::string& file, uint32_t index) {
  TIFF* tiff = TIFFOpen(file.c_str(), "rm");
  const std::pair<uint64_t, uint64_t> at{TIFFGetStrileOffset(tiff, index),
                                         TIFFGetStrileByteCount(tiff, index)};
  TIFFClose(tiff);
  return at;
}

std::string PixelsOf(const std::string& file) {
  const auto dataset = Open(file, datasources::kReadOnly);
  datasources::BasicReader reader(dataset.get(), ChannelsOf(*dataset), false);
  return FingerprintOfPixels(reader, {});
}

class Fresh : public TiffStore {
 protected:
  Fresh() : file_(folder_.File("image.tif")) { WriteImage(file_, kImage); }
  LevelDescription Level(size_t index = 0) const { return LevelsOf(file_).at(index); }
  void SetTime(time_t seconds) const {
    const timespec times[2] = {{seconds, 3}, {seconds, 3}};
    ASSERT_EQ(0, utimensat(AT_FDCWD, file_.c_str(), times, 0));
  }
  std::string file_;
};

TEST_F(Fresh, FingerprintIsOfTheTilesBytesWhereverTheyStand) {
  const std::string before = FingerprintOfTiff(file_, {});
  EXPECT_EQ(datasources::kFingerprintLength, before.size());
  Layout other = kImage;
  for (const char* mode : {"wb", "w8", "w8b"}) {
    other.mode = mode;
    WriteImage(folder_.File("other.tif"), other);
    EXPECT_EQ(before, FingerprintOfTiff(folder_.File("other.tif"), {})) << mode;
  }
  Build(file_, kImage, {.level = 2});
  EXPECT_EQ(before, FingerprintOfTiff(file_, {}));
}

TEST_F(Fresh, FingerprintTellsAnyByteOfAnyTile) {
  const std::string before = FingerprintOfTiff(file_, {});
  for (uint32_t tile = 0; tile < 12; ++tile) {
    const auto [offset, count] = TileAt(file_, tile);
    for (const uint64_t at : {offset, offset + count / 2, offset + count - 1}) {
      Flip(file_, at);
      EXPECT_NE(before, FingerprintOfTiff(file_, {})) << "tile " << tile;
      Flip(file_, at);
    }
  }
  EXPECT_EQ(before, FingerprintOfTiff(file_, {}));
}

TEST_F(Fresh, FingerprintTellsATileLeftOutFromItsNeighbour) {
  std::vector<std::string> seen;
  for (const std::vector<uint32_t>& skip :
       std::vector<std::vector<uint32_t>>{{}, {0}, {1}, {0, 1}}) {
    WriteImage(file_, {.width = 128, .height = 64, .tile = 64}, skip);
    seen.push_back(FingerprintOfTiff(file_, {}));
  }
  std::sort(seen.begin(), seen.end());
  EXPECT_EQ(seen.end(), std::adjacent_find(seen.begin(), seen.end()));
}

TEST_F(Fresh, FingerprintEndsEarlyWhenItIsStopped) {
  std::stop_source stop;
  stop.request_stop();
  EXPECT_EQ("", FingerprintOfTiff(file_, stop.get_token()));
}

TEST_F(Fresh, FingerprintOfAFileWithoutAllItsTilesIsRefused) {
  std::filesystem::resize_file(file_, TileAt(file_, 11).first + 5);
  EXPECT_THROW(FingerprintOfTiff(file_, {}), Exception);
}

TEST_F(Fresh, PixelsHaveOneFingerprintInEveryLayout) {
  const std::string before = PixelsOf(file_);
  Layout strips = kImage;
  strips.tile = 0;
  strips.compression = COMPRESSION_LZW;
  WriteImage(folder_.File("strips.tif"), strips);
  EXPECT_EQ(before, PixelsOf(folder_.File("strips.tif")));
  Flip(file_, TileAt(file_, 5).first);
  EXPECT_NE(before, PixelsOf(file_));
}

TEST_F(Fresh, LevelRemembersTheImageAndTheTimeOfTheBuild) {
  const std::string fingerprint = FingerprintOfTiff(file_, {});
  Build(file_, kImage, {.level = 2});
  Build(file_, kImage, {.level = 4});
  struct stat status;
  ASSERT_EQ(0, stat(file_.c_str(), &status));
  for (const LevelDescription& level : LevelsOf(file_)) {
    EXPECT_EQ(LevelStatus::kCurrent, level.status);
    EXPECT_EQ(fingerprint, level.image.fingerprint);
    EXPECT_EQ(static_cast<uint64_t>(status.st_size), level.image.stamp.bytes);
    EXPECT_EQ(status.st_mtim.tv_sec * 1000000000 + status.st_mtim.tv_nsec,
              level.image.stamp.modified);
  }
}

TEST_F(Fresh, EditMakesALevelStaleAndNotValid) {
  Build(file_, kImage, {.level = 2});
  Flip(file_, TileAt(file_, 3).first);
  EXPECT_EQ(LevelStatus::kStale, Level().status);
  EXPECT_EQ("000", ValidityOf(Level()));
  Build(file_, kImage, {.level = 2});
  EXPECT_EQ(LevelStatus::kCurrent, Level().status);
}

TEST_F(Fresh, OtherTimeIsRememberedByAnUpdateAndByRequestOnly) {
  Build(file_, kImage, {.level = 2});
  SetTime(5000);
  const auto remembered = [this] { return Level().image.stamp.modified; };
  EXPECT_EQ(LevelStatus::kCurrent, Level().status);
  EXPECT_NE(5000000000003, remembered());
  Open(file_, datasources::kReadOnly)->GetSource()->Levels()->KeepAnswers();
  EXPECT_EQ(5000000000003, remembered());
  SetTime(6000);
  LevelsOf(*Open(file_, datasources::kUpdate));
  EXPECT_EQ(6000000000003, remembered());
  EXPECT_EQ(LevelStatus::kCurrent, Level().status);
}

TEST_F(Fresh, StaleLevelIsNoSourceOfAnother) {
  Build(file_, kImage, {.level = 2});
  Flip(file_, TileAt(file_, 3).first);
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor writer(dataset.get(), {1, 2, 3});
  EXPECT_EQ(std::vector<unsigned>(), writer.GetLevels());
  const datasources::BasicOverviewReaderAccessor reader(dataset.get(), {1, 2, 3});
  EXPECT_EQ(std::vector<unsigned>{2}, reader.GetLevels());
  EXPECT_FALSE(reader.IsLevelValid(2));
}

TEST_F(Fresh, LevelInheritsWhatItsSourceRemembers) {
  Build(file_, kImage, {.level = 2});
  const std::string before = Level().image.fingerprint;
  Flip(file_, TileAt(file_, 3).first);
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.CreateLevel(4);
  const std::unique_ptr<IRasterWriter> source(accessor.CreateRasterWriter(2));
  gobs::Raster block({10, 10, 3, source->GetDataType()}, {});
  source->Read(block);
  const std::unique_ptr<IRasterWriter> target(accessor.CreateRasterWriter(4));
  WriteBlocks(*target, LevelLayout(kImage, 4), 100);
  accessor.SetLevelValid(4, true);
  EXPECT_EQ(before, Level(1).image.fingerprint);
  EXPECT_EQ(LevelStatus::kStale, Level(1).status);
}

TEST_F(Fresh, ChannelsOfAnEarlierImageAreDroppedFromALevel) {
  Build(file_, kImage, {.level = 2});
  Flip(file_, TileAt(file_, 3).first);
  Build(file_, kImage, {.level = 2, .channels = {2}});
  EXPECT_EQ("-1-", ValidityOf(Level()));
  EXPECT_EQ(LevelStatus::kUnfinished, Level().status);
}

TEST_F(Fresh, LevelThatAnotherProgramTookOverIsUnverified) {
  Build(file_, kImage, {.level = 2});
  std::vector<char> bytes = BytesOf(file_);
  const std::string item = "ORIN_IMAGE";
  const auto at = std::search(bytes.begin(), bytes.end(), item.begin(), item.end());
  ASSERT_NE(bytes.end(), at);
  *at = 'o';
  std::ofstream(file_, std::ios::binary).write(bytes.data(), std::streamsize(bytes.size()));
  EXPECT_EQ(LevelStatus::kUnverified, Level().status);
  EXPECT_EQ("111", ValidityOf(Level()));
}

TEST_F(Fresh, EditDuringABuildIntoTheFileItselfGivesNoValidLevel) {
  const auto editing = [&](unsigned block) {
    if (block == 3) Flip(file_, TileAt(file_, 3).first), SetTime(7000);
    return true;
  };
  const LevelBuilding two{.level = 2, .edge = 40, .goesOn = editing};
  EXPECT_THROW(Build(file_, kImage, two), Exception);
  EXPECT_TRUE(LevelsOf(file_).empty());
  Build(file_, kImage, {.level = 2});
  const LevelBuilding four{.level = 4, .edge = 10, .goesOn = editing};
  EXPECT_THROW(Build(file_, kImage, four), Exception);
  ASSERT_EQ(1u, LevelsOf(file_).size());
  EXPECT_EQ(LevelStatus::kStale, Level().status);
}

TEST_F(Fresh, EditDuringABuildThatIsGivenUpMakesTheOtherLevelsStale) {
  Build(file_, kImage, {.level = 2});
  const auto editing = [&](unsigned block) {
    if (block == 3) Flip(file_, TileAt(file_, 3).first), SetTime(7000);
    return block < 5;
  };
  Build(file_, kImage, {.level = 4, .edge = 10, .goesOn = editing, .marksValid = false});
  ASSERT_EQ(1u, LevelsOf(file_).size());
  EXPECT_EQ(LevelStatus::kStale, Level().status);
}

TEST_F(Fresh, TouchDuringABuildDoesNoHarmToAnImageThatWasKnownBefore) {
  Build(file_, kImage, {.level = 2});
  const auto touching = [&](unsigned block) {
    if (block == 3) SetTime(7000);
    return true;
  };
  Build(file_, kImage, {.level = 4, .edge = 10, .goesOn = touching});
  for (const LevelDescription& level : LevelsOf(file_)) {
    EXPECT_EQ(LevelStatus::kCurrent, level.status);
    EXPECT_EQ(level.image.stamp.bytes, std::filesystem::file_size(file_));
  }
}

TEST_F(Fresh, ImageThatChangesDuringABuildBesideItGivesNoValidLevel) {
  const auto dataset = OpenGeneric(file_);
  const auto editing = [&](unsigned block) {
    if (block == 2) Flip(file_, TileAt(file_, 3).first);
    return true;
  };
  EXPECT_THROW(
      Build(*dataset, kImage, {.level = 2, .edge = 40, .channels = {1}, .goesOn = editing}),
      Exception);
  EXPECT_FALSE(std::filesystem::exists(file_ + ".ovr"));
}

}  // namespace
}  // namespace orin::tests
