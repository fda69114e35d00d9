/// How a file is opened for overviews.
// SPDX-License-Identifier: MIT
#include "processes/overviews/opening.h"

#include "host/services/exception.h"
#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

struct Opened {
  std::string format;  ///< empty: nothing was opened
  datasources::AccessMode access = datasources::kReadOnly;
  bool readOnly = false;
};

Opened OpenIn(const std::string& file, std::optional<bool> external) {
  Opened answer;
  const auto dataset = overviews::OpenForOverviews(file, external, answer.readOnly);
  if (dataset) {
    answer.format = datasources::FormatNameOf(*dataset);
    answer.access = dataset->GetAccessMode();
  }
  return answer;
}

/// A TIFF, one that cannot be written, and a file whose format holds no levels.
class Opening : public ::testing::Test {
 protected:
  Opening() {
    host_.Put("tiff", NoiseOf(30, 20, 1));
    auto fixed = NoiseOf(30, 20, 1);
    fixed.readOnly = true;
    host_.Put("fixed", fixed);
    host_.Put("odd", NoiseOf(30, 20, 1), 99);
  }
  RecordingHost host_;
};

TEST_F(Opening, LeftToItselfGoesByTheFilesAbilities) {
  EXPECT_EQ("TIFF", OpenIn("tiff", std::nullopt).format);
  EXPECT_EQ("ZMBALL", OpenIn("fixed", std::nullopt).format);
  EXPECT_EQ("ZMBALL", OpenIn("odd", std::nullopt).format);
}

TEST_F(Opening, GoesWhereTheUserWantsTheLevels) {
  EXPECT_EQ("ZMBALL", OpenIn("tiff", true).format);
  EXPECT_EQ("TIFF", OpenIn("tiff", false).format);
  EXPECT_EQ("TIFF", OpenIn("fixed", false).format);  // the run refuses it
}

TEST_F(Opening, TellsWhetherUpdateWasRefused) {
  EXPECT_FALSE(OpenIn("tiff", true).readOnly);
  EXPECT_TRUE(OpenIn("fixed", true).readOnly);
}

TEST_F(Opening, ReopensForUpdateUnlessThatWasRefused) {
  EXPECT_EQ(datasources::kUpdate, OpenIn("tiff", true).access);
  EXPECT_EQ(datasources::kUpdate, OpenIn("odd", std::nullopt).access);
  EXPECT_EQ(datasources::kReadOnly, OpenIn("fixed", std::nullopt).access);
}

TEST_F(Opening, ReleasesTheFileBeforeItIsOpenedAgain) {
  OpenIn("odd", std::nullopt);
  const std::vector<std::string> log = host_.Log();
  ASSERT_LT(2u, log.size());
  EXPECT_EQ("Open(odd,update)", log[0]);
  EXPECT_EQ("~source", log[1]);
  EXPECT_EQ("Open(odd,read)", log[2]);
}

TEST(OpeningOfANamesake, OfTheGenericLayerIsNotReopened) {
  RecordingHost host({{"MYZMBX", "a format that keeps its name", 98, 0}});
  host.Put("a", NoiseOf(30, 20, 1), 98);
  EXPECT_EQ("MYZMBX", OpenIn("a", true).format);
  EXPECT_EQ("MYZMBX", OpenIn("a", std::nullopt).format);
  EXPECT_EQ(2u, host.Log("Open(a,update)").size());
  EXPECT_TRUE(host.Log("sidecar.Open").empty());
}

TEST_F(Opening, ThrowsTheReasonWhenThereIsNoWay) {
  bool readOnly = false;
  EXPECT_THROW(overviews::OpenForOverviews("missing", std::nullopt, readOnly), Exception);
  EXPECT_TRUE(readOnly);
}

}  // namespace
}  // namespace orin::testing
