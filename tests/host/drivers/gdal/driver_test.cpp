// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <set>

#include "host/drivers/gdal/gdalformats.h"
#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using ::testing::HasSubstr;

class GdalDriver : public GdalFiles {};

TEST_F(GdalDriver, RegistersNoOtherDriversThanOurs) {
  std::set<std::string> names;
  for (int i = 0; i < GetGDALDriverManager()->GetDriverCount(); ++i)
    names.insert(GetGDALDriverManager()->GetDriver(i)->GetDescription());
  const std::set<std::string> ours = {
      "AAIGrid", "BMP",  "COG",       "EHdr",    "ENVI",        "GIF",  "GRIB",
      "GTiff",   "HDF5", "HDF5Image", "HFA",     "JP2OpenJPEG", "JPEG", "MEM",
      "MRF",     "NITF", "PNG",       "RRASTER", "VRT",         "WEBP", "netCDF"};
  for (const std::string& name : names) EXPECT_TRUE(ours.contains(name)) << name;
  for (const char* always : {"GTiff", "HFA", "VRT", "MEM"}) EXPECT_TRUE(names.contains(always));
}

TEST_F(GdalDriver, KnowsEveryFormatByItsOwnCodeAndName) {
  for (const char* driver : {"HFA", "PNG", "JPEG", "BMP", "GIF", "WEBP", "JP2OpenJPEG", "ENVI"}) {
    if (!GetGDALDriverManager()->GetDriverByName(driver)) continue;
    const std::string file = File(std::string("image.") + driver);
    WritePicture(file, driver, {.channels = std::string(driver) == "WEBP" ? 3 : 1});
    const ZMBInfo_s* info = ZMBGetFormatInfo(ZMBTestOpen(file.c_str()));
    ASSERT_TRUE(info) << driver;
    EXPECT_EQ(std::string(driver) == "HFA", info->nativeOverviews != 0) << driver;
    EXPECT_EQ(info->name, datasources::FormatNameOf(*Open(file)));
  }
}

TEST_F(GdalDriver, NamesErdasImagineAsTheLibraryExpects) {
  WritePicture(File("image.img"), "HFA", {});
#ifdef ORIN_HAS_HFA_LEVELS
  EXPECT_EQ(kFormatErdas, ZMBTestOpen(File("image.img").c_str()));
  EXPECT_EQ("ZMBERDAS", ZMBGetFormatInfo(kFormatErdas)->name);
#else  // where levels go beside the file, it is no format that holds any
  const ZMBFormatType code = ZMBTestOpen(File("image.img").c_str());
  EXPECT_EQ("ERDAS", ZMBGetFormatInfo(code)->name);
  EXPECT_NE(kFormatErdas, code);
#endif
}

TEST_F(GdalDriver, NamesNoFormatSoThatItCouldBeTakenForAnother) {
  for (const ZMBInfo_s& record : drivers::GdalFormatRecords()) {
    EXPECT_EQ(std::string::npos, record.name.find("TIFF")) << record.name;
    EXPECT_EQ(record.code == kFormatErdas, record.name.find("ZMB") != std::string::npos);
  }
}

TEST_F(GdalDriver, LeavesLocalTiffFilesToTheTiffDriver) {
  WritePicture(File("image.tif"), "GTiff", {});
  EXPECT_EQ(kFormatTiff, ZMBTestOpen(File("image.tif").c_str()));
  EXPECT_EQ("TIFF", datasources::FormatNameOf(*Open(File("image.tif"))));
}

TEST_F(GdalDriver, CallsAPageOfATiffAPage) {
  WritePicture(File("image.tif"), "GTiff", {});
  for (const char* prefix : {"GTIFF_DIR:1:", "gtiff_dir:1:"}) {
    const auto page = Open(prefix + File("image.tif"));
    ASSERT_TRUE(page);
    EXPECT_EQ("GTIF-PAGE", datasources::FormatNameOf(*page));
    EXPECT_EQ("page of a GeoTIFF", ZMBGetFormatInfo(page->GetFileFormatCode())->description);
  }
  EXPECT_EQ("GTIF-REMOTE", datasources::FormatNameOf(*Open("/vsisubfile/0," + File("image.tif"))));
}

TEST_F(GdalDriver, DoesNotTakeDirectoriesMissingFilesOrMemoryForRasters) {
  WriteBytes(File("text.png"), "no picture");
  for (const std::string& name :
       {folder_.string(), File("missing.png"), File("text.png"), std::string(""),
        std::string("MEM:::DATAPOINTER=1,PIXELS=1000,LINES=1000"), std::string("a:b:c")})
    EXPECT_EQ(kFormatUnknown, ZMBTestOpen(name.c_str())) << name;
}

TEST_F(GdalDriver, RefusesToOpenForUpdateWhatIsNoFileOfItsOwn) {
  WritePicture(File("image.png"), "PNG", {});
  const std::string name = "/vsisubfile/0," + File("image.png");
  EXPECT_TRUE(Open(name));
  EXPECT_THAT(RefusalOf([&] { Open(name, datasources::kUpdate); }),
              HasSubstr(name + ": cannot be opened for writing"));
}

TEST_F(GdalDriver, RefusesASideCarOfWhatIsNoFileOfItsOwnAndSaysWhereItWouldBe) {
  WritePicture(File("image.png"), "PNG", {});
  const std::string name = "/vsisubfile/0," + File("image.png");
  const std::unique_ptr<datasources::IDataset> dataset(
      datasources::DatasetManager::GetInstance()->OpenFormat("ZMBALL", name,
                                                             datasources::kReadOnly));
  auto* store = dynamic_cast<datasources::IRasterDataset&>(*dataset).GetSource()->Levels();
  EXPECT_TRUE(store->List().empty());
  EXPECT_THAT(RefusalOf([&] { store->Create(2, {1}, "NEAREST"); }), HasSubstr(name + ".ovr"));
}

TEST_F(GdalDriver, KeepsLevelsOfAnErdasImageThatIsOpenForReadingBesideIt) {
  WritePicture(File("image.img"), "HFA", {});
  const auto dataset = Open(File("image.img"));
  EXPECT_EQ("ZMBERDAS", datasources::FormatNameOf(*dataset));
  dataset->GetSource()->Levels()->Create(2, {1}, "NEAREST");
  EXPECT_EQ(File("image.img.ovr"), dataset->GetSource()->Levels()->List().at(0).file);
}

}  // namespace
}  // namespace orin::tests
