/// The moves that close gaps between levels, played on a drawing of a file.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "host/drivers/tiff/packing.h"

namespace orin::tests {
namespace {

using drivers::ByteRange;
using drivers::ByteRanges;
using drivers::Joining;
using drivers::kMarkerBytes;
using drivers::kPointerBytes;
using drivers::Movable;
using drivers::Move;
using drivers::OwnSpace;
using drivers::Stretch;

constexpr uint64_t kImageEnd = 1000;

/// A file of levels that are one piece each; level `a` has index 0.
class Drawing {
 public:
  /// Adds levels behind all others, in one stretch. \param levels  name and bytes
  void Append(const std::vector<std::pair<char, uint64_t>>& levels) {
    Stretch stretch = drivers::StretchAt(size_, stretches_.empty() ? 0 : stretches_.back().marker);
    size_ = stretch.Body();
    for (const auto& [name, bytes] : levels) {
      places_[name] = {size_, size_ + bytes};
      size_ += bytes;
    }
    stretch.end = size_;
    stretches_.push_back(stretch);
  }
  void Remove(char name) { places_.erase(name); }
  void Pin(char name) { pinned_ += name; }
  void AppendForeign(uint64_t bytes) {
    foreign_.Add({size_, size_ + bytes});
    size_ += bytes;
  }

  OwnSpace Space() const {
    OwnSpace space;
    space.stretches = stretches_;
    space.used.Add({0, kImageEnd});
    for (const auto& [start, end] : foreign_) space.used.Add({start, end});
    for (const auto& [name, place] : places_) {
      space.used.Add(place);
      space.directories.push_back(place.start + kPointerBytes);
    }
    for (const Stretch& stretch : stretches_) space.free.Add({stretch.Body(), stretch.end});
    space.free.Remove(space.used);
    return space;
  }

  /// Makes all moves. \returns how many
  int Pack() {
    evacuated_ = 0;
    for (int moves = 0;; ++moves) {
      OwnSpace space = Space();
      for (Joining joining = JoinStretches(space); !joining.IsEmpty();
           joining = JoinStretches(space)) {
        Take(joining);
        space = Space();
      }
      const auto move = NextMove(space, Items());
      Shorten();
      if (!move || moves == 1000) return moves;
      Make(*move);
    }
  }

  uint64_t Size() const { return size_; }
  /// Bytes that the last Pack moved to the end.
  uint64_t Evacuated() const { return evacuated_; }
  size_t Stretches() const { return stretches_.size(); }
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
      Movable item{size_t(name - 'a'), place.start + kPointerBytes, place.end - place.start, {}};
      item.extents.Add(place);
      items.push_back(item);
    }
    return items;
  }
  void Take(const Joining& joining) {
    for (const Stretch& grown : joining.grown) {
      std::erase_if(stretches_, [&](const Stretch& other) {
        return other.marker > grown.marker && other.marker < grown.end;
      });
      for (Stretch& other : stretches_)
        if (other.marker == grown.marker) other = grown;
    }
    for (const Stretch& relinked : joining.relinked)
      for (Stretch& other : stretches_)
        if (other.marker == relinked.marker) other.previous = relinked.previous;
  }
  void Make(const Move& move) {
    if (!move.room) {
      std::vector<std::pair<char, uint64_t>> levels;
      for (const size_t index : move.indices) {
        const ByteRange place = places_.at(char('a' + index));
        levels.emplace_back(char('a' + index), place.end - place.start);
        evacuated_ += place.end - place.start;
      }
      Append(levels);
      return;
    }
    uint64_t at = move.room->start;
    for (const size_t index : move.indices) {
      ByteRange& place = places_.at(char('a' + index));
      ASSERT_GT(place.start, at) << "levels move down only";
      place = {at, at + (place.end - place.start)};
      at = place.end;
    }
    ASSERT_LE(at, move.room->end);
  }
  void Shorten() {
    const OwnSpace space = Space();
    size_ = space.ShortestEnd(size_, {});
    while (!stretches_.empty() && stretches_.back().start >= size_) stretches_.pop_back();
    if (!stretches_.empty()) stretches_.back().end = std::min(stretches_.back().end, size_);
  }

  uint64_t size_ = kImageEnd;
  uint64_t evacuated_ = 0;
  std::vector<Stretch> stretches_;
  std::map<char, ByteRange> places_;
  std::string pinned_;
  ByteRanges foreign_;
};

constexpr uint64_t kBody = 1024 + kMarkerBytes;  // of a first stretch behind kImageEnd

TEST(Packing, MovesLevelsIntoTheGapThatTheyFitTogether) {
  Drawing file;
  file.Append({{'b', 600}, {'c', 100}});
  file.Append({{'a', 500}});
  file.Remove('b');
  EXPECT_EQ(1, file.Pack());
  EXPECT_EQ("ac", file.Order());
  EXPECT_EQ(kBody + 600, file.Size());
}

TEST(Packing, TakesTheLongWayWhereALevelFitsNowhere) {
  Drawing file;
  file.Append({{'b', 600}});
  file.Append({{'a', 620}});
  file.Remove('b');
  EXPECT_EQ(2, file.Pack()) << "to the end, then down";
  EXPECT_EQ(kBody + 620, file.Size());
  EXPECT_EQ(1u, file.Stretches());
}

TEST(Packing, GoesRoundWhatCannotBeMoved) {
  Drawing file;
  file.Append({{'b', 600}});
  file.Append({{'p', 100}});
  file.Append({{'a', 620}});
  file.Remove('b');
  file.Pin('p');
  const uint64_t before = file.Size();
  EXPECT_EQ(0, file.Pack());
  EXPECT_EQ(before, file.Size());
}

TEST(Packing, LeavesBytesOfOtherProgramsWhereTheyAre) {
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

TEST(Packing, JoinsStretchesWithoutADirectoryAndTellsThoseThatFollowThem) {
  Drawing file;
  file.Append({{'a', 100}});
  file.Append({{'b', 100}});
  file.Append({{'c', 100}});
  file.Append({{'d', 100}});
  file.Remove('b');
  file.Remove('c');
  const OwnSpace space = file.Space();
  const Joining joining = JoinStretches(space);
  ASSERT_EQ(1u, joining.grown.size());
  EXPECT_EQ(space.stretches[0].marker, joining.grown[0].marker);
  EXPECT_EQ(space.stretches[3].start, joining.grown[0].end);
  ASSERT_EQ(1u, joining.relinked.size());
  EXPECT_EQ(space.stretches[3].marker, joining.relinked[0].marker);
  EXPECT_EQ(space.stretches[0].marker, joining.relinked[0].previous);
  EXPECT_EQ(space.stretches[3].end, joining.relinked[0].end);
}

TEST(Packing, LeavesNoGapWhateverWasBuiltAndRemoved) {
  std::mt19937 random(3);
  const auto evenBelow = [&](unsigned end) { return 2 * (kPointerBytes + random() % end); };
  for (int file = 0; file < 300; ++file) {
    Drawing drawing;
    const int count = 1 + int(random() % 6);
    for (int i = 0; i < count; ++i) drawing.Append({{char('a' + i), evenBelow(500)}});
    for (int build = 0; build < 8; ++build) {
      for (int i = 0; i < count; ++i)
        if (random() % 3 != 0) drawing.Append({{char('a' + i), evenBelow(500)}});
      ASSERT_LT(drawing.Pack(), 1000) << "file " << file << ", build " << build;
      ASSERT_LE(drawing.Evacuated(), drivers::kMostRounds * drawing.Bytes());
      ASSERT_LE(drawing.Size(), 1024 + drawing.Bytes() +
                                    2 * kMarkerBytes * std::max<size_t>(1, drawing.Stretches()));
      ASSERT_LE(drawing.Stretches(), size_t(count));
    }
  }
}

}  // namespace
}  // namespace orin::tests
