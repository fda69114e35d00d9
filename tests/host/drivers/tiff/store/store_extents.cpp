/// Sets of byte ranges, beside a slow twin that knows each byte.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <vector>

#include "host/drivers/tiff/extents.h"
#include "tests/host/drivers/tiff/store/extentstext.h"

namespace orin::tests {
namespace {

using drivers::Extent;
using drivers::ExtentSet;

TEST(Extents, ThatTouchOrOverlapAreOne) {
  ExtentSet extents;
  extents.Add({10, 20});
  extents.Add({30, 40});
  extents.Add({20, 22});
  extents.Add({5, 5});
  EXPECT_EQ("10-22 30-40", TextOf(extents));
  extents.Add({8, 35});
  EXPECT_EQ("8-40", TextOf(extents));
  EXPECT_EQ(32u, extents.Size());
  EXPECT_EQ(8u, extents.First().start);
  EXPECT_EQ(40u, extents.End());
}

TEST(Extents, AreCutWhereSomethingIsRemoved) {
  ExtentSet extents;
  extents.Add({10, 20});
  extents.Add({30, 40});
  extents.Remove({15, 17});
  extents.Remove({35, 50});
  EXPECT_EQ("10-15 17-20 30-35", TextOf(extents));
  extents.Remove({0, 32});
  EXPECT_EQ("32-35", TextOf(extents));
  EXPECT_TRUE(extents.Holds({32, 35}));
  EXPECT_FALSE(extents.Holds({32, 36}));
}

TEST(Extents, AreTakenInOrderAtEvenPositions) {
  ExtentSet extents;
  extents.Add({11, 20});
  extents.Add({30, 40});
  EXPECT_EQ(12u, extents.Take(5));
  EXPECT_EQ(30u, extents.Take(4));
  EXPECT_EQ(34u, extents.Take(2)) << "not where the first one left room";
  EXPECT_EQ(std::nullopt, extents.Take(5));
  EXPECT_EQ(36u, extents.Take(4));
  EXPECT_EQ(18u, extents.Take(2)) << "begins again";
  EXPECT_EQ("11-12 17-18", TextOf(extents));
}

TEST(Extents, AreTakenFromTheShortestThatHasRoom) {
  ExtentSet extents;
  extents.Add({10, 30});
  extents.Add({41, 46});  // room for 4 bytes from 42 on
  extents.Add({50, 54});
  extents.Add({60, 62});
  EXPECT_EQ(42u, extents.TakeFromShortest(3));
  EXPECT_EQ(50u, extents.TakeFromShortest(3));
  EXPECT_EQ(10u, extents.TakeFromShortest(3));
  EXPECT_EQ(std::nullopt, extents.TakeFromShortest(17));
  EXPECT_EQ("13-30 41-42 45-46 53-54 60-62", TextOf(extents));
}

/// The twin: one flag a byte.
class Bytes {
 public:
  void Set(Extent extent, bool isIn) {
    for (uint64_t i = extent.start; i < extent.end; ++i) in_[i] = isIn;
  }
  std::string Text() const {
    std::string text;
    for (const Extent& run : Runs())
      text += (text.empty() ? "" : " ") + std::to_string(run.start) + "-" + std::to_string(run.end);
    return text;
  }
  bool HasRoom(uint64_t bytes) const {
    const auto runs = Runs();
    return std::any_of(runs.begin(), runs.end(), [&](Extent run) { return Room(run) >= bytes; });
  }
  std::optional<uint64_t> ShortestRoom(uint64_t bytes) const {
    std::optional<Extent> best;
    for (const Extent& run : Runs())
      if (Room(run) >= bytes && (!best || Room(run) < Room(*best))) best = run;
    if (!best) return std::nullopt;
    return best->start % 2 == 0 ? best->start : best->start + 1;
  }

 private:
  static uint64_t Room(Extent run) {
    uint64_t bytes = 0;
    for (uint64_t i = run.start; i < run.end; ++i)
      if (bytes > 0 || i % 2 == 0) ++bytes;
    return bytes;
  }
  std::vector<Extent> Runs() const {
    std::vector<Extent> runs;
    for (uint64_t i = 0; i < in_.size(); ++i) {
      if (!in_[i]) continue;
      if (runs.empty() || runs.back().end != i) runs.push_back({i, i});
      runs.back().end = i + 1;
    }
    return runs;
  }

  std::vector<bool> in_ = std::vector<bool>(200);
};

TEST(Extents, AreThoseOfTheirBytesWhateverIsAddedRemovedAndTaken) {
  std::mt19937 random(7);
  const auto below = [&](unsigned end) { return random() % end; };
  unsigned taken = 0;
  for (int round = 0; round < 300; ++round) {
    ExtentSet extents;
    Bytes twin;
    for (int step = 0; step < 60; ++step) {
      const uint64_t start = below(190);
      const Extent extent{start, start + below(10)};
      const uint64_t bytes = 1 + below(12);
      std::optional<uint64_t> place;
      switch (below(5)) {
        case 0:
        case 1:
          extents.Add(extent);
          twin.Set(extent, true);
          break;
        case 2:
          extents.Remove(extent);
          twin.Set(extent, false);
          break;
        case 3: {
          const bool hasRoom = twin.HasRoom(bytes);
          place = extents.Take(bytes);
          ASSERT_EQ(hasRoom, place.has_value());
          break;
        }
        default: {
          const auto expected = twin.ShortestRoom(bytes);
          place = extents.TakeFromShortest(bytes);
          ASSERT_EQ(expected, place);
        }
      }
      if (place) {
        ++taken;
        ASSERT_EQ(0u, *place % 2);
        twin.Set({*place, *place + bytes}, false);
      }
      ASSERT_EQ(twin.Text(), TextOf(extents)) << "round " << round << ", step " << step;
    }
  }
  EXPECT_GT(taken, 1000u);
}

}  // namespace
}  // namespace orin::tests
