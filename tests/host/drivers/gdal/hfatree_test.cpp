// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfatree.h"

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

TEST_F(HfaTree, TellsWhereItemsStandAndHowTheyAreTakenOut) {
  const std::vector<std::string> keys = {"FIRST", "SECOND", "THIRD"};
  for (const std::string& removed : keys) {
    WritePicture(File("image.img"), "HFA", {}, [&](GDALDataset& image) {
      for (const std::string& key : keys) image.SetMetadataItem(key.c_str(), (key + "!").c_str());
    });
    std::string bytes = BytesOf(File("image.img"));
    const auto item = drivers::FindHfaItem(File("image.img"), removed);
    ASSERT_TRUE(item);
    EXPECT_EQ(removed + "!", bytes.substr(item->text, item->textBytes - 1));
    drivers::HfaTree tree(File("image.img"));
    const auto lists = drivers::HfaItemListsOf(tree);
    ASSERT_EQ(1u, lists.size());
    for (const drivers::HfaPointer& pointer : drivers::PointersWithout(
             lists[0],
             [&](const drivers::HfaNode& node) { return drivers::IsHfaItem(node, removed); }))
      std::memcpy(&bytes[pointer.position], &pointer.value, sizeof pointer.value);
    WriteBytes(File("without.img"), bytes);
    EXPECT_FALSE(drivers::FindHfaItem(File("without.img"), removed));
    const std::unique_ptr<GDALDataset> left(GDALDataset::Open(File("without.img").c_str()));
    for (const std::string& key : keys) {
      const char* text = left->GetMetadataItem(key.c_str());
      EXPECT_EQ(key == removed ? "" : key + "!", text ? text : "");
    }
  }
  EXPECT_FALSE(drivers::FindHfaItem(File("image.img"), "FOURTH"));
}

TEST_F(HfaTree, LosesNodesThatFollowOneAnotherByOnePointer) {
  const std::vector<drivers::HfaNode> children = {
      {.position = 100, .pointer = 12, .next = 200, .name = "goes"},
      {.position = 200, .pointer = 100, .previous = 100, .next = 300, .name = "goes"},
      {.position = 300, .pointer = 200, .previous = 200, .next = 400, .name = "stays"},
      {.position = 400, .pointer = 300, .previous = 300, .name = "goes"}};
  const auto pointers = drivers::PointersWithout(
      children, [](const drivers::HfaNode& node) { return node.name == "goes"; });
  ASSERT_EQ(3u, pointers.size());
  EXPECT_EQ(12u, pointers[0].position);  // the parent's first child
  EXPECT_EQ(300u, pointers[0].value);
  EXPECT_EQ(304u, pointers[1].position);  // what was before it
  EXPECT_EQ(0u, pointers[1].value);
  EXPECT_EQ(300u, pointers[2].position);  // what comes after it
  EXPECT_EQ(0u, pointers[2].value);
}

TEST_F(HfaTree, TellsTheListOfLevelsWithoutSome) {
  WritePicture(File("image.img"), "HFA", {.width = 500, .height = 400});
  AddLevels(File("image.img"), {2, 4, 8});
  drivers::HfaTree tree(File("image.img"));
  std::string data;
  const std::vector<drivers::HfaLayer> layers = drivers::HfaLayersOf(tree);
  for (const drivers::HfaNode& part : layers.at(0).parts)
    if (drivers::IsHfaNameList(part)) {
      data = tree.DataOf(part);
      EXPECT_TRUE(data == drivers::PlaceHfaNameList(data, part.data));  // as the library places it
    }
  EXPECT_EQ((std::vector<unsigned>{2, 4, 8}), drivers::FactorsInHfaList(data));
  const drivers::HfaNameList without = drivers::NamesWithout(data, {4, 16});
  EXPECT_EQ((std::vector<unsigned>{2, 8}), drivers::FactorsInHfaList(without.data));
  EXPECT_EQ(2u, without.names);
  EXPECT_TRUE(without.isShorter);
  EXPECT_EQ(data.size(), without.data.size());
  EXPECT_FALSE(drivers::NamesWithout(data, {16}).isShorter);
  EXPECT_EQ(0u, drivers::NamesWithout(data, {2, 4, 8}).names);
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
