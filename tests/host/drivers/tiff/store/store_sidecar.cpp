/// Levels beside an image: written channel by channel, without a trace in the image.
// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>

#include "host/drivers/tiff/sidecar.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

const Layout kImage{
    .width = 200, .height = 160, .samples = 3, .tile = 32, .photometric = PHOTOMETRIC_RGB};

Layout InPlanes(Layout layout) {
  layout.planar = layout.samples > 1;
  return layout;
}

/// A level as a run builds it beside an image: one pass a channel.
void BuildBeside(const std::string& file, const Layout& image, unsigned level,
                 const std::vector<unsigned>& channels = {1, 2, 3}) {
  const auto dataset = OpenGeneric(file);
  for (const unsigned channel : channels)
    Build(*dataset, image, {.level = level, .channels = {channel}});
}

/// An image of no TIFF file, as far as its levels are concerned.
class PlainImage final : public datasources::IRasterSource {
 public:
  PlainImage(unsigned width, unsigned height, std::vector<gobs::DataType> types)
      : width_(width), height_(height), types_(std::move(types)) {}
  unsigned Width() const override { return width_; }
  unsigned Height() const override { return height_; }
  unsigned ChannelCount() const override { return static_cast<unsigned>(types_.size()); }
  gobs::DataType TypeOf(unsigned channel) const override { return types_.at(channel - 1); }
  unsigned StoredBitsOf(unsigned channel) const override {
    return storedBits ? storedBits : TypeOf(channel).bits;
  }
  datasources::AuxiliaryData MetadataOf(const std::vector<unsigned>&) const override {
    return {{{datasources::kNoDataKey, "-9999"}}, {}};
  }
  std::unique_ptr<datasources::IRasterReader> OpenReader(const std::vector<unsigned>&) override {
    return nullptr;
  }
  datasources::ILevelStore* Levels() override { return nullptr; }

  unsigned storedBits = 0;  ///< 0: as many as the type has

 private:
  unsigned width_, height_;
  std::vector<gobs::DataType> types_;
};

class SideCar : public TiffStore {
 protected:
  SideCar()
      : file_(folder_.File("image.tif")),
        sideCar_(file_ + ".ovr"),
        partial_(sideCar_ + ".partial") {
    WriteImage(file_, kImage);
  }
  bool Exists(const std::string& name) const { return std::filesystem::exists(name); }
  std::string file_, sideCar_, partial_;
};

TEST_F(SideCar, HoldsPlanesAndLeavesTheImageUntouched) {
  const auto before = BytesOf(file_);
  const timespec longAgo[2] = {{1000, 5}, {1000, 5}};
  ASSERT_EQ(0, utimensat(AT_FDCWD, file_.c_str(), longAgo, 0));
  chmod(file_.c_str(), 0444);
  BuildBeside(file_, kImage, 4);
  BuildBeside(file_, kImage, 2);
  struct stat status;
  ASSERT_EQ(0, stat(file_.c_str(), &status));
  EXPECT_EQ(1000, status.st_mtim.tv_sec);
  EXPECT_EQ(before, BytesOf(file_));
  EXPECT_EQ("100x80 50x40", SizesOf(sideCar_));
  for (const Seen& seen : DirectoriesOf(sideCar_)) {
    EXPECT_EQ(PLANARCONFIG_SEPARATE, seen.planar);
    EXPECT_EQ(uint32_t{FILETYPE_REDUCEDIMAGE}, seen.subfile);
  }
  EXPECT_EQ("", WrongTile(sideCar_, 0, LevelLayout(InPlanes(kImage), 2)));
  EXPECT_EQ("", WrongTile(sideCar_, 1, LevelLayout(InPlanes(kImage), 4)));
  EXPECT_FALSE(Exists(partial_));
}

TEST_F(SideCar, GetsItsNameWhenALevelHasAllOfItsChannels) {
  const auto dataset = OpenGeneric(file_);
  const std::vector<std::string> validity = {"1--", "11-", "111"};
  for (unsigned channel = 1; channel <= 3; ++channel) {
    Build(*dataset, kImage, {.level = 2, .channels = {channel}, .goesOn = [&](unsigned) {
                               EXPECT_FALSE(Exists(sideCar_));
                               return true;
                             }});
    EXPECT_EQ(channel == 3, Exists(sideCar_));
    EXPECT_EQ(validity[channel - 1], ValidityOf(LevelsOf(*dataset).at(0)));
  }
  EXPECT_EQ("111", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
  const auto level = LevelsOf(*dataset).at(0);
  EXPECT_EQ(datasources::LevelPlace::kSideCar, level.place);
  EXPECT_EQ(sideCar_, level.file);
  EXPECT_EQ(1u, level.sourceLevel);
}

TEST_F(SideCar, KeepsTheFinishedChannelsOfARunThatEndsOrGoesOnWithoutTheOthers) {
  {
    const auto dataset = OpenGeneric(file_);
    Build(*dataset, kImage, {.level = 2, .channels = {1}});
    Build(*dataset, kImage, {.level = 2, .channels = {3}});
    EXPECT_FALSE(Exists(sideCar_));
    Build(*dataset, kImage, {.level = 4, .channels = {2}});
    EXPECT_EQ("1-1", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
  }
  const auto levels = LevelsOf(*OpenGeneric(file_));
  ASSERT_EQ(2u, levels.size());
  EXPECT_EQ("1-1", ValidityOf(levels[0]));
  EXPECT_EQ("-1-", ValidityOf(levels[1]));
  for (const auto& level : levels) EXPECT_EQ(datasources::LevelStatus::kUnfinished, level.status);
  Build(*OpenGeneric(file_), kImage, {.level = 2, .channels = {2}});
  EXPECT_EQ("", WrongTile(sideCar_, 0, LevelLayout(InPlanes(kImage), 2)));
}

TEST_F(SideCar, KeepsAFinishedChannelWhenTheNextOneFails) {
  {
    const auto dataset = OpenGeneric(file_);
    Build(*dataset, kImage, {.level = 2, .channels = {1}});
    const auto stopping = [](unsigned block) { return block < 2; };
    Build(*dataset, kImage,
          {.level = 2, .edge = 40, .channels = {2}, .goesOn = stopping, .marksValid = false});
    EXPECT_EQ("10-", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
  }
  EXPECT_EQ("10-", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
}

TEST_F(SideCar, ChangesOnceWhenALevelIsRebuilt) {
  BuildBeside(file_, kImage, 2);
  const uint64_t before = DirectoriesOf(sideCar_).at(0).offset;
  const auto dataset = OpenGeneric(file_);
  for (unsigned channel = 1; channel <= 3; ++channel) {
    Build(*dataset, kImage, {.level = 2, .method = "AVERAGE", .channels = {channel}});
    const bool isLast = channel == 3;
    EXPECT_EQ(isLast, DirectoriesOf(sideCar_).at(0).offset != before);
    EXPECT_EQ(isLast ? "AVERAGE" : "NEAREST", LevelsOf(*OpenGeneric(file_)).at(0).method);
    EXPECT_EQ("111", ValidityOf(LevelsOf(*dataset).at(0)));
  }
  EXPECT_EQ("111", ValidityOf(LevelsOf(*OpenGeneric(file_)).at(0)));
}

TEST_F(SideCar, HoldsTheOldLevelWhenARebuildStopsBetweenItsChannels) {
  BuildBeside(file_, kImage, 2);
  const uint64_t before = DirectoriesOf(sideCar_).at(0).offset;
  {
    const auto dataset = OpenGeneric(file_);
    Build(*dataset, kImage, {.level = 2, .method = "AVERAGE", .channels = {1}});
    const auto stopping = [](unsigned block) { return block < 2; };
    Build(*dataset, kImage,
          {.level = 2, .edge = 40, .channels = {2}, .goesOn = stopping, .marksValid = false});
  }
  EXPECT_EQ(before, DirectoriesOf(sideCar_).at(0).offset);
  const auto level = LevelsOf(*OpenGeneric(file_)).at(0);
  EXPECT_EQ("NEAREST", level.method);
  EXPECT_EQ("001", ValidityOf(level));
  EXPECT_EQ("", WrongTile(sideCar_, 0, LevelLayout(InPlanes(kImage), 2)));
}

TEST_F(SideCar, TakesOneRebuiltChannelWhenTheRunEnds) {
  BuildBeside(file_, kImage, 2);
  Build(*OpenGeneric(file_), kImage, {.level = 2, .method = "AVERAGE", .channels = {2}});
  const auto level = LevelsOf(*OpenGeneric(file_)).at(0);
  EXPECT_EQ("AVERAGE", level.method);
  EXPECT_EQ("010", ValidityOf(level)) << "the others are of another method";
}

/// A build of level 2 that ends without any clean-up before its block `stop`.
void KilledBuild(const std::string& file, unsigned stop) {
  const pid_t child = fork();
  if (child == 0) {
    const auto dataset = OpenGeneric(file);
    Build(*dataset, kImage,
          {.level = 2, .edge = 40, .channels = {1}, .goesOn = [=](unsigned block) {
             if (block == stop) _exit(0);
             return true;
           }});
    _exit(1);
  }
  int status = -1;
  ASSERT_EQ(child, waitpid(child, &status, 0));
  ASSERT_EQ(0, status);
}

TEST_F(SideCar, LeavesNothingBehindWhenItsFirstLevelIsGivenUp) {
  KilledBuild(file_, 4);
  ASSERT_TRUE(Exists(partial_));
  {
    const auto dataset = OpenGeneric(file_);
    Build(*dataset, kImage,
          {.level = 2,
           .edge = 40,
           .channels = {1},
           .goesOn = [](unsigned block) { return block < 3; },
           .marksValid = false});
  }
  EXPECT_FALSE(Exists(sideCar_));
  EXPECT_FALSE(Exists(partial_));
}

TEST_F(SideCar, StartsAnewOverTheRestsOfAKilledRun) {
  KilledBuild(file_, 5);
  std::ofstream(partial_, std::ios::app) << std::string(100000, 'x');
  BuildBeside(file_, kImage, 2);
  EXPECT_EQ("", WrongTile(sideCar_, 0, LevelLayout(InPlanes(kImage), 2)));
  EXPECT_GT(100000u, std::filesystem::file_size(sideCar_));
  EXPECT_FALSE(Exists(partial_));
}

TEST_F(SideCar, IsNotBegunOverAFileThatIsNoRestOfAKilledRun) {
  for (const std::string text : {"a letter to a friend", "II* but not of ours"}) {
    const std::string written = text + std::string(200, '.');
    std::ofstream(partial_) << written;
    EXPECT_THROW(BuildBeside(file_, kImage, 2), Exception);
    const auto bytes = BytesOf(partial_);
    EXPECT_EQ(written, std::string(bytes.begin(), bytes.end()));
    EXPECT_FALSE(Exists(sideCar_));
  }
}

TEST_F(SideCar, ThatAnotherBuildMadeMeanwhileIsNotReplaced) {
  const auto late = OpenGeneric(file_);
  BuildBeside(file_, kImage, 4);
  const auto before = BytesOf(sideCar_);
  EXPECT_THROW(Build(*late, kImage, {.level = 2, .channels = {1}}), Exception);
  EXPECT_EQ(before, BytesOf(sideCar_));
  EXPECT_FALSE(Exists(partial_));
}

TEST_F(SideCar, GoesWithItsLastLevelAndWhatAKilledBuildLeft) {
  BuildBeside(file_, kImage, 2);
  BuildBeside(file_, kImage, 4);
  OpenGeneric(file_)->GetSource()->Levels()->Remove({2});
  EXPECT_EQ("50x40", SizesOf(sideCar_));
  OpenGeneric(file_)->GetSource()->Levels()->Remove({4});
  EXPECT_FALSE(Exists(sideCar_));
  KilledBuild(file_, 4);
  OpenGeneric(file_)->GetSource()->Levels()->Remove({});
  EXPECT_FALSE(Exists(partial_));
}

TEST_F(SideCar, NamesTheLevelInsideTheFileThatItsLevelWasReadFrom) {
  Build(file_, kImage, {.level = 2});
  const auto dataset = OpenGeneric(file_);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.CreateLevel(4);
  const std::unique_ptr<IRasterWriter> target(accessor.CreateRasterWriter(4));
  const std::unique_ptr<IRasterWriter> source(accessor.CreateRasterWriter(2));
  WriteBlocks(*target, LevelLayout(kImage, 4), 50);
  accessor.SetLevelValid(4, true);
  EXPECT_EQ(2u, LevelsOf(*dataset).at(1).sourceLevel);
  EXPECT_EQ(datasources::LevelPlace::kSideCar, LevelsOf(*dataset).at(1).place);
}

TEST_F(SideCar, CanStartAgainAfterBeingGivenUpInTheSameRun) {
  const auto dataset = OpenGeneric(file_);
  Build(*dataset, kImage,
        {.level = 2,
         .edge = 40,
         .channels = {1},
         .goesOn = [](unsigned block) { return block < 5; },
         .marksValid = false});
  Build(*dataset, kImage, {.level = 2, .channels = {1}});
  EXPECT_EQ("1--", ValidityOf(LevelsOf(*dataset).at(0)));
}

TEST_F(SideCar, OfAnotherProgramIsListedAndAddedTo) {
  Layout ceil = kImage;
  ceil.width = 67;  // level 3 rounded up
  ceil.height = 54;
  WriteImage(sideCar_, ceil);
  TIFF* tiff = TIFFOpen(sideCar_.c_str(), "r+");
  TIFFSetField(tiff, TIFFTAG_SUBFILETYPE, FILETYPE_REDUCEDIMAGE);
  TIFFRewriteDirectory(tiff);
  TIFFClose(tiff);
  const auto levels = LevelsOf(*OpenGeneric(file_));
  ASSERT_EQ(1u, levels.size());
  EXPECT_EQ(3u, levels[0].level);
  EXPECT_EQ("111", ValidityOf(levels[0]));
  BuildBeside(file_, kImage, 2);
  BuildBeside(file_, kImage, 3);
  EXPECT_EQ("100x80 66x53", SizesOf(sideCar_));
  EXPECT_EQ("", WrongTile(sideCar_, 1, LevelLayout(InPlanes(kImage), 3)));
}

TEST_F(SideCar, ThatCannotBeReadIsNeverOverwritten) {
  std::ofstream(sideCar_) << "no TIFF file";
  try {
    OpenGeneric(file_);
    ADD_FAILURE() << "an unreadable side-car was taken";
  } catch (const Exception& refused) {
    EXPECT_EQ(0u, refused.GetMessage().find(sideCar_ + ": cannot be read: "))
        << refused.GetMessage();
    EXPECT_NE(std::string::npos, refused.GetMessage().find("Delete the side-car"));
  }
  EXPECT_EQ("no TIFF file", std::string(BytesOf(sideCar_).data(), 12));
}

TEST_F(SideCar, OfAJpegYCbCrImageIsDeflatedRgb) {
  Layout jpeg = kImage;
  jpeg.compression = COMPRESSION_JPEG;
  jpeg.photometric = PHOTOMETRIC_YCBCR;
  WriteImage(file_, jpeg);
  BuildBeside(file_, kImage, 2);
  const Seen seen = DirectoriesOf(sideCar_).at(0);
  EXPECT_EQ(COMPRESSION_ADOBE_DEFLATE, seen.compression);
  EXPECT_EQ(PHOTOMETRIC_RGB, seen.photometric);
  EXPECT_EQ("", WrongTile(sideCar_, 0, LevelLayout(InPlanes(kImage), 2)));
}

TEST_F(SideCar, OfABigEndianImageIsInTheMachinesOrder) {
  Layout big = kImage;
  big.mode = "wb";
  big.bits = 16;
  big.compression = COMPRESSION_LZW;
  big.predictor = 2;
  WriteImage(file_, big);
  BuildBeside(file_, big, 2);
  EXPECT_EQ('I', BytesOf(sideCar_)[0]);
  EXPECT_EQ(COMPRESSION_LZW, DirectoriesOf(sideCar_).at(0).compression);
  EXPECT_EQ("", WrongTile(sideCar_, 0, LevelLayout(InPlanes(big), 2)));
}

/// Makes one level of an image of no TIFF file and returns its directory.
Seen PlainLevel(const std::string& name, PlainImage& image, unsigned level) {
  const auto store = drivers::TiffSideCar().Open(name, image);
  gobs::Raster block({image.Width() / level, image.Height() / level, 1, image.TypeOf(1)}, {});
  std::fill(block.data, block.data + block.byteSize, uint8_t{0});
  for (unsigned channel = 1; channel <= image.ChannelCount(); ++channel) {
    store->Create(level, {channel}, "NEAREST");
    store->OpenWriter(level, {channel})->Write(block);
    store->SetValid(level, {channel}, true);
  }
  return DirectoriesOf(name + ".ovr").at(0);
}

TEST_F(SideCar, OfAnyOtherImageIsDeflatedWithThePredictorOfItsType) {
  PlainImage integers(300, 200, {gobs::DataTypeOf<int16_t>(), gobs::DataTypeOf<int16_t>()});
  const Seen ofIntegers = PlainLevel(folder_.File("a.png"), integers, 2);
  EXPECT_EQ(COMPRESSION_ADOBE_DEFLATE, ofIntegers.compression);
  EXPECT_EQ(2, ofIntegers.predictor);
  EXPECT_EQ(150u, ofIntegers.width);
  EXPECT_EQ(PLANARCONFIG_SEPARATE, ofIntegers.planar);
  PlainImage floats(300, 200, {gobs::DataTypeOf<float>()});
  const Seen ofFloats = PlainLevel(folder_.File("b.png"), floats, 2);
  EXPECT_EQ(COMPRESSION_ADOBE_DEFLATE, ofFloats.compression);
  EXPECT_EQ(3, ofFloats.predictor);
}

TEST_F(SideCar, KeepsTheBitsOfAnyOtherImageAndClampsWhatIsBeyond) {
  PlainImage image(40, 30, {gobs::DataTypeOf<uint16_t>(), gobs::DataTypeOf<uint16_t>()});
  image.storedBits = 12;
  const std::string name = folder_.File("c.jp2");
  const auto store = drivers::TiffSideCar().Open(name, image);
  store->Create(2, {1}, "BICUBIC");
  const auto writer = store->OpenWriter(2, {1});
  gobs::Raster block({20, 15, 1, image.TypeOf(1)}, {});
  auto* values = reinterpret_cast<uint16_t*>(block.data);
  std::fill(values, values + 300, uint16_t{4094});
  values[7] = 4097;
  writer->Write(block);
  store->SetValid(2, {1}, true);
  gobs::Raster stored({20, 15, 1, image.TypeOf(1)}, {});
  store->OpenWriter(2, {1})->Read(stored);
  EXPECT_EQ(4094, reinterpret_cast<uint16_t*>(stored.data)[6]);
  EXPECT_EQ(4095, reinterpret_cast<uint16_t*>(stored.data)[7]);
  EXPECT_EQ("20x15", SizesOf(name + ".ovr"));
}

TEST_F(SideCar, IsAsWideAsTheTypeWhereFewerBitsWouldChangeIt) {
  for (const unsigned bits : {7u, 8u, 16u, 17u}) {
    PlainImage image(40, 30, {gobs::DataTypeOf<uint16_t>()});
    image.storedBits = bits;
    const Seen seen = PlainLevel(folder_.File(std::to_string(bits) + ".jp2"), image, 2);
    EXPECT_EQ(2, seen.predictor) << bits;
  }
}

TEST_F(SideCar, IsABigTiffWhenTheUsualPyramidsCouldPassFourGiB) {
  PlainImage below(90000, 90000, {gobs::eDT_8U});  // level 2 has 2.0e9 samples, 3 has 0.9e9 ...
  PlainLevel(folder_.File("below.jp2"), below, 1024);
  EXPECT_EQ(42, BytesOf(folder_.File("below.jp2.ovr"))[2]);
  PlainImage above(100000, 100000, {gobs::eDT_8U});
  PlainLevel(folder_.File("above.jp2"), above, 1024);
  EXPECT_EQ(43, BytesOf(folder_.File("above.jp2.ovr"))[2]);
}

}  // namespace
}  // namespace orin::tests
