// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/vrtnames.h"

#include <gtest/gtest.h>

namespace orin::tests {
namespace {

using drivers::NamesInVrtText;
using Names = std::vector<std::string>;

TEST(VrtNames, AreThoseOfSourcesAndGrids) {
  EXPECT_EQ((Names{"a.tif", "/b.tif", "c.tif", "lon.tif"}), NamesInVrtText(R"(<VRTDataset>
      <VRTRasterBand><SimpleSource><SourceFilename>a.tif</SourceFilename></SimpleSource>
      </VRTRasterBand><GDALWarpOptions><SourceDataset>/b.tif</SourceDataset>
      <RPCTransformer><DEMPath>c.tif</DEMPath></RPCTransformer></GDALWarpOptions>
      <Metadata><MDI key="X_DATASET">lon.tif</MDI><MDI key="SENSOR">d.tif</MDI></Metadata>
      </VRTDataset>)",
                                                                           "folder"));
}

TEST(VrtNames, AreCompletedWhereTheyAreSaidToBeRelative) {
  EXPECT_EQ((Names{"folder/a.tif", "b.tif", "folder/c.tif"}),
            NamesInVrtText("<V><SourceFilename relativeToVRT=\"1\">a.tif</SourceFilename>"
                           "<SourceFilename relativeToVRT=\"0\">b.tif</SourceFilename>"
                           "<sourcefilename relativetovrt='1'>c.tif</sourcefilename></V>",
                           "folder"));
}

TEST(VrtNames, LoseTheirEntities) {
  EXPECT_EQ((Names{"a&b<c'd.tif"}),
            NamesInVrtText("<V><SourceFilename>a&#38;b&lt;c&#x27;d.tif</SourceFilename></V>", ""));
}

TEST(VrtNames, OfATextInATextAreFound) {
  EXPECT_EQ((Names{"a.tif"}),
            NamesInVrtText("<V><SourceFilename>&lt;V&gt;&lt;SourceFilename&gt;a.tif"
                           "&lt;/SourceFilename&gt;&lt;/V&gt;</SourceFilename></V>",
                           "folder"));
}

TEST(VrtNames, InCommentsAreNone) {
  EXPECT_EQ(Names(), NamesInVrtText("<V><!-- <SourceFilename>a</SourceFilename> --></V>", ""));
}

TEST(VrtNames, OfATextThatIsNoXmlAreUnknown) {
  EXPECT_FALSE(NamesInVrtText("<V><SourceFilename>a.tif", ""));
  EXPECT_FALSE(NamesInVrtText("", ""));
  std::string deep;
  for (int i = 0; i < 5000; ++i) deep += "<V>";
  for (int i = 0; i < 5000; ++i) deep += "</V>";
  EXPECT_FALSE(NamesInVrtText(deep, "")) << "the stack is not unlimited";
}

}  // namespace
}  // namespace orin::tests
