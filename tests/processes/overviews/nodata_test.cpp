/// Levels of images whose no-data value is no decimal number, beside those of a twin with one.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <random>

#include "host/services/text.h"
#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

constexpr QRTOverviewResampleType kMethods[] = {ResampleNearest, ResampleAverage, ResampleMode,
                                                ResampleBilinear, ResampleBicubic};
constexpr unsigned kLevels[] = {2, 3, 4, 7};

/// Blobs of no data in a noise of few values, so that `mode` finds some twice; also single pixels.
template <class T>
std::vector<T> PixelsWith(T noData, unsigned width, unsigned height, unsigned components) {
  std::mt19937 random(width * height + components);
  std::vector<T> values;
  for (unsigned y = 0; y < height; ++y)
    for (unsigned x = 0; x < width; ++x) {
      const bool isBlob = (x / 7 + y / 5) % 3 == 0 || random() % 9 == 0;
      for (unsigned c = 0; c < components; ++c) {
        const T value = T(100 + random() % 5);
        values.push_back(!isBlob ? value : c == 0 ? noData : T(0));
      }
    }
  return values;
}

template <class T>
drivers::MemoryRaster RasterWith(T noData, const std::string& declared, unsigned channels,
                                 bool isComplex) {
  constexpr unsigned kWidth = 61, kHeight = 47;
  drivers::MemoryRaster raster{kWidth, kHeight, {}, {{"NO_DATA_VALUE", declared}}, false};
  const std::vector<T> values = PixelsWith<T>(noData, kWidth, kHeight, isComplex ? 2 : 1);
  drivers::MemoryChannel channel{gobs::DataTypeOf<T>(isComplex), {}, {}};
  channel.samples.resize(values.size() * sizeof(T));
  std::memcpy(channel.samples.data(), values.data(), channel.samples.size());
  raster.channels.assign(channels, channel);
  return raster;
}

/// The values of a level of one channel.
template <class T>
std::vector<T> Level(RecordingHost& host, unsigned level, unsigned channel) {
  const auto& samples = host.Levels("a").levels.at(level).channels[channel - 1].samples;
  std::vector<T> values(samples.size() / sizeof(T));
  std::memcpy(values.data(), samples.data(), samples.size());
  return values;
}

struct Storage {
  int format;  ///< TIFF takes all channels in one pass
  unsigned channels;
  bool isComplex;
};

/// Builds levels of the image with `special` as no data, and of its twin with `plain`.
/// \param plain  a value that no method makes of the valid ones
template <class T>
void ExpectSameLevels(const Storage& storage, T special, const std::string& declared, T plain) {
  for (const QRTOverviewResampleType method : kMethods) {
    if (storage.isComplex && method > ResampleAverage) continue;
    SCOPED_TRACE(
        FormatString("method %d, format %d, %s", int(method), storage.format, declared.c_str()));
    const auto build = [&](RecordingHost& host, T noData, const std::string& text) {
      host.Put("a", RasterWith<T>(noData, text, storage.channels, storage.isComplex),
               storage.format);
      CreateFileOverviews job = JobFor("a", {std::begin(kLevels), std::end(kLevels)});
      job.SetPyramidType(method);
      ASSERT_TRUE(job.Generate());
    };
    std::vector<std::vector<T>> expected, first;  // of the last channel, and of the first
    {
      RecordingHost host;
      build(host, plain, std::to_string(plain));
      for (const unsigned level : kLevels) {
        expected.push_back(Level<T>(host, level, storage.channels));
        first.push_back(Level<T>(host, level, 1));
      }
    }
    RecordingHost host;
    build(host, special, declared);
    size_t noData = 0, valid = 0;
    for (size_t i = 0; i < std::size(kLevels); ++i) {
      const std::vector<T> actual = Level<T>(host, kLevels[i], storage.channels);
      ASSERT_EQ(expected[i].size(), actual.size());
      const size_t components = storage.isComplex ? 2 : 1;
      for (size_t k = 0; k < actual.size(); k += components) {
        // The average of two complex channels fills the second one with 0; a stand-in's not.
        const bool isFill = first[i][k] == plain;
        ++(isFill ? noData : valid);
        const T wanted = isFill ? special : expected[i][k];
        ASSERT_TRUE(actual[k] == wanted || (actual[k] != actual[k] && wanted != wanted))
            << "level " << kLevels[i] << ", value " << k << ": " << actual[k];
      }
    }
    EXPECT_GT(noData, 0u);
    EXPECT_GT(valid, 0u);
  }
}

constexpr Storage kStorages[] = {
    {kFormatTiff, 1, false}, {kFormatTiff, 3, false}, {kFormatMemory, 2, false}};

TEST(NoDataLevels, HaveNoRimRoundNaN) {
  for (const Storage& storage : kStorages) {
    ExpectSameLevels<float>(storage, NAN, "nan", -5e6f);
    ExpectSameLevels<double>(storage, NAN, "1.#QNAN", -5e6);
  }
}

TEST(NoDataLevels, HaveNoRimRoundInfinities) {
  for (const Storage& storage : kStorages) {
    ExpectSameLevels<float>(storage, -HUGE_VALF, "-inf", -5e6f);
    ExpectSameLevels<double>(storage, HUGE_VAL, "inf", -5e6);
  }
}

TEST(NoDataLevels, HaveNoRimRoundNaNInComplexImages) {
  for (const Storage& storage : {Storage{kFormatTiff, 1, true}, Storage{kFormatTiff, 2, true},
                                 Storage{kFormatMemory, 2, true}}) {
    ExpectSameLevels<float>(storage, NAN, "nan", -5e6f);
    ExpectSameLevels<double>(storage, NAN, "nan", -5e6);
  }
}

TEST(NoDataLevels, HoldNegativeNoDataValuesOfSixtyFourBitIntegers) {
  for (const Storage& storage : kStorages)
    ExpectSameLevels<int64_t>(storage, -9999, "-9999", 1 << 20);
}

/// Levels of two channels that declare -5 and 9999, one after another.
std::vector<std::vector<short>> LevelsOfTwoValues(int format, unsigned channel) {
  drivers::MemoryRaster raster = RasterWith<short>(-5, "", 1, false);
  raster.metadata.clear();
  raster.channels.push_back(RasterWith<short>(9999, "", 1, false).channels[0]);
  raster.channels[0].metadata["NO_DATA_VALUE"] = "-5";
  raster.channels[1].metadata["NO_DATA_VALUE"] = "9999";
  RecordingHost host;
  host.Put("a", raster, format);
  CreateFileOverviews job = JobFor("a", {2, 4, 8});
  job.SetPyramidType(ResampleBilinear);
  EXPECT_TRUE(job.Generate());
  std::vector<std::vector<short>> levels;
  for (const unsigned level : {2, 4, 8}) levels.push_back(Level<short>(host, level, channel));
  return levels;
}

/// Whether the levels hold `fill`, and beside it nothing but means of the valid pixels.
::testing::AssertionResult HoldFillAndMeans(const std::vector<std::vector<short>>& levels,
                                            short fill) {
  for (const std::vector<short>& level : levels) {
    size_t filled = 0;
    for (const short value : level) {
      if (value == fill) ++filled;
      else if (value < 100 || value > 104) return ::testing::AssertionFailure() << value;
    }
    if (filled == 0 || filled == level.size()) return ::testing::AssertionFailure() << filled;
  }
  return ::testing::AssertionSuccess();
}

TEST(NoDataLevels, OfATiffWithSeveralValuesHoldTheFirstInAllChannels) {
  EXPECT_TRUE(HoldFillAndMeans(LevelsOfTwoValues(kFormatTiff, 1), -5));
  EXPECT_TRUE(HoldFillAndMeans(LevelsOfTwoValues(kFormatTiff, 2), -5));
}

TEST(NoDataLevels, OfOtherFilesWithSeveralValuesHoldEachChannelsOwn) {
  EXPECT_TRUE(HoldFillAndMeans(LevelsOfTwoValues(kFormatMemory, 1), -5));
  EXPECT_TRUE(HoldFillAndMeans(LevelsOfTwoValues(kFormatMemory, 2), 9999));
}

}  // namespace
}  // namespace orin::testing
