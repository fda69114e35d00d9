// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/rasterinfo.h"

#include <gtest/gtest.h>

#include <complex>

namespace orin::app {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;

/// Two channels; level 2 inside, level 4 in the side-car with its second channel out of date.
RasterInfo Scene() {
  RasterInfo info{"scene.tif", "TIFF", "TIFF / GeoTIFF", 1001, 777, {gobs::eDT_8U, gobs::eDT_8U},
                  {},          {}};
  info.levels.push_back({2,
                         500,
                         388,
                         LevelPlace::kInternal,
                         "scene.tif",
                         "NEAREST",
                         1,
                         "Orin Overviews 0.1.0",
                         {true, true},
                         {true, true},
                         datasources::LevelStatus::kCurrent});
  info.levels.push_back({4,
                         250,
                         194,
                         LevelPlace::kSideCar,
                         "dir/scene.tif.ovr",
                         "",
                         0,
                         "",
                         {true, true},
                         {true, false},
                         datasources::LevelStatus::kUnfinished});
  return info;
}

TEST(RasterInfo, EveryTypeHasAName) {
  EXPECT_EQ("bit", TypeName(gobs::eDT_BIT));
  EXPECT_EQ("uint8", TypeName(gobs::eDT_8U));
  EXPECT_EQ("int8", TypeName(gobs::DataTypeOf<signed char>()));
  EXPECT_EQ("uint64", TypeName(gobs::DataTypeOf<uint64_t>()));
  EXPECT_EQ("float32", TypeName(gobs::DataTypeOf<float>()));
  EXPECT_EQ("complex int16", TypeName(gobs::DataTypeOf<int16_t>(true)));
}

TEST(RasterInfo, TheTableHasALineForEachLevel) {
  EXPECT_EQ(
      "scene.tif: 1001 x 777 pixels, channels: 2 (uint8), TIFF / GeoTIFF\n"
      "level  size       place          method   from  valid       program\n"
      "2      500 x 388  inside         NEAREST  1     yes         Orin Overviews 0.1.0\n"
      "4      250 x 194  scene.tif.ovr  -        -     channels 1  -\n",
      TableOf(Scene()));
}

TEST(RasterInfo, ALevelIsValidStaleUnverifiedOrNot) {
  using datasources::LevelStatus;
  const auto validOf = [](LevelStatus status, std::vector<bool> valid) {
    RasterInfo info = Scene();
    info.levels.resize(1);
    info.levels[0].status = status;
    info.levels[0].validChannels = std::move(valid);
    const std::string table = TableOf(info);
    const size_t column = table.find("valid", table.find("level  size"));
    const size_t start = table.find('\n') + 1;
    const size_t row = table.find('\n', start) + 1;
    const std::string text = table.substr(row + column - start);
    return text.substr(0, text.find("  "));
  };
  EXPECT_EQ("yes", validOf(LevelStatus::kCurrent, {true, true}));
  EXPECT_EQ("channels 2", validOf(LevelStatus::kCurrent, {false, true}));
  EXPECT_EQ("no", validOf(LevelStatus::kUnfinished, {false, false}));
  EXPECT_EQ("stale", validOf(LevelStatus::kStale, {false, false}));
  EXPECT_EQ("unverified", validOf(LevelStatus::kUnverified, {true, true}));
  EXPECT_EQ("channels 1 unverified", validOf(LevelStatus::kUnverified, {true, false}));
}

TEST(RasterInfo, TheTableTellsOfMasksAndAlphaWhereThereAreAny) {
  RasterInfo info = Scene();
  info.hasMask = true;
  info.levels[1].hasMask = true;
  EXPECT_EQ(
      "scene.tif: 1001 x 777 pixels, channels: 2 (uint8), TIFF / GeoTIFF\n"
      "no data by: a mask\n"
      "level  size       place          method   from  valid       mask  program\n"
      "2      500 x 388  inside         NEAREST  1     yes         no    Orin Overviews 0.1.0\n"
      "4      250 x 194  scene.tif.ovr  -        -     channels 1  yes   -\n",
      TableOf(info));
  info.levels.clear();
  info.alphaChannel = 2;
  EXPECT_NE(std::string::npos, TableOf(info).find("no data by: a mask, alpha (channel 2)\n"));
  info.hasMask = false;
  EXPECT_NE(std::string::npos, TableOf(info).find("no data by: alpha (channel 2)\n"));
}

TEST(RasterInfo, JsonTellsOfMasksAndAlpha) {
  RasterInfo info = Scene();
  EXPECT_NE(std::string::npos, JsonOf(info).find("\"alphaChannel\": null"));
  EXPECT_EQ(std::string::npos, JsonOf(info).find("\"mask\": true"));
  info.alphaChannel = 2;
  info.levels[0].hasMask = true;
  const std::string json = JsonOf(info);
  EXPECT_NE(std::string::npos, json.find("\"alphaChannel\": 2"));
  EXPECT_NE(std::string::npos, json.find("\"mask\": true"));
}

TEST(RasterInfo, WithoutLevelsTheTableSaysSo) {
  RasterInfo info = Scene();
  info.levels.clear();
  EXPECT_EQ(
      "scene.tif: 1001 x 777 pixels, channels: 2 (uint8), TIFF / GeoTIFF\n"
      "no overview levels\n",
      TableOf(info));
}

TEST(RasterInfo, ChannelsOfSeveralTypesAreAllNamed) {
  RasterInfo info = Scene();
  info.channels = {gobs::eDT_8U, gobs::eDT_BIT, gobs::eDT_8U};
  EXPECT_NE(std::string::npos, TableOf(info).find("channels: 3 (uint8, bit, uint8)"))
      << TableOf(info);
}

TEST(RasterInfo, JsonSaysNullForWhatIsUnknown) {
  const std::string json = JsonOf(Scene());
  EXPECT_NE(std::string::npos, json.find("\"method\": null"));
  EXPECT_NE(std::string::npos, json.find("\"sourceLevel\": null"));
  EXPECT_NE(std::string::npos, json.find("\"program\": null"));
  EXPECT_NE(std::string::npos, json.find("\"fingerprint\": null"));
}

TEST(RasterInfo, JsonTakesAFileNameThatIsNotUtf8) {
  RasterInfo info = Scene();
  info.file = "caf\xE9.tif";
  EXPECT_NE(std::string::npos, JsonOf(info).find("\"caf\xEF\xBF\xBD.tif\""));
}

}  // namespace
}  // namespace orin::app
