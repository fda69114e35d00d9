// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <limits>

#include "host/drivers/gdal/gdalbands.h"
#include "host/drivers/gdal/gdalsource.h"
#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using datasources::AuxiliaryData;
using ::testing::HasSubstr;

/// What the source says of a picture stored as a virtual raster over TIFF, which keeps every type.
class GdalSource : public GdalFiles {
 protected:
  std::unique_ptr<datasources::IRasterDataset> OpenVrt(
      const Picture& picture, const std::function<void(GDALDataset&)>& edit = [](GDALDataset&) {}) {
    WritePicture(File("image.tif"), "GTiff", picture);
    const std::unique_ptr<GDALDataset> source(GDALDataset::Open(File("image.tif").c_str()));
    const std::unique_ptr<GDALDataset> vrt(
        GetGDALDriverManager()->GetDriverByName("VRT")->CreateCopy(
            File("image.vrt").c_str(), source.get(), FALSE, nullptr, nullptr, nullptr));
    edit(*vrt);
    vrt->FlushCache(false);
    return Open(File("image.vrt"));
  }
};

std::string FileNoData(datasources::IRasterDataset& dataset) {
  return dataset.GetSource()->MetadataOf({1}).GetFileMetadataValue(datasources::kNoDataKey);
}
std::string ChannelNoData(datasources::IRasterDataset& dataset, unsigned channel) {
  return dataset.GetSource()->MetadataOf({channel}).GetChanMetadataValue(datasources::kNoDataKey,
                                                                         1);
}

TEST_F(GdalSource, TellsEveryType) {
  const std::pair<GDALDataType, gobs::DataType> types[] = {
      {GDT_Byte, gobs::eDT_8U},
      {GDT_UInt16, gobs::DataTypeOf<uint16_t>()},
      {GDT_Int16, gobs::DataTypeOf<int16_t>()},
      {GDT_UInt32, gobs::DataTypeOf<uint32_t>()},
      {GDT_Int32, gobs::DataTypeOf<int32_t>()},
      {GDT_UInt64, gobs::DataTypeOf<uint64_t>()},
      {GDT_Int64, gobs::DataTypeOf<int64_t>()},
      {GDT_Float32, gobs::DataTypeOf<float>()},
      {GDT_Float64, gobs::DataTypeOf<double>()},
      {GDT_CInt16, gobs::DataTypeOf<int16_t>(true)},
      {GDT_CInt32, gobs::DataTypeOf<int32_t>(true)},
      {GDT_CFloat32, gobs::DataTypeOf<float>(true)},
      {GDT_CFloat64, gobs::DataTypeOf<double>(true)}};
  for (const auto& [stored, told] : types)
    EXPECT_EQ(told, OpenVrt({.type = stored})->GetSource()->TypeOf(1))
        << GDALGetDataTypeName(stored);
}

TEST_F(GdalSource, TellsOneBitSamplesAndSignedBytes) {
  WritePicture(File("bits.img"), "HFA", {.options = {"NBITS=1"}});
  EXPECT_EQ(gobs::eDT_BIT, Open(File("bits.img"))->GetSource()->TypeOf(1));
  WritePicture(File("signed.img"), "HFA", {.options = {"PIXELTYPE=SIGNEDBYTE"}});
  EXPECT_EQ(gobs::DataTypeOf<int8_t>(), Open(File("signed.img"))->GetSource()->TypeOf(1));
}

TEST_F(GdalSource, AnswersANoDataValueForTheFileWhenAllChannelsAgree) {
  const auto dataset = OpenVrt({.channels = 2}, [](GDALDataset& vrt) {
    vrt.GetRasterBand(1)->SetNoDataValue(200);
    vrt.GetRasterBand(2)->SetNoDataValue(200);
  });
  EXPECT_EQ("200", FileNoData(*dataset));
  EXPECT_EQ("", ChannelNoData(*dataset, 1));
}

TEST_F(GdalSource, AnswersANoDataValueForEachChannelWhenTheyDiffer) {
  const auto dataset = OpenVrt({.channels = 3}, [](GDALDataset& vrt) {
    vrt.GetRasterBand(1)->SetNoDataValue(1);
    vrt.GetRasterBand(3)->SetNoDataValue(3.5);
  });
  EXPECT_EQ("", FileNoData(*dataset));
  EXPECT_EQ("1", ChannelNoData(*dataset, 1));
  EXPECT_EQ("", ChannelNoData(*dataset, 2));
  EXPECT_EQ("3.5", ChannelNoData(*dataset, 3));
}

TEST_F(GdalSource, KeepsAllDigitsOfSixtyFourBits) {
  const auto least = OpenVrt({.type = GDT_Int64}, [](GDALDataset& vrt) {
    vrt.GetRasterBand(1)->SetNoDataValueAsInt64(std::numeric_limits<int64_t>::min());
  });
  EXPECT_EQ("-9223372036854775808", FileNoData(*least));
  const auto most = OpenVrt({.type = GDT_UInt64}, [](GDALDataset& vrt) {
    vrt.GetRasterBand(1)->SetNoDataValueAsUInt64(std::numeric_limits<uint64_t>::max());
  });
  EXPECT_EQ("18446744073709551615", FileNoData(*most));
}

TEST_F(GdalSource, AnswersNanAndInfinitiesAsDeclared) {
  const std::pair<double, const char*> texts[] = {
      {std::numeric_limits<double>::quiet_NaN(), "nan"},
      {std::numeric_limits<double>::infinity(), "inf"},
      {-std::numeric_limits<double>::infinity(), "-inf"}};
  for (const auto& [value, text] : texts) {
    const auto dataset = OpenVrt({.type = GDT_Float32}, [&](GDALDataset& vrt) {
      vrt.GetRasterBand(1)->SetNoDataValue(value);
    });
    EXPECT_EQ(text, FileNoData(*dataset));
  }
  const auto two = OpenVrt({.channels = 2, .type = GDT_Float32}, [](GDALDataset& vrt) {
    vrt.GetRasterBand(1)->SetNoDataValue(std::numeric_limits<double>::quiet_NaN());
    vrt.GetRasterBand(2)->SetNoDataValue(5);
  });
  EXPECT_EQ("", FileNoData(*two));
  EXPECT_EQ("nan", ChannelNoData(*two, 1));
  EXPECT_EQ("5", ChannelNoData(*two, 2));
}

TEST_F(GdalSource, PassesOnMetadata) {
  const auto dataset = OpenVrt({}, [](GDALDataset& vrt) {
    vrt.SetMetadataItem("SENSOR", "camera");
    vrt.GetRasterBand(1)->SetMetadataItem("COLOUR", "red=1");
  });
  const AuxiliaryData metadata = dataset->GetSource()->MetadataOf({1});
  EXPECT_EQ("camera", metadata.GetFileMetadataValue("SENSOR"));
  EXPECT_EQ("red=1", metadata.GetChanMetadataValue("COLOUR", 1));
}

TEST_F(GdalSource, TellsWhichChannelIsOpacity) {
  WritePicture(File("rgba.png"), "PNG", {.channels = 4});
  EXPECT_EQ(4u, Open(File("rgba.png"))->GetSource()->AlphaChannel());
  WritePicture(File("rgb.png"), "PNG", {.channels = 3});
  EXPECT_EQ(0u, Open(File("rgb.png"))->GetSource()->AlphaChannel());
}

TEST_F(GdalSource, TellsHowManyBitsOfASampleAreKept) {
  WritePicture(File("deep.jp2"), "JP2OpenJPEG", {.type = GDT_UInt16, .options = {"NBITS=12"}});
  EXPECT_EQ(12u, Open(File("deep.jp2"))->GetSource()->StoredBitsOf(1));
  WritePicture(File("four.img"), "HFA", {.options = {"NBITS=4"}});
  EXPECT_EQ(4u, Open(File("four.img"))->GetSource()->StoredBitsOf(1));
  WritePicture(File("eight.img"), "HFA", {});
  EXPECT_EQ(8u, Open(File("eight.img"))->GetSource()->StoredBitsOf(1));
}

TEST_F(GdalSource, TellsThatPixelsAreClasses) {
  const auto isOfClasses = [this](const std::function<void(GDALRasterBand&)>& edit) {
    return OpenVrt({}, [&](GDALDataset& vrt) { edit(*vrt.GetRasterBand(1)); })
        ->GetSource()
        ->HoldsClasses();
  };
  EXPECT_FALSE(isOfClasses([](GDALRasterBand&) {}));
  EXPECT_TRUE(isOfClasses([](GDALRasterBand& band) {
    GDALColorTable colours;
    const GDALColorEntry red = {255, 0, 0, 255};
    colours.SetColorEntry(0, &red);
    band.SetColorTable(&colours);
  }));
  EXPECT_TRUE(isOfClasses([](GDALRasterBand& band) {
    CPLStringList names;
    names.AddString("water");
    names.AddString("forest");
    band.SetCategoryNames(names.List());
  }));
  EXPECT_TRUE(
      isOfClasses([](GDALRasterBand& band) { band.SetMetadataItem("LAYER_TYPE", "thematic"); }));
  WritePicture(File("classes.gif"), "GIF", {});
  EXPECT_TRUE(Open(File("classes.gif"))->GetSource()->HoldsClasses());
}

TEST_F(GdalSource, HasNoLevelsOfItsOwnButInErdasImagine) {
  WritePicture(File("image.jpg"), "JPEG", {.width = 2000, .height = 2000});
  EXPECT_EQ(nullptr, Open(File("image.jpg"))->GetSource()->Levels());
}

TEST_F(GdalSource, RefusesToReadChannelsOfDifferentTypesTogether) {
  const auto dataset = OpenVrt({}, [](GDALDataset& vrt) { vrt.AddBand(GDT_Float32, nullptr); });
  EXPECT_EQ(gobs::DataTypeOf<float>(), dataset->GetSource()->TypeOf(2));
  EXPECT_TRUE(dataset->GetSource()->OpenReader({2}));
  EXPECT_THAT(RefusalOf([&] {
                dataset->GetSource()->OpenReader({1, 2});
              }),
              HasSubstr("image.vrt: its channels differ in type"));
}

}  // namespace
}  // namespace orin::tests
