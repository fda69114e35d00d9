// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfaspace.h"

#include <cstring>

#include "host/drivers/hfa/hfacompactor.h"
#include "host/drivers/hfa/hfatree.h"
#include "host/drivers/hfa/hfatreecopy.h"
#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using drivers::ByteRanges;
using drivers::FindHfaSpace;
using drivers::HfaSpace;

class HfaBytes : public GdalFiles {
 protected:
  HfaBytes() : file_(File("image.img")) {}

  /// Levels 2, 4 and 8 of two channels, whose pixels all differ.
  void WriteLevels() {
    WritePicture(file_, "HFA", {.width = 301, .height = 203, .channels = 2},
                 [](GDALDataset& image) { image.SetMetadataItem("SENSOR", "camera"); });
    const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str(), GDAL_OF_UPDATE));
    int levels[] = {2, 4, 8};
    ASSERT_EQ(CE_None, dataset->BuildOverviews("NEAREST", 3, levels, 0, nullptr, nullptr, nullptr));
  }

  /// Every level as the library reads it, by its width.
  std::map<int, std::string> Levels() const {
    const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str()));
    std::map<int, std::string> levels;
    for (int channel = 1; channel <= 2; ++channel)
      for (int i = 0; i < dataset->GetRasterBand(channel)->GetOverviewCount(); ++i) {
        GDALRasterBand& band = *dataset->GetRasterBand(channel)->GetOverview(i);
        std::string pixels(size_t(band.GetXSize()) * size_t(band.GetYSize()), '\0');
        EXPECT_EQ(CE_None,
                  band.RasterIO(GF_Read, 0, 0, band.GetXSize(), band.GetYSize(), pixels.data(),
                                band.GetXSize(), band.GetYSize(), GDT_Byte, 0, 0, nullptr));
        levels[band.GetXSize()] += pixels;
      }
    return levels;
  }

  std::string file_;
};

/// \returns the bytes that nothing refers to any more
ByteRanges RemoveLevels(const std::string& file, const std::vector<unsigned>& levels) {
  ByteRanges bytes = drivers::UsedHfaBytes(file);
  drivers::HfaTreeChanges changes;
  changes.removedLevels = levels;
  drivers::ChangeHfaTree(file, changes);
  bytes.Remove(drivers::UsedHfaBytes(file));
  return bytes;
}

TEST_F(HfaBytes, OfAFileOfAnotherProgramAreNearlyAllUsed) {
  WriteLevels();
  const HfaSpace space = FindHfaSpace(file_, {});
  EXPECT_EQ(std::filesystem::file_size(file_), space.size);
  EXPECT_LE(space.size, space.end);
  EXPECT_GT(2000u, space.free.Size());
  EXPECT_LT(20u, space.movables.size());
}

TEST_F(HfaBytes, BehindWhatIsUsedAreFree) {
  WriteLevels();
  const auto size = std::filesystem::file_size(file_);
  std::filesystem::resize_file(file_, size + 5000);
  const HfaSpace space = FindHfaSpace(file_, {});
  EXPECT_EQ(size, space.end);
  EXPECT_TRUE(space.free.Holds({size, size + 5000}));
}

TEST_F(HfaBytes, AreNeverFreeWhereAnUnknownNodeMayReferToThem) {
  WriteLevels();
  std::string bytes = BytesOf(file_);
  const size_t type = bytes.rfind("Edsc_Table");
  ASSERT_NE(std::string::npos, type);
  std::memcpy(&bytes[type], "Exyz", 4);
  WriteBytes(file_, bytes + std::string(5000, '\0'));
  const HfaSpace space = FindHfaSpace(file_, {});
  EXPECT_EQ(0u, space.free.Size());
  EXPECT_EQ(space.size, space.end);
  EXPECT_TRUE(space.movables.empty());
}

TEST_F(HfaBytes, InFrontOfWhatIsNoLevelAreFreeOnlyWhenGiven) {
  WriteLevels();
  const ByteRanges given = RemoveLevels(file_, {2, 4, 8});
  {  // what comes behind the levels that were
    const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str(), GDAL_OF_UPDATE));
    dataset->GetRasterBand(1)->SetStatistics(1, 2, 3, 4);
  }
  EXPECT_GT(5000u, FindHfaSpace(file_, {}).free.Size());
  EXPECT_LT(20000u, FindHfaSpace(file_, given).free.Size());
}

TEST_F(HfaBytes, OfRemovedLevelsAreTakenByTheOnesThatStay) {
  for (const std::vector<unsigned>& goes : std::vector<std::vector<unsigned>>{{2}, {4}, {2, 4}}) {
    WriteLevels();
    const auto before = Levels();
    const auto size = FindHfaSpace(file_, {}).end;
    const ByteRanges given = RemoveLevels(file_, goes);
    EXPECT_EQ(3 - goes.size(), Levels().size());
    while (drivers::MoveHfaLevelsDown(file_, FindHfaSpace(file_, given)) > 0) {
    }
    const HfaSpace space = FindHfaSpace(file_, given);
    std::filesystem::resize_file(file_, space.end);
    for (const auto& [width, pixels] : Levels()) EXPECT_TRUE(before.at(width) == pixels) << width;
    EXPECT_EQ(3 - goes.size(), Levels().size());
    EXPECT_GT(size - 4096 * goes.size(), space.end);
    const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str()));
    EXPECT_STREQ("camera", dataset->GetMetadataItem("SENSOR"));
    std::filesystem::remove(file_);
  }
}

/// The nodes stand between the image's data, and nothing but what they say tells that they are
/// free.
TEST_F(HfaBytes, OfNodesThatAChangedTreeReplacedAreFree) {
  WriteLevels();
  const uint64_t nodes = drivers::CountHfaNodes(file_) * drivers::kHfaNodeBytes;
  {  // data of the image behind all nodes
    const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str(), GDAL_OF_UPDATE));
    dataset->GetRasterBand(1)->SetStatistics(1, 2, 3, 4);
  }
  const uint64_t before = FindHfaSpace(file_, {}).free.Size();
  drivers::ChangeHfaTree(file_, {});
  EXPECT_LE(before + nodes, FindHfaSpace(file_, {}).free.Size());
  const std::unique_ptr<GDALDataset> dataset(GDALDataset::Open(file_.c_str()));
  EXPECT_STREQ("camera", dataset->GetMetadataItem("SENSOR"));
}

TEST_F(HfaBytes, OfATreeThatIsARingAreNoneToFind) {
  WriteLevels();
  std::string bytes = BytesOf(file_);
  const size_t node = bytes.find("Layer_1") - 24;
  for (int i = 0; i < 4; ++i) bytes[node + 12 + size_t(i)] = char(node >> (8 * i) & 255);  // child
  WriteBytes(file_, bytes);
  EXPECT_EQ(file_ + ": cannot be read: its list of contents is damaged.",
            RefusalOf([&] { FindHfaSpace(file_, {}); }));
}

}  // namespace
}  // namespace orin::tests
