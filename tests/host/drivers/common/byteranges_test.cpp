/// Sets of byte ranges, beside a slow twin that knows each byte.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <vector>

#include "host/drivers/common/byteranges.h"
#include "tests/host/drivers/common/byterangestext.h"

namespace orin::tests {
namespace {

using drivers::ByteRange;
using drivers::ByteRanges;

TEST(ByteRangeSet, ThatTouchOrOverlapAreOne) {
  ByteRanges ranges;
  ranges.Add({10, 20});
  ranges.Add({30, 40});
  ranges.Add({20, 22});
  ranges.Add({5, 5});
  EXPECT_EQ("10-22 30-40", TextOf(ranges));
  ranges.Add({8, 35});
  EXPECT_EQ("8-40", TextOf(ranges));
  EXPECT_EQ(32u, ranges.Size());
  EXPECT_EQ(8u, ranges.First().start);
  EXPECT_EQ(40u, ranges.End());
}

TEST(ByteRangeSet, AreCutWhereSomethingIsRemoved) {
  ByteRanges ranges;
  ranges.Add({10, 20});
  ranges.Add({30, 40});
  ranges.Remove({15, 17});
  ranges.Remove({35, 50});
  EXPECT_EQ("10-15 17-20 30-35", TextOf(ranges));
  ranges.Remove({0, 32});
  EXPECT_EQ("32-35", TextOf(ranges));
  EXPECT_TRUE(ranges.Holds({32, 35}));
  EXPECT_FALSE(ranges.Holds({32, 36}));
}

TEST(ByteRangeSet, AreTakenInOrderAtEvenPositions) {
  ByteRanges ranges;
  ranges.Add({11, 20});
  ranges.Add({30, 40});
  EXPECT_EQ(12u, ranges.Take(5));
  EXPECT_EQ(30u, ranges.Take(4));
  EXPECT_EQ(34u, ranges.Take(2)) << "not where the first one left room";
  EXPECT_EQ(std::nullopt, ranges.Take(5));
  EXPECT_EQ(36u, ranges.Take(4));
  EXPECT_EQ(18u, ranges.Take(2)) << "begins again";
  EXPECT_EQ("11-12 17-18", TextOf(ranges));
}

TEST(ByteRangeSet, AreTakenFromTheShortestThatHasRoom) {
  ByteRanges ranges;
  ranges.Add({10, 30});
  ranges.Add({41, 46});  // room for 4 bytes from 42 on
  ranges.Add({50, 54});
  ranges.Add({60, 62});
  EXPECT_EQ(42u, ranges.TakeFromShortest(3));
  EXPECT_EQ(50u, ranges.TakeFromShortest(3));
  EXPECT_EQ(10u, ranges.TakeFromShortest(3));
  EXPECT_EQ(std::nullopt, ranges.TakeFromShortest(17));
  EXPECT_EQ("13-30 41-42 45-46 53-54 60-62", TextOf(ranges));
}

TEST(ByteRangeSet, GivesTheLowestBytesThatLieTogether) {
  ByteRanges ranges;
  ranges.Add({10, 14});
  ranges.Add({20, 30});
  EXPECT_EQ(20u, ranges.TakeBefore(100, 5));
  EXPECT_EQ(10u, ranges.TakeBefore(100, 4));
  EXPECT_EQ(std::nullopt, ranges.TakeBefore(25, 5));
  EXPECT_EQ(25u, ranges.TakeBefore(26, 5));
}

TEST(ByteRangeSet, IsTouchedByAnyByteOfIt) {
  ByteRanges ranges;
  ranges.Add({10, 40});
  EXPECT_TRUE(ranges.Touches({39, 50}));
  EXPECT_TRUE(ranges.Touches({0, 11}));
  EXPECT_FALSE(ranges.Touches({40, 50}));
  EXPECT_FALSE(ranges.Touches({0, 10}));
  EXPECT_FALSE(ranges.Touches({20, 20}));
}

TEST(ByteRangeSet, TakesOverTheRangesOfAnother) {
  ByteRanges ranges, others;
  ranges.Add({10, 20});
  others.Add({20, 30});
  others.Add({35, 36});
  ranges.Add(others);
  EXPECT_EQ("10-30 35-36", TextOf(ranges));
  ranges.Remove(others);
  EXPECT_EQ("10-20", TextOf(ranges));
}

/// The twin: one flag a byte.
class Bytes {
 public:
  void Set(ByteRange range, bool isIn) {
    for (uint64_t i = range.start; i < range.end; ++i) in_[i] = isIn;
  }
  std::string Text() const {
    std::string text;
    for (const ByteRange& run : Runs())
      text += (text.empty() ? "" : " ") + std::to_string(run.start) + "-" + std::to_string(run.end);
    return text;
  }
  bool HasRoom(uint64_t bytes) const {
    const auto runs = Runs();
    return std::any_of(runs.begin(), runs.end(), [&](ByteRange run) { return Room(run) >= bytes; });
  }
  std::optional<uint64_t> ShortestRoom(uint64_t bytes) const {
    std::optional<ByteRange> best;
    for (const ByteRange& run : Runs())
      if (Room(run) >= bytes && (!best || Room(run) < Room(*best))) best = run;
    if (!best) return std::nullopt;
    return best->start % 2 == 0 ? best->start : best->start + 1;
  }

 private:
  static uint64_t Room(ByteRange run) {
    uint64_t bytes = 0;
    for (uint64_t i = run.start; i < run.end; ++i)
      if (bytes > 0 || i % 2 == 0) ++bytes;
    return bytes;
  }
  std::vector<ByteRange> Runs() const {
    std::vector<ByteRange> runs;
    for (uint64_t i = 0; i < in_.size(); ++i) {
      if (!in_[i]) continue;
      if (runs.empty() || runs.back().end != i) runs.push_back({i, i});
      runs.back().end = i + 1;
    }
    return runs;
  }

  std::vector<bool> in_ = std::vector<bool>(200);
};

TEST(ByteRangeSet, AreThoseOfTheirBytesWhateverIsAddedRemovedAndTaken) {
  std::mt19937 random(7);
  const auto below = [&](unsigned end) { return random() % end; };
  unsigned taken = 0;
  for (int round = 0; round < 300; ++round) {
    ByteRanges ranges;
    Bytes twin;
    for (int step = 0; step < 60; ++step) {
      const uint64_t start = below(190);
      const ByteRange range{start, start + below(10)};
      const uint64_t bytes = 1 + below(12);
      std::optional<uint64_t> place;
      switch (below(5)) {
        case 0:
        case 1:
          ranges.Add(range);
          twin.Set(range, true);
          break;
        case 2:
          ranges.Remove(range);
          twin.Set(range, false);
          break;
        case 3: {
          const bool hasRoom = twin.HasRoom(bytes);
          place = ranges.Take(bytes);
          ASSERT_EQ(hasRoom, place.has_value());
          break;
        }
        default: {
          const auto expected = twin.ShortestRoom(bytes);
          place = ranges.TakeFromShortest(bytes);
          ASSERT_EQ(expected, place);
        }
      }
      if (place) {
        ++taken;
        ASSERT_EQ(0u, *place % 2);
        twin.Set({*place, *place + bytes}, false);
      }
      ASSERT_EQ(twin.Text(), TextOf(ranges)) << "round " << round << ", step " << step;
    }
  }
  EXPECT_GT(taken, 1000u);
}

}  // namespace
}  // namespace orin::tests
