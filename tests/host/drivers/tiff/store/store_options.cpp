/// Levels stored as the user says.
// SPDX-License-Identifier: MIT
#include "host/datasources/leveloptions.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

using datasources::LevelOptions;

const Layout kImage{
    .width = 200, .height = 160, .samples = 3, .tile = 32, .photometric = PHOTOMETRIC_RGB};

/// Puts options in force while it lives.
class InForce {
 public:
  InForce(std::initializer_list<const char*> texts, bool restores = false) {
    LevelOptions options;
    options.restores = restores;
    for (const char* text : texts) EXPECT_EQ("", ReadLevelOption(text, options));
    OptionsOfStores() = options;
  }
  ~InForce() { OptionsOfStores() = {}; }
};

/// A level of `image` made with `options`, as libtiff sees it.
Seen LevelWith(const std::string& file, const Layout& image,
               std::initializer_list<const char*> options) {
  WriteImage(file, image);
  const InForce inForce(options);
  Build(file, image, {.level = 2});
  return DirectoriesOf(file).at(1);
}

std::string RefusalOf(const std::string& file, const Layout& image,
                      std::initializer_list<const char*> options) {
  WriteImage(file, image);
  const auto before = BytesOf(file);
  std::string text;
  try {
    const InForce inForce(options);
    Build(file, image, {.level = 2});
  } catch (const datasources::OptionException& refusal) {
    text = refusal.GetMessage();
  }
  EXPECT_EQ(before, BytesOf(file)) << text;
  return text;
}

TEST_F(TiffStore, LevelHasTheCompressionAndTheTilesAskedFor) {
  const std::string file = folder_.File("image.tif");
  Layout level = LevelLayout(kImage, 2);
  level.tile = 48;
  for (const auto& [name, compression] : {std::pair{"COMPRESS=NONE", COMPRESSION_NONE},
                                          {"COMPRESS=LZW", COMPRESSION_LZW},
                                          {"COMPRESS=DEFLATE", COMPRESSION_ADOBE_DEFLATE},
                                          {"COMPRESS=ZSTD", COMPRESSION_ZSTD},
                                          {"COMPRESS=PACKBITS", COMPRESSION_PACKBITS},
                                          {"COMPRESS=LZMA", COMPRESSION_LZMA},
                                          {"COMPRESS=LERC", COMPRESSION_LERC},
                                          {"COMPRESS=WEBP", COMPRESSION_WEBP}}) {
    if (!TIFFIsCODECConfigured(static_cast<uint16_t>(compression))) continue;
    EXPECT_EQ(compression, LevelWith(file, kImage, {name, "TILE=48"}).compression) << name;
    EXPECT_EQ("", WrongTile(file, 1, level)) << name;
  }
}

TEST_F(TiffStore, PredictorSuitsTheSamplesUnlessTheUserSaysOtherwise) {
  const std::string file = folder_.File("image.tif");
  Layout floats = kImage;
  floats.bits = 32;
  floats.sampleFormat = SAMPLEFORMAT_IEEEFP;
  EXPECT_EQ(2, LevelWith(file, kImage, {"COMPRESS=DEFLATE"}).predictor);
  EXPECT_EQ(3, LevelWith(file, floats, {"COMPRESS=LZW"}).predictor);
  EXPECT_EQ(2, LevelWith(file, floats, {"COMPRESS=ZSTD", "PREDICTOR=2"}).predictor);
  EXPECT_EQ(1, LevelWith(file, kImage, {"COMPRESS=ZSTD", "PREDICTOR=NO"}).predictor);
  floats.mode = "wb";
  EXPECT_EQ(3, LevelWith(file, floats, {"COMPRESS=DEFLATE"}).predictor);
  EXPECT_EQ("", WrongTile(file, 1, LevelLayout(floats, 2)));
}

TEST_F(TiffStore, LevelOfAJpegImageWithAlphaIsJpegOnlyWhenTheUserSaysSo) {
  const std::string file = folder_.File("image.tif");
  Layout image = kImage;
  image.samples = 4;
  image.compression = COMPRESSION_JPEG;
  EXPECT_EQ(COMPRESSION_JPEG, LevelWith(file, image, {}).compression);
  for (const uint16_t alpha : {EXTRASAMPLE_ASSOCALPHA, EXTRASAMPLE_UNASSALPHA})
    for (const bool planar : {false, true})
      for (const char* mode : {"w", "wb"}) {
        image.alpha = alpha;
        image.planar = planar;
        image.mode = mode;
        const Seen level = LevelWith(file, image, {});
        EXPECT_EQ(COMPRESSION_ADOBE_DEFLATE, level.compression);
        EXPECT_EQ(2, level.predictor);
        EXPECT_EQ(planar ? PLANARCONFIG_SEPARATE : PLANARCONFIG_CONTIG, level.planar);
        EXPECT_EQ("", WrongTile(file, 1, LevelLayout(image, 2)));
        EXPECT_EQ(COMPRESSION_JPEG, LevelWith(file, image, {"COMPRESS=JPEG"}).compression);
      }
}

TEST_F(TiffStore, OptionThatDoesNotFitIsNamedAndNothingIsWritten) {
  const std::string file = folder_.File("image.tif");
  Layout wide = kImage;
  wide.bits = 16;
  Layout grey = kImage;
  grey.samples = 1;
  grey.photometric = PHOTOMETRIC_MINISBLACK;
  EXPECT_EQ(file + ": COMPRESS=JPEG cannot be used: JPEG stores unsigned samples of 8 bits only.",
            RefusalOf(file, wide, {"COMPRESS=JPEG"}));
  EXPECT_NE("", RefusalOf(file, grey, {"COMPRESS=WEBP"}));
  EXPECT_NE("", RefusalOf(file, wide, {"COMPRESS=DEFLATE", "PREDICTOR=3"}));
  EXPECT_NE("", RefusalOf(file, wide, {"PREDICTOR=2"}));  // the image is not compressed
  EXPECT_NE("", RefusalOf(file, wide, {"LEVEL=6"}));
  EXPECT_NE("", RefusalOf(file, wide, {"QUALITY=60"}));
  EXPECT_NE("", RefusalOf(file, wide, {"TILE=16384"}));
}

TEST_F(TiffStore, LevelThatIsThereKeepsItsFormUnlessItIsStoredAgain) {
  const std::string file = folder_.File("image.tif");
  WriteImage(file, kImage);
  Build(file, kImage, {.level = 2});
  {
    const InForce inForce({"COMPRESS=ZSTD"});
    Build(file, kImage, {.level = 2});
  }
  EXPECT_EQ(COMPRESSION_NONE, DirectoriesOf(file).at(1).compression);
  {
    const InForce inForce({"COMPRESS=ZSTD"}, true);
    Build(file, kImage, {.level = 2});
  }
  EXPECT_EQ(COMPRESSION_ZSTD, DirectoriesOf(file).at(1).compression);
  EXPECT_EQ("", WrongTile(file, 1, LevelLayout(kImage, 2)));
  EXPECT_EQ("200x160 100x80", SizesOf(file));
  Build(file, kImage, {.level = 2});
  EXPECT_EQ(COMPRESSION_ZSTD, DirectoriesOf(file).at(1).compression);
  EXPECT_EQ("111", ValidityOf(LevelsOf(file).at(0)));
}

TEST_F(TiffStore, SideCarStoredAgainChannelByChannelTakesTheNewFormWithTheFirst) {
  const std::string file = folder_.File("image.tif");
  WriteImage(file, kImage);
  const auto build = [&](std::vector<unsigned> channels) {
    const auto dataset = OpenGeneric(file);
    for (const unsigned channel : channels)
      Build(*dataset, kImage, {.level = 2, .channels = {channel}});
  };
  const auto validity = [&] { return ValidityOf(LevelsOf(*OpenGeneric(file)).at(0)); };
  build({1, 2, 3});
  const InForce inForce({"COMPRESS=LZW", "TILE=64"}, true);
  build({1});
  EXPECT_EQ("1--", validity());
  build({2, 3});
  EXPECT_EQ("111", validity());
  EXPECT_EQ(COMPRESSION_LZW, DirectoriesOf(file + ".ovr").at(0).compression);
  Layout level = LevelLayout(kImage, 2);
  level.tile = 64;
  level.planar = true;
  EXPECT_EQ("", WrongTile(file + ".ovr", 0, level));
}

TEST_F(TiffStore, SideCarIsABigTiffWhenTheUserWantsIt) {
  const std::string file = folder_.File("image.tif");
  WriteImage(file, kImage);
  const InForce inForce({"BIGTIFF=YES"});
  Build(*OpenGeneric(file), kImage, {.level = 2});
  EXPECT_EQ(43, BytesOf(file + ".ovr")[2]);
}

}  // namespace
}  // namespace orin::tests
