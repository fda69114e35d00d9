/// The state machine as a table: what is recorded, what is seen, what is answered.
// SPDX-License-Identifier: MIT
#include "host/model/freshness.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace orin::tests {
namespace {

using namespace model;

const std::string kOld(kDigestLength, 'a');
const std::string kNew(kDigestLength, 'b');
constexpr ImageStamp kStamp{1000, 5000000001, 7, 5000000002, 99};
constexpr FileStamp kHolder{300, 6000000001};

LevelRecord Whole() {
  LevelRecord record;
  record.version = 2;
  record.method = "AVERAGE";
  record.level = 2;
  record.sourceLevel = 1;
  record.program = "Orin";
  record.validity = "111";
  record.inputs.noData = "60";
  record.image = {kOld, kStamp};
  record.content = {kOld, kOld, kHolder};
  return record;
}

/// What is seen of an image and its one level, and how often each was read.
struct World {
  LevelRecord record = Whole();
  ObservedImage image;
  ObservedLevel level;
  int imageReads = 0;
  int levelReads = 0;
  std::string fingerprint = kOld;
  std::string bytes = kOld;

  World() {
    image.stamp = kStamp;
    image.inputs = record.inputs;
    image.fingerprint = [this] { return ++imageReads, fingerprint; };
    level.holder = kHolder;
    level.table = kOld;
    level.bytes = [this] { return ++levelReads, bytes; };
  }
  World(const World&) = delete;
  World& operator=(const World&) = delete;
};

/// One row of the table.
struct Row {
  const char* name;
  void (*change)(World&);
  LevelStatus status;
  StaleReason reason = StaleReason::kNone;
  int imageReads = 0;
  int levelReads = 0;
  bool isStampOld = false;
};

using enum LevelStatus;

const Row kRows[] = {
    {"nothing", [](World&) {}, kCurrent},
    {"no record", [](World& w) { w.record = {}; }, kUnverified},
    {"touched", [](World& w) { ++w.image.stamp->modified; }, kCurrent, StaleReason::kNone, 1, 0,
     true},
    {"other inode", [](World& w) { ++w.image.stamp->inode; }, kCurrent, {}, 1, 0, true},
    {"other status change", [](World& w) { ++w.image.stamp->changed; }, kCurrent, {}, 1, 0, true},
    {"other companions", [](World& w) { ++w.image.stamp->companions, w.fingerprint = kNew; },
     kStale, StaleReason::kImageData, 1},
    {"edited", [](World& w) { ++w.image.stamp->modified, w.fingerprint = kNew; }, kStale,
     StaleReason::kImageData, 1},
    {"edited and restored in all but the status change",
     [](World& w) { ++w.image.stamp->changed, w.fingerprint = kNew; }, kStale,
     StaleReason::kImageData, 1},
    {"inside: no status change recorded", [](World& w) { w.record.image.stamp = kStamp.InImage(); },
     kCurrent},
    {"unreadable image",
     [](World& w) { ++w.image.stamp->modified, w.fingerprint.clear(); },
     kUnverified,
     {},
     1},
    {"no file", [](World& w) { w.image.stamp.reset(); }, kUnverified},
    {"never stamped", [](World& w) { w.record.image.stamp = {}; }, kCurrent, {}, 1, 0, true},
    {"no fingerprint recorded", [](World& w) { w.record.image = {}; }, kUnverified},
    {"no-data", [](World& w) { w.image.inputs->noData = "61"; }, kStale, StaleReason::kNoData},
    {"no-data declared elsewhere", [](World& w) { w.image.inputs->noDataOrigin = "tag"; },
     kCurrent},
    {"other channels in the pass", [](World& w) { w.image.inputs->channels = {1}; }, kCurrent},
    {"mask", [](World& w) { w.image.inputs->mask = "beside"; }, kStale, StaleReason::kMask},
    {"alpha", [](World& w) { w.image.inputs->alphaChannel = 3; }, kStale, StaleReason::kAlpha},
    {"palette", [](World& w) { w.image.inputs->palette = kNew; }, kStale, StaleReason::kPalette},
    {"coding", [](World& w) { w.image.inputs->coding = kNew; }, kStale, StaleReason::kCoding},
    {"inputs unknown now", [](World& w) { w.image.inputs.reset(); }, kUnverified},
    {"other inputs and edited: nothing is read",
     [](World& w) { w.image.inputs->noData = "", ++w.image.stamp->modified; }, kStale,
     StaleReason::kNoData},
    {"holder touched", [](World& w) { ++w.level.holder->modified; }, kCurrent, {}, 0, 1, true},
    {"level written over",
     [](World& w) { ++w.level.holder->modified, w.bytes = kNew; },
     kChanged,
     {},
     0,
     1},
    {"level written anew", [](World& w) { w.level.table = kNew; }, kChanged},
    {"level unreadable",
     [](World& w) { ++w.level.holder->modified, w.bytes.clear(); },
     kUnverified,
     {},
     0,
     1},
    {"table unknown", [](World& w) { w.level.table.clear(); }, kCurrent, {}, 0, 1},
    {"content not recorded", [](World& w) { w.record.content = {}; }, kUnverified, {}, 0, 0},
    {"holder never stamped",
     [](World& w) { w.record.content.holder = {}; },
     kCurrent,
     {},
     0,
     1,
     true},
    {"edited and level written over: stale tells enough",
     [](World& w) {
       ++w.image.stamp->modified, w.fingerprint = kNew;
       ++w.level.holder->modified, w.bytes = kNew;
     },
     kStale, StaleReason::kImageData, 1},
    {"a channel not finished", [](World& w) { w.record.validity = "101"; }, kUnfinished},
    {"a channel absent", [](World& w) { w.record.validity = "1-1"; }, kUnfinished},
    {"no channel finished, level half written",
     [](World& w) { w.record.validity = "000", w.level.table = kNew; }, kUnfinished},
    {"a channel not finished, the other written over",
     [](World& w) { w.record.validity = "100", w.level.table = kNew; }, kChanged},
    {"not finished and edited",
     [](World& w) {
       w.record.validity = "000";
       ++w.image.stamp->modified, w.fingerprint = kNew;
     },
     kStale, StaleReason::kImageData, 1},
    {"version 1", [](World& w) { w.record.version = 1; }, kUnverified},
    {"version 1, edited",
     [](World& w) {
       w.record.version = 1, w.record.content = {};
       ++w.image.stamp->modified, w.fingerprint = kNew;
     },
     kStale, StaleReason::kImageData, 1},
    {"version 1, not finished", [](World& w) { w.record.version = 1, w.record.validity = "0--"; },
     kUnfinished},
};

TEST(Freshness, IsWhatTheTableSays) {
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.name);
    World world;
    row.change(world);
    const auto answers = CheckFreshness({world.record}, world.image, {world.level});
    ASSERT_EQ(1u, answers.size());
    EXPECT_EQ(row.status, answers[0].status);
    EXPECT_EQ(row.reason, answers[0].reason);
    EXPECT_EQ(row.imageReads, world.imageReads);
    EXPECT_EQ(row.levelReads, world.levelReads);
    if (row.status == kCurrent && world.level.table.empty()) continue;
    EXPECT_EQ(row.isStampOld, answers[0].isStampOld);
  }
}

TEST(Freshness, RecordsWithTheStampOfNowSayWhatTheImageHolds) {
  World world;
  LevelRecord older = Whole();
  older.image.stamp.modified = 1;
  LevelRecord other = older;
  other.image.fingerprint = kNew;
  const auto answers = CheckFreshness({older, other, world.record}, world.image,
                                      {world.level, world.level, world.level});
  EXPECT_EQ(0, world.imageReads);
  EXPECT_EQ((Freshness{kCurrent, StaleReason::kNone, true}), answers[0]);
  EXPECT_EQ(StaleReason::kImageData, answers[1].reason);
  EXPECT_EQ(kCurrent, answers[2].status);
}

TEST(Freshness, RecordsThatContradictEachOtherAreNotBelieved) {
  World world;
  LevelRecord other = Whole();
  other.image.fingerprint = kNew;
  const auto answers =
      CheckFreshness({world.record, other}, world.image, {world.level, world.level});
  EXPECT_EQ(1, world.imageReads);
  EXPECT_EQ(kCurrent, answers[0].status);
  EXPECT_EQ(kStale, answers[1].status);
}

TEST(Freshness, ImageIsReadOnceForAllLevels) {
  World world;
  ++world.image.stamp->modified;
  CheckFreshness({world.record, world.record}, world.image, {world.level, world.level});
  EXPECT_EQ(1, world.imageReads);
}

std::string Digest(char c) { return std::string(kDigestLength, c); }

std::vector<LevelStatus> StatusesOf(const std::vector<Provenance>& levels,
                                    std::vector<Freshness> answers) {
  CheckSources(levels, answers);
  std::vector<LevelStatus> statuses;
  for (const Freshness& answer : answers) statuses.push_back(answer.status);
  return statuses;
}

TEST(Sources, RebuiltLevelMakesThoseAboveItStale) {
  const std::vector<Provenance> levels = {
      {2, Digest('2'), 1, ""}, {4, Digest('4'), 2, Digest('x')}, {8, Digest('8'), 4, Digest('4')}};
  EXPECT_EQ((std::vector<LevelStatus>{kCurrent, kStale, kStale}),
            StatusesOf(levels, {{kCurrent}, {kCurrent}, {kUnverified}}));
}

TEST(Sources, SameBytesAreTheSameLevelAndARemovedOneIsNoReason) {
  const std::vector<Provenance> levels = {
      {2, Digest('2'), 1, ""}, {4, Digest('4'), 2, Digest('2')}, {16, Digest('6'), 8, Digest('8')}};
  EXPECT_EQ((std::vector<LevelStatus>{kCurrent, kCurrent, kCurrent}),
            StatusesOf(levels, {{kCurrent}, {kCurrent}, {kCurrent}}));
}

TEST(Sources, OneOfTwoPlacesIsEnough) {
  const std::vector<Provenance> levels = {
      {2, Digest('a'), 1, ""}, {2, Digest('b'), 1, ""}, {4, Digest('4'), 2, Digest('b')}};
  EXPECT_EQ((std::vector<LevelStatus>{kCurrent, kCurrent, kCurrent}),
            StatusesOf(levels, {{kCurrent}, {kCurrent}, {kCurrent}}));
}

TEST(Sources, LevelOfAChangedOneIsStaleAndOfAnUnknownOneIsNot) {
  const std::vector<Provenance> levels = {
      {2, Digest('2'), 1, ""}, {4, Digest('4'), 2, Digest('2')}, {6, Digest('6'), 2, ""}};
  EXPECT_EQ((std::vector<LevelStatus>{kChanged, kStale, kUnverified}),
            StatusesOf(levels, {{kChanged}, {kCurrent}, {kUnverified}}));
}

}  // namespace
}  // namespace orin::tests
