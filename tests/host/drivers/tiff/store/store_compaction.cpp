/// The moves that close gaps between levels, played on a drawing of a file.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "host/drivers/tiff/compactionplan.h"

namespace orin::tests {
namespace {

using drivers::ByteRange;
using drivers::ByteRanges;
using drivers::FreeSpaceMap;
using drivers::kMarkerBytes;
using drivers::Movable;
using drivers::Move;
using drivers::Segment;

constexpr uint64_t kImageEnd = 1000;

/// A file of levels that are one piece each; level `a` has index 0.
class Drawing {
 public:
  /// Adds levels behind all others, in one segment. \param levels  name and bytes
  void Append(const std::vector<std::pair<char, uint64_t>>& levels) {
    Segment segment = drivers::SegmentAt(size_);
    size_ = segment.Body();
    for (const auto& [name, bytes] : levels) {
      places_[name] = {size_, size_ + bytes};
      size_ += bytes;
    }
    segment.end = size_;
    segments_.push_back(segment);
  }
  void Remove(char name) { places_.erase(name); }
  void Pin(char name) { pinned_ += name; }
  void AppendForeign(uint64_t bytes) {
    foreign_.Add({size_, size_ + bytes});
    size_ += bytes;
  }

  FreeSpaceMap Space() const {
    FreeSpaceMap space;
    space.segments = segments_;
    space.used.Add({0, kImageEnd});
    for (const auto& [start, end] : foreign_) space.used.Add({start, end});
    for (const auto& [name, place] : places_) space.used.Add(place);
    for (const Segment& segment : segments_) space.free.Add({segment.Body(), segment.end});
    space.free.Remove(space.used);
    return space;
  }

  /// Makes all moves. \returns how many
  int Pack() {
    evacuated_ = 0;
    for (int moves = 0;; ++moves) {
      FreeSpaceMap space = Space();
      Join(space.Joined());
      space = Space();
      const auto move = NextMove(space, Items());
      Shorten();
      if (!move || moves == 1000) return moves;
      Make(*move);
    }
  }

  uint64_t Size() const { return size_; }
  /// Bytes that the last Pack moved to the end.
  uint64_t Evacuated() const { return evacuated_; }
  size_t Segments() const { return segments_.size(); }
  /// The levels' names in the order of their places.
  std::string Order() const {
    std::vector<std::pair<uint64_t, char>> sorted;
    for (const auto& [name, place] : places_) sorted.emplace_back(place.start, name);
    std::sort(sorted.begin(), sorted.end());
    std::string order;
    for (const auto& [start, name] : sorted) order += name;
    return order;
  }
  uint64_t Bytes() const {
    uint64_t bytes = 0;
    for (const auto& [name, place] : places_) bytes += place.end - place.start;
    return bytes;
  }

 private:
  std::vector<Movable> Items() const {
    std::vector<Movable> items;
    for (const auto& [name, place] : places_) {
      if (pinned_.find(name) != pinned_.npos) continue;
      Movable item{size_t(name - 'a'), place.end - place.start, {}};
      item.extents.Add(place);
      items.push_back(item);
    }
    return items;
  }
  void Join(const std::vector<Segment>& joined) {
    for (const Segment& grown : joined) {
      std::erase_if(segments_, [&](const Segment& other) {
        return other.marker > grown.marker && other.marker < grown.end;
      });
      for (Segment& other : segments_)
        if (other.marker == grown.marker) other = grown;
    }
  }
  void Make(const Move& move) {
    if (!move.gap) {
      std::vector<std::pair<char, uint64_t>> levels;
      for (const size_t index : move.indices) {
        const ByteRange place = places_.at(char('a' + index));
        levels.emplace_back(char('a' + index), place.end - place.start);
        evacuated_ += place.end - place.start;
      }
      Append(levels);
      return;
    }
    uint64_t at = move.gap->start;
    for (const size_t index : move.indices) {
      ByteRange& place = places_.at(char('a' + index));
      ASSERT_GT(place.start, at) << "levels move down only";
      place = {at, at + (place.end - place.start)};
      at = place.end;
    }
    ASSERT_LE(at, move.gap->end);
  }
  void Shorten() {
    const FreeSpaceMap space = Space();
    size_ = space.ShortestEnd(size_, {});
    while (!segments_.empty() && segments_.back().start >= size_) segments_.pop_back();
    if (!segments_.empty()) segments_.back().end = std::min(segments_.back().end, size_);
  }

  uint64_t size_ = kImageEnd;
  uint64_t evacuated_ = 0;
  std::vector<Segment> segments_;
  std::map<char, ByteRange> places_;
  std::string pinned_;
  ByteRanges foreign_;
};

constexpr uint64_t kBody = 1024 + kMarkerBytes;  // of a first segment behind kImageEnd

TEST(Compaction, MovesLevelsIntoTheGapThatTheyFitTogether) {
  Drawing file;
  file.Append({{'b', 600}, {'c', 100}});
  file.Append({{'a', 500}});
  file.Remove('b');
  EXPECT_EQ(1, file.Pack());
  EXPECT_EQ("ac", file.Order());
  EXPECT_EQ(kBody + 600, file.Size());
}

TEST(Compaction, TakesTheLongWayWhereALevelFitsNowhere) {
  Drawing file;
  file.Append({{'b', 600}});
  file.Append({{'a', 750}});
  file.Remove('b');
  EXPECT_EQ(2, file.Pack()) << "to the end, then down";
  EXPECT_EQ(kBody + 750, file.Size());
  EXPECT_EQ(1u, file.Segments());
}

TEST(Compaction, GoesRoundWhatCannotBeMoved) {
  Drawing file;
  file.Append({{'b', 600}});
  file.Append({{'p', 100}});
  file.Append({{'a', 750}});
  file.Remove('b');
  file.Pin('p');
  const uint64_t before = file.Size();
  file.Pack();
  EXPECT_EQ("pa", file.Order());
  EXPECT_GE(before, file.Size());  // a joined segment's marker may be free now, no more
  EXPECT_LE(before, file.Size() + 2 * kMarkerBytes);
}

TEST(Compaction, LeavesBytesOfOtherProgramsWhereTheyAre) {
  Drawing file;
  file.Append({{'b', 600}});
  file.AppendForeign(50);
  file.Append({{'a', 620}, {'c', 80}});
  file.Remove('b');
  const uint64_t before = file.Size();
  EXPECT_EQ(1, file.Pack());
  EXPECT_EQ("ca", file.Order());
  EXPECT_EQ(before - 80, file.Size());
}

TEST(Compaction, JoinsSegmentsThatTouchEachOther) {
  Drawing file;
  file.Append({{'a', 100}});
  file.Append({{'b', 100}});
  file.AppendForeign(10);
  file.Append({{'c', 100}});
  file.Append({{'d', 100}});
  const FreeSpaceMap map = file.Space();
  const std::vector<Segment> joined = map.Joined();
  ASSERT_EQ(2u, joined.size());
  EXPECT_EQ(map.segments[0].marker, joined[0].marker);
  EXPECT_EQ(map.segments[1].end, joined[0].end);
  EXPECT_EQ(map.segments[2].marker, joined[1].marker);
  EXPECT_EQ(map.segments[3].end, joined[1].end);
}

TEST(Compaction, LeavesNoGapWhateverWasBuiltAndRemoved) {
  std::mt19937 random(3);
  const auto evenBelow = [&](unsigned end) { return 2 * (16 + random() % end); };
  for (int file = 0; file < 300; ++file) {
    Drawing drawing;
    const int count = 1 + int(random() % 6);
    for (int i = 0; i < count; ++i) drawing.Append({{char('a' + i), evenBelow(500)}});
    for (int build = 0; build < 8; ++build) {
      for (int i = 0; i < count; ++i)
        if (random() % 3 != 0) drawing.Append({{char('a' + i), evenBelow(500)}});
      ASSERT_LT(drawing.Pack(), 1000) << "file " << file << ", build " << build;
      ASSERT_LE(drawing.Evacuated(), drivers::kMaxRounds * drawing.Bytes());
      ASSERT_LE(drawing.Size(), 1024 + drawing.Bytes() +
                                    2 * kMarkerBytes * std::max<size_t>(1, drawing.Segments()));
      ASSERT_LE(drawing.Segments(), size_t(count));
    }
  }
}

}  // namespace
}  // namespace orin::tests
