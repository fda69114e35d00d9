// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfanamelist.h"

#include <optional>

#include "host/drivers/hfa/hfatree.h"
#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using drivers::HfaNameList;

std::vector<unsigned> FactorsIn(const HfaNameList& list) {
  std::vector<unsigned> factors;
  for (const drivers::HfaLevelName& level : list.Levels()) factors.push_back(level.factor);
  return factors;
}

class HfaNames : public GdalFiles {
 protected:
  /// Where the list of the only channel of a file with levels 2, 4 and 8 stands, and its data.
  std::pair<uint32_t, std::string> ListOfTheLibrary() const {
    WritePicture(File("image.img"), "HFA", {.width = 500, .height = 400});
    {
      const std::unique_ptr<GDALDataset> dataset(
          GDALDataset::Open(File("image.img").c_str(), GDAL_OF_UPDATE));
      int levels[] = {2, 4, 8};
      EXPECT_EQ(CE_None, dataset->BuildOverviews("NONE", 3, levels, 0, nullptr, nullptr, nullptr));
    }
    drivers::HfaTree tree(File("image.img"));
    const auto layers = drivers::HfaLayersOf(tree);
    for (const drivers::HfaNode& part : layers.at(0).parts)
      if (drivers::IsHfaNameList(part)) return {part.data, tree.DataOf(part)};
    return {};
  }
};

TEST_F(HfaNames, AreStoredAsTheLibraryStoresThem) {
  const auto [position, data] = ListOfTheLibrary();
  ASSERT_FALSE(data.empty());
  EXPECT_EQ((std::vector<unsigned>{2, 4, 8}), FactorsIn(HfaNameList(data)));
  EXPECT_TRUE(data == HfaNameList(data).DataAt(position));
  HfaNameList fresh;
  for (const char* name : {"2", "4", "8"})
    fresh.Add(std::string("image.img(:Layer_1:_ss_") + name + "_)");
  const std::string own = fresh.DataAt(position);
  const size_t used = data.find_last_not_of('\0') + 1;
  EXPECT_TRUE(data.substr(0, used) == own.substr(0, used));
}

TEST_F(HfaNames, LeaveRoomForMoreWhenTheyGoAndGetMoreWhenTheyDoNotFit) {
  const auto [position, data] = ListOfTheLibrary();
  HfaNameList list(data);
  EXPECT_FALSE(list.Remove({16}));
  EXPECT_TRUE(list.Remove({4, 16}));
  EXPECT_EQ(data.size(), list.DataAt(7).size());
  EXPECT_EQ((std::vector<unsigned>{2, 8}), FactorsIn(HfaNameList(list.DataAt(7))));
  EXPECT_FALSE(list.Has(4));
  for (unsigned factor = 1; factor < 200; ++factor)
    list.Add("image.img(:Layer_1:_ss_" + std::to_string(factor * 3) + "_)");
  EXPECT_LT(data.size(), list.DataAt(7).size());
  EXPECT_EQ(201u, FactorsIn(HfaNameList(list.DataAt(7))).size());
}

TEST_F(HfaNames, EndWhereTheirLengthsLeadBeyondTheData) {
  const auto [position, data] = ListOfTheLibrary();
  for (size_t length = 0; length < 200; ++length)
    EXPECT_GE(3u, FactorsIn(HfaNameList(data.substr(0, length))).size());
  std::string huge = data;
  for (size_t at = 0; at < 120; ++at) {
    huge = data;
    drivers::PutHfaNumber(huge, at, 0xffffffff);
    EXPECT_GE(3u, FactorsIn(HfaNameList(huge)).size());
  }
}

}  // namespace
}  // namespace orin::tests
