/// Records as texts: what is written is read back, in fixed widths where it changes in place.
// SPDX-License-Identifier: MIT
#include "host/model/levelrecord.h"

#include <gtest/gtest.h>

#include <limits>

namespace orin::tests {
namespace {

using namespace model;

LevelRecord Whole() {
  LevelRecord record;
  record.version = 2;
  record.method = "BICUBIC";
  record.level = 4;
  record.sourceLevel = 2;
  record.sourceBytes = std::string(kDigestLength, 'e');
  record.program = "Orin Overviews 0.1.0";
  record.validity = "10-";
  record.inputs = {"1=nan,2=-3.5e+38", "item", "inside,beside", 4, "abc", "def", {1, 2, 3}};
  record.image = {std::string(kDigestLength, '1'), {123, -5, 0xfeed, 17, 18}};
  record.content = {std::string(kDigestLength, '2'), std::string(kDigestLength, '3'), {9, -7}};
  return record;
}

TEST(LevelRecord, IsReadBackFromItsItemsAndFromItsLine) {
  EXPECT_EQ(Whole(), ParseRecord(ComposeRecord(Whole())));
  EXPECT_EQ(Whole(), ParseLine(LineOf(Whole())));
}

TEST(LevelRecord, BlankPartsAreReadBackToo) {
  LevelRecord record = Whole();
  record.image = {};
  record.content = {};
  record.sourceBytes.clear();
  record.inputs = {};
  record.method.clear();
  EXPECT_EQ(record, ParseRecord(ComposeRecord(record)));
  EXPECT_EQ(record, ParseLine(LineOf(record)));
}

TEST(LevelRecord, PartsThatChangeInPlaceHaveOneWidth) {
  ImageRecord image = Whole().image;
  ContentRecord content = Whole().content;
  for (const uint64_t number : {uint64_t{0}, std::numeric_limits<uint64_t>::max()})
    for (const int64_t time : {std::numeric_limits<int64_t>::min() + 1, int64_t{0},
                               std::numeric_limits<int64_t>::max()}) {
      image.stamp = {number, time, number, time, number};
      content.holder = {number, time};
      EXPECT_EQ(kImageTextLength, TextOf(image).size());
      EXPECT_EQ(kContentTextLength, TextOf(content).size());
      LevelRecord record = Whole();
      record.image = image;
      record.content = content;
      EXPECT_EQ(record, ParseRecord(ComposeRecord(record)));
    }
  EXPECT_EQ(kImageTextLength, TextOf(ImageRecord()).size());
  EXPECT_EQ(kContentTextLength, TextOf(ContentRecord()).size());
}

TEST(LevelRecord, InputsMayHoldAnyByte) {
  LevelRecord record = Whole();
  record.inputs.noData = "60;|=\n%\x80 \"<&>";
  EXPECT_EQ(record, ParseRecord(ComposeRecord(record)));
  EXPECT_EQ(record, ParseLine(LineOf(record)));
}

TEST(LevelRecord, OfTheFirstVersionKeepsWhatItSays) {
  const std::string fingerprint(kDigestLength, '7');
  const std::string image =
      fingerprint + " 00000000000000000123 -0000000000000000005 000000000000feed";
  const LevelRecord record = ParseRecord({{"RESAMPLING", "MODE"},
                                          {"ORIN_FACTOR", "8"},
                                          {"ORIN_SOURCE_LEVEL", "1"},
                                          {"ORIN_VALID", "11"},
                                          {"ORIN_IMAGE", image}});
  EXPECT_EQ(1, record.version);
  EXPECT_EQ("MODE", record.method);
  EXPECT_EQ((ImageRecord{fingerprint, {123, -5, 0xfeed}}), record.image);
  EXPECT_TRUE(record.content.IsBlank());
}

TEST(LevelRecord, IsNoneWithoutAValidity) {
  EXPECT_EQ(0, ParseRecord({}).version);
  EXPECT_EQ(0, ParseRecord({{"RESAMPLING", "AVERAGE"}, {"ORIN_VALID", "1x"}}).version);
}

TEST(LevelRecord, DamagedPartsCountAsBlank) {
  for (const char* item : {kImageItem, kContentItem})
    for (size_t at = 0; at < 90; ++at) {
      std::vector<RecordItem> items = ComposeRecord(Whole());
      for (auto& [name, text] : items)
        if (name == item) text[at] = '?';
      const LevelRecord record = ParseRecord(items);
      EXPECT_TRUE(item == kImageItem ? record.image.IsBlank() : record.content.IsBlank()) << at;
      EXPECT_EQ("10-", record.validity);
    }
}

TEST(LevelRecord, TextOfAnItemIsFoundInALine) {
  const std::string line = LineOf(Whole());
  const auto at = TextAt(line, kImageItem);
  ASSERT_TRUE(at);
  EXPECT_EQ(TextOf(Whole().image), line.substr(*at, kImageTextLength));
  EXPECT_FALSE(TextAt(line, "ORIN"));
  EXPECT_FALSE(TextAt("", kImageItem));
}

}  // namespace
}  // namespace orin::tests
