// SPDX-License-Identifier: MIT
#include "host/drivers/common/auxiliaryfile.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

namespace orin::tests {
namespace {

using drivers::AuxiliaryFile;
using drivers::ParseAuxiliaryText;
using NoData = std::map<unsigned, std::string>;

NoData NoDataIn(const std::string& text) { return ParseAuxiliaryText(text).noData; }

std::string OfBand(const std::string& value) {
  return "<PAMDataset><PAMRasterBand band=\"1\">" + value + "</PAMRasterBand></PAMDataset>";
}

TEST(AuxiliaryText, DeclaresValuesByChannel) {
  EXPECT_EQ((NoData{{1, "60"}, {3, "-9999.5"}}),
            NoDataIn("<PAMDataset><PAMRasterBand band=\"1\"><NoDataValue>60</NoDataValue>"
                     "</PAMRasterBand><PAMRasterBand band=\"2\"/>"
                     "<PAMRasterBand band='3'><Description>x</Description>"
                     "<NoDataValue> -9999.5\n</NoDataValue></PAMRasterBand></PAMDataset>"));
}

TEST(AuxiliaryText, HoldsTheExactValueBesideARoundedOne) {
  EXPECT_EQ((NoData{{1, "-3.4028234663852886e+38"}}),
            NoDataIn(OfBand("<NoDataValue le_hex_equiv=\"000000E0FFFFEFC7\">-3.4E+38"
                            "</NoDataValue>")));
  EXPECT_EQ((NoData{{1, "7"}}), NoDataIn(OfBand("<NoDataValue le_hex_equiv='12'>7</NoDataValue>")));
}

TEST(AuxiliaryText, IsReadAsOtherProgramsReadIt) {
  EXPECT_EQ((NoData{{1, "6"}}), NoDataIn("<pamdataset><pamrasterband band='1'><nodatavalue>6"
                                         "</nodatavalue></pamrasterband></pamdataset>"));
  EXPECT_EQ((NoData{{1, "62"}}),
            NoDataIn("<PAMDataset><PAMRasterBand band='1'><NoDataValue>60</NoDataValue>"
                     "<NoDataValue>61</NoDataValue></PAMRasterBand>"
                     "<PAMRasterBand band='1'><NoDataValue>62</NoDataValue></PAMRasterBand>"
                     "</PAMDataset>"));
  EXPECT_EQ(NoData(), NoDataIn(OfBand("<NoDataValue></NoDataValue>")));
}

TEST(AuxiliaryText, InLettersOfAnotherTimeIsRead) {
  EXPECT_EQ((NoData{{1, "60"}}), NoDataIn(OfBand("<Description>Stra\xDF"
                                                 "e</Description><NoDataValue>60</NoDataValue>")));
}

TEST(AuxiliaryText, ElsewhereOrDamagedSaysNothing) {
  const std::string value = "<NoDataValue>60</NoDataValue>";
  for (const std::string& text :
       {std::string(), std::string("no text"), std::string(100, '\0'),
        "<PAMDataset><PAMRasterBand band='1'>" + value + "</PAMRasterBand>",
        "<x>" + OfBand(value) + "</x>", "<PAMDataset>" + value + "</PAMDataset>",
        "<PAMDataset><PAMRasterBand>" + value + "</PAMRasterBand></PAMDataset>",
        "<PAMDataset><PAMRasterBand band='0'>" + value + "</PAMRasterBand></PAMDataset>",
        "<PAMDataset><PAMRasterBand band='1'><x>" + value + "</x></PAMRasterBand></PAMDataset>",
        "<!DOCTYPE a [<!ENTITY b 'c'>]>" + OfBand(value)})
    EXPECT_EQ(AuxiliaryFile(), ParseAuxiliaryText(text)) << text;
}

TEST(AuxiliaryText, CountsAsFarAsItGoesWhereItIsTheBeginningOfOne) {
  const std::string start =
      "<PAMDataset><PAMRasterBand band='1'><NoDataValue>60</NoDataValue><Desc";
  EXPECT_EQ((NoData{{1, "60"}}), ParseAuxiliaryText(start, false).noData);
}

TEST(AuxiliaryText, NamesCategories) {
  EXPECT_TRUE(ParseAuxiliaryText(OfBand("<CategoryNames/>")).namesCategories);
  EXPECT_FALSE(ParseAuxiliaryText(OfBand("<Note>&lt;CategoryNames></Note>")).namesCategories);
}

class AuxiliaryFiles : public ::testing::Test {
 protected:
  AuxiliaryFiles() {
    std::string name = (std::filesystem::temp_directory_path() / "orin-aux-XXXXXX").string();
    if (!mkdtemp(name.data())) ADD_FAILURE() << "no scratch folder";
    folder_ = name;
  }
  ~AuxiliaryFiles() override { std::filesystem::remove_all(folder_); }

  std::string Image() const { return (folder_ / "image.tif").string(); }
  std::string Beside() const { return Image() + ".aux.xml"; }

  std::filesystem::path folder_;
};

TEST_F(AuxiliaryFiles, AreReadAndMayBeAbsent) {
  EXPECT_EQ(AuxiliaryFile(), drivers::ReadAuxiliaryFile(Image()));
  std::ofstream(Beside()) << OfBand("<NoDataValue>60</NoDataValue>");
  EXPECT_EQ((NoData{{1, "60"}}), drivers::ReadAuxiliaryFile(Image()).noData);
}

TEST_F(AuxiliaryFiles, ThatAreNoRegularFilesSayNothingAtOnce) {
  ASSERT_EQ(0, mkfifo(Beside().c_str(), 0600));
  EXPECT_EQ(AuxiliaryFile(), drivers::ReadAuxiliaryFile(Image())) << "and nobody waits";
  std::filesystem::remove(Beside());
  std::filesystem::create_directory(Beside());
  EXPECT_EQ(AuxiliaryFile(), drivers::ReadAuxiliaryFile(Image()));
  std::filesystem::remove(Beside());
  std::filesystem::create_symlink("/dev/zero", Beside());
  EXPECT_EQ(AuxiliaryFile(), drivers::ReadAuxiliaryFile(Image()));
}

TEST_F(AuxiliaryFiles, OfAnySizeAreReadToALimit) {
  std::ofstream(Beside()) << "<PAMDataset><PAMRasterBand band='1'><NoDataValue>60</NoDataValue>";
  std::filesystem::resize_file(Beside(), uintmax_t{1} << 40);  // zeros, not stored
  EXPECT_EQ(AuxiliaryFile(), drivers::ReadAuxiliaryFile(Image())) << "zeros are no text";
}

}  // namespace
}  // namespace orin::tests
