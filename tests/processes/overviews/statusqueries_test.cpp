/// Questions about the overviews that files have.
// SPDX-License-Identifier: MIT
#include "processes/overviews/statusqueries.h"

#include <gtest/gtest.h>

#include <memory>

#include "host/datasources/datasetmanager.h"
#include "host/services/exception.h"
#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

using datasources::DatasetManager;
using datasources::IDataset;
using datasources::LevelPlace;

/// 600 pixels wide: factor 2 needs levels 2 and 4, factor 3 needs level 3.
drivers::MemoryRaster Wide() { return NoiseOf(600, 20, 2); }

TEST(HasEnoughOverviews, IsFalseWithoutLevelsUnlessNoneAreNeeded) {
  RecordingHost host;
  host.Put("a.tif", Wide());
  host.Put("small.tif", NoiseOf(200, 20, 1));
  EXPECT_FALSE(HasEnoughOverviews(std::string("a.tif"), 2));
  EXPECT_TRUE(HasEnoughOverviews(std::string("small.tif"), 2));
  EXPECT_EQ(0, host.Live().Total());
}

TEST(HasEnoughOverviews, CountsLevelsForTheSmallestValidOne) {
  RecordingHost host;
  host.Put("a.tif", Wide());
  host.AddLevel("a.tif", 2);
  EXPECT_FALSE(HasEnoughOverviews(std::string("a.tif"), 2));
  host.AddLevel("a.tif", 7, false);
  EXPECT_TRUE(HasEnoughOverviews(std::string("a.tif"), 2)) << "numbers count, not factors";
}

TEST(HasEnoughOverviews, SeesLevelsInsideAndInTheSideCarTogether) {
  RecordingHost host;
  host.Put("a.tif", Wide());
  host.AddLevel("a.tif", 2);
  host.AddLevel("a.tif", 4, true, LevelPlace::kSideCar);
  EXPECT_TRUE(HasEnoughOverviews(std::string("a.tif"), 2));
}

TEST(HasEnoughOverviews, OfInvalidLevelsAsksForAnEnormousFactor) {
  RecordingHost host;
  host.Put("a.tif", Wide());
  host.AddLevel("a.tif", 2, false);
  // One level is needed for the factor 4294967295, and one is there.
  EXPECT_TRUE(HasEnoughOverviews(std::string("a.tif"), 2));
}

TEST(HasEnoughOverviews, StopsAtAChannelWithFewerLevels) {
  RecordingHost host;
  host.Put("a.tif", Wide());
  host.AddLevel("a.tif", 2);
  host.AddLevel("a.tif", 4);
  host.Levels("a.tif").levels.at(4).channels[1].present = false;
  EXPECT_TRUE(HasEnoughOverviews("a.tif", std::vector<unsigned>{1}, 2));
  EXPECT_FALSE(HasEnoughOverviews("a.tif", std::vector<unsigned>{1, 2}, 2));
}

TEST(HasEnoughOverviews, OfAListStopsAtTheFirstFalse) {
  RecordingHost host;
  host.Put("small.tif", NoiseOf(200, 20, 1));
  host.Put("a.tif", Wide());
  EXPECT_TRUE(HasEnoughOverviews(std::vector<std::string>{}, 2));
  EXPECT_TRUE(HasEnoughOverviews(std::vector<std::string>{"small.tif"}, 2));
  EXPECT_FALSE(HasEnoughOverviews(std::vector<std::string>{"small.tif", "a.tif", "missing"}, 2));
}

TEST(HasEnoughOverviews, LetsAFailedOpenPass) {
  RecordingHost host;
  EXPECT_THROW(HasEnoughOverviews(std::string("missing.tif"), 2), Exception);
}

TEST(HasNativeOverviews, FollowsTheFormatTable) {
  RecordingHost host;
  host.Put("a.tif", Wide());
  host.Put("a.odd", Wide(), 99);
  EXPECT_TRUE(HasNativeOverviews("a.tif"));
  EXPECT_FALSE(HasNativeOverviews("a.odd"));
  EXPECT_FALSE(HasNativeOverviews("missing.tif"));
}

/// A dataset of which only the names are asked.
class NamedDataset : public IDataset {
 public:
  NamedDataset(std::string format, std::string file)
      : format_(std::move(format)), file_(std::move(file)) {}
  datasources::IFormatDescriptor* GetFormatDescriptor() const override {
    return new Format(format_);
  }
  datasources::AccessMode GetAccessMode() const override { return datasources::kReadOnly; }
  int GetFileFormatCode() const override { return 0; }
  std::string GetFileName() const override { return file_; }
  bool IsRaster() const override { return false; }

 private:
  struct Format : datasources::IFormatDescriptor {
    explicit Format(std::string n) : name(std::move(n)) {}
    std::string GetDescription() const override { return name; }
    int GetCode() const override { return 0; }
    std::string GetName() const override { return name; }
    std::string name;
  };
  std::string format_;
  std::string file_;
};

TEST(SupportsInternalOverviews, KnowsThreeFormatsByTheirWholeName) {
  for (const char* name : {"TESSRA", "TIFF", "ZMBERDAS"}) {
    NamedDataset dataset(name, "");
    EXPECT_TRUE(SupportsInternalOverviews(&dataset)) << name;
  }
  for (const char* name : {"tiff", "TIFF ", "BIGTIFF", "", "PNG"}) {
    NamedDataset dataset(name, "");
    EXPECT_FALSE(SupportsInternalOverviews(&dataset)) << name;
  }
  EXPECT_FALSE(SupportsInternalOverviews(nullptr));
}

TEST(SupportsInternalOverviews, AsksTheFileBehindTheGenericLayer) {
  RecordingHost host({{"A", "a", 3, 0}, {"B", "b", 58, 0}, {"C", "c", 272, 0}, {"D", "d", 99, 1}});
  for (const int code : {3, 58, 272, 99}) host.Put("file" + std::to_string(code), Wide(), code);
  for (const int code : {3, 58, 272}) {
    NamedDataset dataset("ZMBALL", "file" + std::to_string(code));
    EXPECT_TRUE(SupportsInternalOverviews(&dataset)) << code;
  }
  NamedDataset other("ZMBALL", "file99");
  EXPECT_FALSE(SupportsInternalOverviews(&other));
  NamedDataset missing("ZMBALL", "missing");
  EXPECT_FALSE(SupportsInternalOverviews(&missing));
}

}  // namespace
}  // namespace orin::testing
