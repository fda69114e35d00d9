/// What levels are said to need is never less than what is written for them, whatever the codec,
/// the type and the content.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <tiffio.h>
#include <unistd.h>

#include <cmath>
#include <cstring>
#include <filesystem>
#include <memory>

#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/datasources/leveloptions.h"
#include "host/datasources/levelroom.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "processes/overviews/buildexecution.h"
#include "tests/testing/randomvalues.h"

namespace orin::testing {
namespace {

using datasources::DatasetManager;

constexpr uint32_t kWidth = 260, kHeight = 200;

enum class Content { kConstant, kSmooth, kSparse, kEnlarged, kNoise };
constexpr Content kContents[] = {Content::kConstant, Content::kSmooth, Content::kSparse,
                                 Content::kEnlarged, Content::kNoise};
constexpr const char* kContentNames[] = {"constant", "smooth", "sparse", "enlarged", "noise"};

struct Stored {
  uint16_t codec;
  uint16_t predictor = 1;
  double zError = 0;
  int quality = 75;
  uint32_t tile = 128;  ///< 0: strips
};

struct Pixel {
  uint16_t bits, format;
};

/// A number from 0 to 1 for the pixel.
double ValueOf(Content content, uint32_t x, uint32_t y, uint32_t channel) {
  const auto random = [&](uint32_t column, uint32_t row) {
    Random numbers(column * 7919 + row * 104729 + channel * 31 + 1);
    for (int i = 0; i < 3; ++i) numbers.Between(0, 1 << 20);
    return double(numbers.Between(0, 1 << 20)) / (1 << 20);
  };
  switch (content) {
    case Content::kConstant:
      return 0.25;
    case Content::kSmooth:
      return 0.5 + 0.25 * std::sin(x / 40.0 + channel) + 0.25 * std::cos(y / 30.0);
    case Content::kSparse:
      return random(x, y) < 0.03 ? random(y, x) : 0;
    case Content::kEnlarged:
      return random(x / 8, y / 8);
    case Content::kNoise:
      break;
  }
  return random(x, y);
}

void PutSample(double value, const Pixel& pixel, uint8_t* to) {
  const auto put = [to](auto number) { std::memcpy(to, &number, sizeof number); };
  if (pixel.format == SAMPLEFORMAT_IEEEFP) {
    pixel.bits == 32 ? put(static_cast<float>(std::round(value * 1000))) : put(value * 1000);
    return;
  }
  const auto number = static_cast<uint64_t>(value * std::pow(2.0, pixel.bits) * 0.999);
  std::memcpy(to, &number, pixel.bits / 8u);
}

void WriteImage(const std::string& file, const Stored& stored, const Pixel& pixel,
                uint16_t channels, Content content) {
  const std::unique_ptr<TIFF, void (*)(TIFF*)> tiff(TIFFOpen(file.c_str(), "w"), &TIFFClose);
  ASSERT_NE(nullptr, tiff);
  TIFF* to = tiff.get();
  TIFFSetField(to, TIFFTAG_IMAGEWIDTH, kWidth);
  TIFFSetField(to, TIFFTAG_IMAGELENGTH, kHeight);
  TIFFSetField(to, TIFFTAG_BITSPERSAMPLE, pixel.bits);
  TIFFSetField(to, TIFFTAG_SAMPLEFORMAT, pixel.format);
  TIFFSetField(to, TIFFTAG_SAMPLESPERPIXEL, channels);
  TIFFSetField(to, TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG);
  TIFFSetField(to, TIFFTAG_COMPRESSION, stored.codec);
  TIFFSetField(to, TIFFTAG_PHOTOMETRIC, channels == 3 ? PHOTOMETRIC_RGB : PHOTOMETRIC_MINISBLACK);
  if (stored.predictor != 1) TIFFSetField(to, TIFFTAG_PREDICTOR, stored.predictor);
  if (stored.codec == COMPRESSION_LERC) TIFFSetField(to, TIFFTAG_LERC_MAXZERROR, stored.zError);
  if (stored.codec == COMPRESSION_JPEG) TIFFSetField(to, TIFFTAG_JPEGQUALITY, stored.quality);
  if (stored.codec == COMPRESSION_WEBP) TIFFSetField(to, TIFFTAG_WEBP_LEVEL, stored.quality);
  const uint32_t columns = stored.tile ? stored.tile : kWidth;
  const uint32_t rows = stored.tile ? stored.tile : 8;
  if (stored.tile) TIFFSetField(to, TIFFTAG_TILEWIDTH, columns);
  if (stored.tile) TIFFSetField(to, TIFFTAG_TILELENGTH, rows);
  else TIFFSetField(to, TIFFTAG_ROWSPERSTRIP, rows);
  const size_t sampleBytes = pixel.bits / 8u;
  uint32_t number = 0;
  for (uint32_t top = 0; top < kHeight; top += rows)
    for (uint32_t left = 0; left < kWidth; left += columns, ++number) {
      const uint32_t count = stored.tile ? rows : std::min(rows, kHeight - top);
      std::vector<uint8_t> bytes(size_t{columns} * count * channels * sampleBytes);
      uint8_t* at = bytes.data();
      for (uint32_t y = top; y < top + count; ++y)
        for (uint32_t x = left; x < left + columns; ++x)
          for (uint32_t channel = 0; channel < channels; ++channel, at += sampleBytes)
            PutSample(ValueOf(content, std::min(x, kWidth - 1), std::min(y, kHeight - 1), channel),
                      pixel, at);
      const auto size = static_cast<tmsize_t>(bytes.size());
      const tmsize_t put = stored.tile ? TIFFWriteEncodedTile(to, number, bytes.data(), size)
                                       : TIFFWriteEncodedStrip(to, number, bytes.data(), size);
      ASSERT_GE(put, 0);
    }
}

class Room : public ::testing::Test {
 protected:
  Room() {
    datasources::FormatRegistry::Instance().Clear();
    drivers::RegisterTiffDriver();
    TIFFSetWarningHandler(nullptr);
    const std::filesystem::path memory = "/dev/shm";  // hundreds of runs sync what they write
    std::string name =
        ((std::filesystem::exists(memory) ? memory : std::filesystem::temp_directory_path()) /
         "orin-room-XXXXXX")
            .string();
    EXPECT_NE(nullptr, mkdtemp(name.data()));
    folder_ = name;
  }
  ~Room() override {
    std::filesystem::remove_all(folder_);
    datasources::FormatRegistry::Instance().Clear();
  }

  uint64_t SizeOf(const std::string& file) const {
    return std::filesystem::exists(file) ? std::filesystem::file_size(file) : 0;
  }

  /// Nobody looks, and nobody stops the build.
  class Unobserved final : public overviews::IBuildObserver {
   public:
    void LevelBegins(const overviews::PlannedLevel&) override {}
    bool Advance(double) override { return true; }
    void LevelDone(const overviews::BuiltLevel&) override {}
  };

  /// \param told  receives what the levels are said to need
  void Build(const std::string& file, QRTOverviewResampleType method, bool isBeside,
             uint64_t& told) {
    const auto site = DatasetManager::GetInstance()->OpenSite(
        file, isBeside ? datasources::kReadOnly : datasources::kUpdate);
    overviews::BuildRequest request;
    request.levels = {2, 4, 8, 16};
    request.method = method;
    request.place =
        isBeside ? datasources::LevelPlace::kSideCar : datasources::LevelPlace::kInternal;
    request.storing = options_;
    request.force = true;
    const auto plan = overviews::PlanBuild(overviews::FactsOf(*site, request.storing), request);
    ASSERT_EQ(overviews::Fault::kNone, plan.fault);
    told = site->LevelsIn(plan.place)->RoomFor(request.levels, plan.channels).bytes;
    Unobserved observer;
    const auto dataset = site->DatasetFor(plan.place);
    const auto result = overviews::ExecuteBuild(*dataset, plan, observer);
    ASSERT_EQ(overviews::BuildEnd::kComplete, result.end) << result.reason;
  }

  /// Builds levels 2 to 16, after each other and by that method; what was said they need before,
  /// and what they took.
  void Check(const std::string& image, QRTOverviewResampleType method, bool isBeside) {
    const std::string file = (folder_ / "built.tif").string();
    const std::string grown = isBeside ? file + ".ovr" : file;
    std::filesystem::remove(file + ".ovr");
    std::filesystem::copy_file(image, file, std::filesystem::copy_options::overwrite_existing);
    const uint64_t before = SizeOf(grown);
    uint64_t told = 0;
    Build(file, method, isBeside, told);
    const uint64_t taken = SizeOf(grown) - before;
    EXPECT_GE(told, taken);
    hasWritten_ = hasWritten_ || taken > 0;
  }

  void CheckAll(const Stored& stored, const Pixel& pixel, uint16_t channels) {
    const std::string image = (folder_ / "image.tif").string();
    for (const Content content : kContents) {
      WriteImage(image, stored, pixel, channels, content);
      if (HasFatalFailure()) return;
      for (const auto method : {ResampleNearest, ResampleAverage, ResampleBicubic})
        for (const bool isBeside : {false, true}) {
          SCOPED_TRACE(::testing::Message()
                       << "codec " << stored.codec << " predictor " << stored.predictor << " tile "
                       << stored.tile << " bits " << pixel.bits << " format " << pixel.format
                       << " channels " << channels << " content " << kContentNames[size_t(content)]
                       << " method " << method << " beside " << isBeside);
          Check(image, method, isBeside);
        }
    }
    EXPECT_TRUE(hasWritten_);
  }

  std::filesystem::path folder_;
  datasources::LevelOptions options_;
  bool hasWritten_ = false;
};

constexpr Pixel kByte{8, SAMPLEFORMAT_UINT}, kShort{16, SAMPLEFORMAT_UINT},
    kFloat{32, SAMPLEFORMAT_IEEEFP}, kDouble{64, SAMPLEFORMAT_IEEEFP};

TEST_F(Room, OfCodecsWithoutLossIsNotBelowWhatIsWritten) {
  for (const uint16_t codec : {COMPRESSION_NONE, COMPRESSION_ADOBE_DEFLATE, COMPRESSION_LZW,
                               COMPRESSION_PACKBITS, COMPRESSION_ZSTD})
    for (const Pixel& pixel : {kByte, kShort, kFloat})
      CheckAll({.codec = codec, .tile = pixel.bits == 16 ? 0u : 128u}, pixel, 1);
}

TEST_F(Room, OfPredictorsAndSeveralChannelsIsNotBelowWhatIsWritten) {
  CheckAll({.codec = COMPRESSION_ADOBE_DEFLATE, .predictor = 2}, kByte, 3);
  CheckAll({.codec = COMPRESSION_LZW, .predictor = 2, .tile = 0}, kShort, 3);
  CheckAll({.codec = COMPRESSION_ADOBE_DEFLATE, .predictor = 3}, kFloat, 2);
  CheckAll({.codec = COMPRESSION_LZMA}, kShort, 2);
}

TEST_F(Room, OfImagesWithLossIsNotBelowWhatIsWritten) {
  CheckAll({.codec = COMPRESSION_LERC, .zError = 50}, kFloat, 1);
  CheckAll({.codec = COMPRESSION_LERC, .zError = 20}, kByte, 1);
  CheckAll({.codec = COMPRESSION_LERC, .zError = 0}, kDouble, 1);
  CheckAll({.codec = COMPRESSION_JPEG, .quality = 20}, kByte, 1);
  CheckAll({.codec = COMPRESSION_JPEG, .quality = 100}, kByte, 3);
  CheckAll({.codec = COMPRESSION_WEBP, .quality = 20}, kByte, 3);
}

TEST_F(Room, OfACodecThatTheUserNamesIsNotBelowWhatIsWritten) {
  for (const char* option : {"COMPRESS=DEFLATE", "COMPRESS=LZW", "COMPRESS=LERC", "COMPRESS=JPEG",
                             "LEVEL=1", "PREDICTOR=1"}) {
    options_ = {};
    ASSERT_EQ("", datasources::ReadLevelOption(option, options_));
    CheckAll({.codec = COMPRESSION_ADOBE_DEFLATE, .predictor = 2}, kByte, 1);
  }
}

}  // namespace
}  // namespace orin::testing
