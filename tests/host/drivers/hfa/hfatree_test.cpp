// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfatree.h"

#include <cstring>

#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using drivers::HfaPyramid;
using drivers::ReadHfaPyramid;

class HfaTree : public GdalFiles {
 protected:
  void AddLevels(const std::string& file, std::vector<int> levels, std::vector<int> channels = {}) {
    const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file.c_str(), GDAL_OF_UPDATE));
    ASSERT_EQ(CE_None,
              dataset->BuildOverviews("NONE", int(levels.size()), levels.data(),
                                      int(channels.size()), channels.data(), nullptr, nullptr));
  }
};

TEST_F(HfaTree, OfAnImageWithoutLevelsHasAnEmptyListForEachChannel) {
  WritePicture(File("image.img"), "HFA", {.channels = 3});
  const HfaPyramid pyramid = ReadHfaPyramid(File("image.img"));
  ASSERT_EQ(3u, pyramid.channels.size());
  for (const auto& levels : pyramid.channels) EXPECT_TRUE(levels.empty());
  EXPECT_FALSE(pyramid.NamesAnotherFileThan("image.img"));
  EXPECT_FALSE(pyramid.isSpilled);
}

TEST_F(HfaTree, ListsFactorsInTheOrderInWhichTheyWereMade) {
  WritePicture(File("image.img"), "HFA", {.width = 500, .height = 400, .channels = 2});
  AddLevels(File("image.img"), {4, 2});
  AddLevels(File("image.img"), {37}, {2});
  const HfaPyramid pyramid = ReadHfaPyramid(File("image.img"));
  EXPECT_EQ(0, pyramid.Find(1, 4));
  EXPECT_EQ(1, pyramid.Find(1, 2));
  EXPECT_EQ(-1, pyramid.Find(1, 37));
  EXPECT_EQ(2, pyramid.Find(2, 37));
  EXPECT_EQ(-1, pyramid.Find(3, 2));
  EXPECT_EQ(-1, pyramid.Find(0, 2));
}

TEST_F(HfaTree, TellsWhenTheFileWasRenamed) {
  WritePicture(File("image.img"), "HFA", {.width = 500, .height = 400});
  AddLevels(File("image.img"), {2});
  EXPECT_FALSE(ReadHfaPyramid(File("image.img")).NamesAnotherFileThan("image.img"));
  std::filesystem::rename(File("image.img"), File("other.img"));
  EXPECT_TRUE(ReadHfaPyramid(File("other.img")).NamesAnotherFileThan("other.img"));
}

TEST_F(HfaTree, TellsWhereItemsStand) {
  WritePicture(File("image.img"), "HFA", {}, [&](GDALDataset& image) {
    for (const char* key : {"FIRST", "SECOND"}) image.SetMetadataItem(key, "text");
  });
  const auto item = drivers::FindHfaItem(File("image.img"), "SECOND");
  ASSERT_TRUE(item);
  EXPECT_EQ("text", BytesOf(File("image.img")).substr(item->text, item->textBytes - 1));
  EXPECT_FALSE(drivers::FindHfaItem(File("image.img"), "THIRD"));
}

TEST_F(HfaTree, OfAFileThatIsCutAnywhereIsReadOrRefusedButNeverFollowedForEver) {
  WritePicture(File("image.img"), "HFA", {.width = 100, .height = 80});
  AddLevels(File("image.img"), {2});
  const std::string whole = BytesOf(File("image.img"));
  for (size_t length = 0; length < whole.size(); length += length < 3000 ? 37 : 997) {
    WriteBytes(File("cut.img"), whole.substr(0, length));
    const std::string refusal = RefusalOf([&] { ReadHfaPyramid(File("cut.img")); });
    if (length < 100) {
      EXPECT_NE("", refusal) << length;
    }
  }
}

TEST_F(HfaTree, WhoseNodesFormARingIsRefused) {
  WritePicture(File("image.img"), "HFA", {.width = 100, .height = 80});
  std::string bytes = BytesOf(File("image.img"));
  const size_t layer = bytes.find("Layer_1");
  ASSERT_NE(std::string::npos, layer);
  const size_t node = layer - 24;
  for (int i = 0; i < 4; ++i) bytes[node + size_t(i)] = char(node >> (8 * i) & 255);
  WriteBytes(File("ring.img"), bytes);
  EXPECT_EQ(File("ring.img") + ": cannot be read: its list of contents is damaged.",
            RefusalOf([&] { ReadHfaPyramid(File("ring.img")); }));
}

}  // namespace
}  // namespace orin::tests
