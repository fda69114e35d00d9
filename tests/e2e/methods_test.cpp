/// Five methods on files: levels read back with libtiff hold the bits that the slow twins make.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cmath>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>

#include "host/datasources/formats.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/warning.h"
#include "processes/overviews/createoverviews.h"
#include "tests/e2e/tiffpicture.h"
#include "tests/e2e/twinlevels.h"
#include "tests/testing/randomvalues.h"

namespace orin::testing {
namespace {

using ::testing::Combine;
using ::testing::ElementsAre;
using ::testing::Values;

/// A method, and whether the levels go to the side-car.
using Way = std::tuple<QRTOverviewResampleType, bool>;

constexpr const char* kMethodNames[] = {"Nearest", "Average", "Mode", "Bilinear", "Bicubic"};

/// From the image: 2, and for average 3 and 5. Else 3 from 2, 4 from 3 (average: from 2), 5 from 4,
/// 6 from 5 (average: from 3).
const std::vector<unsigned> kLevels = {2, 3, 4, 5, 6};

/// A value such as the type's files hold: any integer, or decimals of several magnitudes.
template <class T>
T AnyValue(Random& random) {
  if constexpr (std::is_integral_v<T>) return AnyBits<T>(random);
  else
    return static_cast<T>(static_cast<double>(random.Between(-1000000, 1000000)) / 7 *
                          std::pow(10.0, static_cast<double>(random.Between(-3, 3))));
}

/// Noise in which one value of three repeats its left neighbour, and one the upper one.
template <class T>
Picture<T> Noise(Picture<T> picture, uint64_t seed) {
  Random random(seed);
  for (uint32_t y = 0; y < picture.height; ++y)
    for (uint32_t x = 0; x < picture.width; ++x)
      for (uint32_t k = 0; k < picture.PerPixel(); ++k) {
        T& value = picture.At(x, y)[k];
        const int64_t kind = random.Between(0, 2);
        if (kind == 1 && x > 0) value = picture.At(x - 1, y)[k];
        else if (kind == 2 && y > 0) value = picture.At(x, y - 1)[k];
        else value = AnyValue<T>(random);
      }
  return picture;
}

/// Puts no data into a corner, over a band, and here and there; and its value into single channels
/// here and there.
template <class T>
void PutNoData(Picture<T>& picture, T noData, uint64_t seed) {
  Random random(seed);
  for (uint32_t y = 0; y < picture.height; ++y)
    for (uint32_t x = 0; x < picture.width; ++x) {
      const bool area = (x < 60 && y < 45) || (y > 200 && y < 231);
      if (area || random.OneIn(3)) std::fill_n(picture.At(x, y), picture.PerPixel(), noData);
      if (random.OneIn(4)) *picture.At(x, y, uint32_t(random.Bits() % picture.channels)) = noData;
    }
}

std::string BytesOf(const std::string& file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

template <class T>
void ExpectSameBits(const Picture<T>& expected, const Picture<T>& actual) {
  ASSERT_EQ(expected.values.size(), actual.values.size());
  const size_t perRow = size_t{expected.width} * expected.PerPixel();
  for (size_t i = 0; i < expected.values.size(); ++i)
    ASSERT_EQ(0, std::memcmp(&expected.values[i], &actual.values[i], sizeof(T)))
        << "row " << i / perRow << ", value " << i % perRow << ": " << +actual.values[i]
        << " in place of " << +expected.values[i];
}

/// Files of one test in a scratch folder; the TIFF driver alone, and what was warned of.
class MethodsOnFiles : public ::testing::TestWithParam<Way> {
 protected:
  MethodsOnFiles() {
    datasources::FormatRegistry::Instance().Clear();
    drivers::RegisterTiffDriver();
    TIFFSetWarningHandler(nullptr);
    replaced_ = tarn::Warning::SetSink(
        [this](const tarn::Report& report) { warnings_.push_back(report.message); });
    std::string name = (std::filesystem::temp_directory_path() / "orin-methods-XXXXXX").string();
    if (!mkdtemp(name.data())) ADD_FAILURE() << "no scratch folder";
    folder_ = name;
  }
  ~MethodsOnFiles() override {
    tarn::Warning::SetSink(replaced_);
    datasources::FormatRegistry::Instance().Clear();
    std::filesystem::remove_all(folder_);
  }

  QRTOverviewResampleType Method() const { return std::get<0>(GetParam()); }
  bool External() const { return std::get<1>(GetParam()); }
  std::string Image() const { return (folder_ / "picture.tif").string(); }
  std::string LevelFile() const { return External() ? Image() + ".ovr" : Image(); }

  bool Build(QRTOverviewResampleType method, const std::vector<unsigned>& levels,
             bool force = false) {
    CreateFileOverviews job(Image());
    job.SaveToKvx(External());
    job.SetPyramidType(method);
    job.SetPyramidLevels(levels, force);
    return job.Generate();
  }

  template <class T>
  Picture<T> Level(const Picture<T>& image, const Storage& storage, unsigned level) const {
    Picture<T> read(image.width / level, image.height / level, image.channels, image.components);
    ReadLevel(LevelFile(), storage, read);
    return read;
  }

  template <class T>
  void ExpectTwins(const Picture<T>& image, const Storage& storage,
                   const std::vector<unsigned>& levels = kLevels) {
    WritePicture(Image(), image, storage);
    ASSERT_TRUE(Build(Method(), levels));
    EXPECT_THAT(warnings_, ElementsAre());
    Pass pass{Method(), {}};
    if (!storage.noData.empty()) pass.noData = std::stod(storage.noData);
    const auto expected = TwinLevels(image, levels, pass, External());
    for (const unsigned level : levels) {
      SCOPED_TRACE("level " + std::to_string(level));
      ExpectSameBits(expected.at(level), Level(image, storage, level));
    }
  }

  std::filesystem::path folder_;
  std::vector<std::string> warnings_;
  tarn::ReportSink replaced_;
};

const auto kEverywhere = Values(false, true);
std::string NameOf(const ::testing::TestParamInfo<Way>& info) {
  return std::string(kMethodNames[std::get<0>(info.param)]) +
         (std::get<1>(info.param) ? "BesideTheFile" : "InTheFile");
}

using FiveMethods = MethodsOnFiles;
INSTANTIATE_TEST_SUITE_P(All, FiveMethods,
                         Combine(Values(ResampleNearest, ResampleAverage, ResampleMode,
                                        ResampleBilinear, ResampleBicubic),
                                 kEverywhere),
                         NameOf);

TEST_P(FiveMethods, MakeTheTwinsLevelsOfColourPictures) {
  ExpectTwins(Noise<uint8_t>({613, 487, 3}, 1), {.photometric = PHOTOMETRIC_RGB});
}

TEST_P(FiveMethods, MakeTheTwinsLevelsOfColourPicturesWithNoData) {
  Picture<uint8_t> image = Noise<uint8_t>({421, 398, 3}, 2);
  PutNoData<uint8_t>(image, 0, 3);
  ExpectTwins(image, {.photometric = PHOTOMETRIC_RGB, .tile = 64, .noData = "0"});
}

TEST_P(FiveMethods, MakeTheTwinsLevelsOfAnElevationModelWithNoData) {
  Picture<int16_t> image = Noise<int16_t>({502, 377, 1}, 4);
  PutNoData<int16_t>(image, -9999, 5);
  ExpectTwins(image, {.compression = COMPRESSION_ADOBE_DEFLATE, .noData = "-9999"});
}

TEST_P(FiveMethods, MakeTheTwinsLevelsOfSinglePrecision) {
  ExpectTwins(Noise<float>({389, 611, 2}, 6), {.tile = 128, .planar = true});
}

TEST_P(FiveMethods, MakeTheTwinsLevelsOfSinglePrecisionWithNoData) {
  Picture<float> image = Noise<float>({401, 333, 1}, 7);
  PutNoData<float>(image, -32767.5f, 8);
  ExpectTwins(image, {.compression = COMPRESSION_LZW, .noData = "-32767.5"});
}

TEST_P(FiveMethods, MakeTheTwinsLevelsOfDoublePrecision) {
  ExpectTwins(Noise<double>({457, 391, 1}, 9), {});
}

TEST_P(FiveMethods, MakeTheTwinsLevelsOfAPictureOfManyBlocks) {
  // Too large for one block: 1.4 million pixels of 24 bytes fill what a step may take.
  ExpectTwins(Noise<double>({1703, 1409, 3}, 10), {.tile = 256}, {2, 3, 4});
}

TEST_P(FiveMethods, MakeTheTwinsLevelsOfAPaletteAndKeepItsColours) {
  Picture<uint8_t> image = Noise<uint8_t>({530, 412, 1}, 11);
  for (uint8_t& index : image.values) index %= 12;
  ExpectTwins(image, {.photometric = PHOTOMETRIC_PALETTE, .compression = COMPRESSION_LZW});
  const std::set<uint8_t> classes(image.values.begin(), image.values.end());
  if (Method() != ResampleNearest && Method() != ResampleMode) return;
  for (const unsigned level : kLevels)
    for (const uint8_t index : Level(image, {.photometric = PHOTOMETRIC_PALETTE}, level).values)
      ASSERT_TRUE(classes.count(index)) << "level " << level << " invents " << +index;
}

using MethodsForComplexData = MethodsOnFiles;
INSTANTIATE_TEST_SUITE_P(All, MethodsForComplexData,
                         Combine(Values(ResampleNearest, ResampleAverage), kEverywhere), NameOf);

TEST_P(MethodsForComplexData, MakeTheTwinsLevelsOfComplexIntegers) {
  ExpectTwins(Noise<int16_t>({431, 377, 1, 2}, 12), {});
}

TEST_P(MethodsForComplexData, MakeTheTwinsLevelsOfSeveralComplexChannels) {
  ExpectTwins(Noise<int16_t>({307, 299, 2, 2}, 13), {.tile = 64});
}

using MethodsForRealData = MethodsOnFiles;
INSTANTIATE_TEST_SUITE_P(All, MethodsForRealData,
                         Combine(Values(ResampleMode, ResampleBilinear, ResampleBicubic),
                                 kEverywhere),
                         NameOf);

TEST_P(MethodsForRealData, RefuseComplexFilesAndLeaveThemAlone) {
  WritePicture(Image(), Noise<int16_t>({307, 299, 1, 2}, 14), {});
  const std::string before = BytesOf(Image());
  EXPECT_FALSE(Build(Method(), kLevels));
  EXPECT_THAT(warnings_, ElementsAre("Only AVER or NEAREST is supported for complex data."));
  EXPECT_EQ(before, BytesOf(Image()));
  EXPECT_FALSE(std::filesystem::exists(Image() + ".ovr"));
}

using AnyPlace = MethodsOnFiles;
INSTANTIATE_TEST_SUITE_P(All, AnyPlace, Combine(Values(ResampleNearest), kEverywhere), NameOf);

TEST_P(AnyPlace, NoTwoMethodsMakeTheSameLevel) {
  const Picture<uint8_t> image = Noise<uint8_t>({300, 260, 3}, 15);
  WritePicture(Image(), image, {.photometric = PHOTOMETRIC_RGB});
  std::set<std::vector<uint8_t>> made;
  for (const QRTOverviewResampleType method :
       {ResampleNearest, ResampleAverage, ResampleMode, ResampleBilinear, ResampleBicubic}) {
    ASSERT_TRUE(Build(method, {4}, true));
    made.insert(Level(image, {}, 4).values);
  }
  EXPECT_EQ(5u, made.size());
}

}  // namespace
}  // namespace orin::testing
