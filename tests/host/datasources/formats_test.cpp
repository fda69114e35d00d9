// SPDX-License-Identifier: MIT
#include "host/datasources/formats.h"

#include <gtest/gtest.h>

#include "host/services/exception.h"

namespace orin::datasources {
namespace {

/// Recognises files by the letter that they start with.
class LetterDriver final : public IFormatDriver {
 public:
  LetterDriver(char letter, ZMBInfo_s format) : letter_(letter), format_(std::move(format)) {}
  std::vector<ZMBInfo_s> Formats() const override { return {format_}; }
  ZMBFormatType Identify(const std::string& file) const override {
    return !file.empty() && file[0] == letter_ ? format_.code : kFormatUnknown;
  }
  std::unique_ptr<IRasterSource> Open(const std::string&, AccessMode) override { return nullptr; }

 private:
  char letter_;
  ZMBInfo_s format_;
};

class Formats : public ::testing::Test {
 protected:
  void SetUp() override { FormatRegistry::Instance().Clear(); }
  void TearDown() override { FormatRegistry::Instance().Clear(); }
  static void Register(char letter, ZMBInfo_s format) {
    FormatRegistry::Instance().Register(std::make_shared<LetterDriver>(letter, std::move(format)));
  }
};

TEST_F(Formats, TheTableHoldsTheUnrecognisedFileAndTheGenericLayerFromTheStart) {
  ASSERT_NE(nullptr, ZMBGetFormatInfo(0));
  EXPECT_EQ("unrecognised", ZMBGetFormatInfo(0)->description);
  EXPECT_EQ(0, ZMBGetFormatInfo(0)->nativeOverviews);
  ASSERT_NE(nullptr, ZMBGetFormatInfo(kFormatGeneric));
  EXPECT_EQ("ZMBALL", ZMBGetFormatInfo(kFormatGeneric)->name);
  EXPECT_EQ(ZMBInfo[kFormatGeneric], ZMBGetFormatInfo(kFormatGeneric));
}

TEST_F(Formats, CodesOutsideTheTableOrWithoutAFormatAnswerNull) {
  EXPECT_EQ(nullptr, ZMBGetFormatInfo(-1));
  EXPECT_EQ(nullptr, ZMBGetFormatInfo(kFormatTableSize));
  EXPECT_EQ(nullptr, ZMBGetFormatInfo(2147483647));
  EXPECT_EQ(nullptr, ZMBGetFormatInfo(kFormatTiff));
}

TEST_F(Formats, ADriverFillsTheTableAndClearEmptiesIt) {
  Register('t', {"TIFF", "TIFF / GeoTIFF", kFormatTiff, 1});
  ASSERT_NE(nullptr, ZMBInfo[kFormatTiff]);
  EXPECT_EQ("TIFF", ZMBInfo[kFormatTiff]->name);
  EXPECT_EQ("TIFF / GeoTIFF", ZMBInfo[kFormatTiff]->description);
  EXPECT_EQ(kFormatTiff, ZMBInfo[kFormatTiff]->code);
  EXPECT_EQ(1, ZMBInfo[kFormatTiff]->nativeOverviews);
  EXPECT_EQ(kFormatTiff, ZMBTestOpen("t.tif"));
  FormatRegistry::Instance().Clear();
  EXPECT_EQ(nullptr, ZMBInfo[kFormatTiff]);
  EXPECT_EQ(0, ZMBTestOpen("t.tif"));
}

TEST_F(Formats, AFileThatNobodyRecognisesHasTheCodeZero) {
  Register('t', {"TIFF", "TIFF / GeoTIFF", kFormatTiff, 1});
  EXPECT_EQ(0, ZMBTestOpen("x"));
  EXPECT_EQ(0, ZMBTestOpen(""));
  EXPECT_EQ(0, ZMBTestOpen(nullptr));
}

TEST_F(Formats, DriversAreAskedInTheOrderOfRegistration) {
  Register('a', {"FIRST", "first", 10, 0});
  Register('a', {"SECOND", "second", 11, 0});
  Register('b', {"THIRD", "third", 12, 0});
  EXPECT_EQ(10, ZMBTestOpen("a"));
  EXPECT_EQ(12, ZMBTestOpen("b"));
  ZMBFormatType code = 99;
  EXPECT_EQ(nullptr, FormatRegistry::Instance().DriverOf("c", code));
  EXPECT_EQ(0, code);
}

TEST_F(Formats, TheCodesOfTheFixedFormatsAreKnown) {
  EXPECT_EQ(3, kFormatMemory);
  EXPECT_EQ(58, kFormatTiff);
  EXPECT_EQ(272, kFormatErdas);
}

}  // namespace
}  // namespace orin::datasources
