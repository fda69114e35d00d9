// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/progressdisplay.h"

#include <gtest/gtest.h>

namespace orin::app {
namespace {

TEST(ProgressLine, ShowsFileLevelBarAndPerCent) {
  EXPECT_EQ("scene.tif: level 4 [=====     ]  50%",
            ProgressLine("some/folder/scene.tif", 4, 0.5, 36));
}

TEST(ProgressLine, FillsTheColumnsAndNeverMore) {
  for (unsigned columns = 0; columns < 200; ++columns) {
    const std::string line = ProgressLine("scene.tif", 16, 1.0, columns);
    EXPECT_LE(line.size(), columns);
    if (columns > 40) {
      EXPECT_EQ(columns, line.size());
    }
  }
}

TEST(ProgressLine, ANarrowTerminalGetsThePerCentAlone) {
  EXPECT_EQ(" 42%", ProgressLine("scene.tif", 4, 0.42, 20));
  EXPECT_EQ("", ProgressLine("scene.tif", 4, 0.42, 3));
}

TEST(ProgressLine, ALongNameShowsItsEndWithoutCuttingACharacter) {
  const std::string line = ProgressLine(
      "\xC3\xA9\xC3\xA9\xC3\xA9\xC3\xA9"
      "123456789012345678901234567.tif",
      2, 0, 80);
  EXPECT_EQ(0u, line.find("...567890123456")) << line;
  const std::string accents = ProgressLine(std::string(40, 'a') +
                                               "\xC3\xA9"
                                               "23456789012345678901234567",
                                           2, 0, 80);
  EXPECT_EQ(0u, accents.find("...\xC3\xA9"
                             "2345"))
      << accents;
}

TEST(ProgressLine, HundredPerCentIsForTheEndAlone) {
  EXPECT_NE(std::string::npos, ProgressLine("a.tif", 2, 0.9999, 60).find(" 99%"));
  EXPECT_NE(std::string::npos, ProgressLine("a.tif", 2, 1.0, 60).find("100%"));
}

/// Writes down what it is asked to show.
class Recording final : public ProgressDisplay {
 public:
  void Show(double overall, unsigned level) override {
    shown.emplace_back(level, static_cast<int>(overall * 100));
  }
  void LevelDone(unsigned level) override { done.push_back(level); }
  void Clear() override { ++cleared; }

  std::vector<std::pair<unsigned, int>> shown;
  std::vector<unsigned> done;
  int cleared = 0;
};

TEST(ProgressReporter, ALevelIsDoneWhenTheNextOneBegins) {
  Recording display;
  ProgressReporter reporter(ProgressModel({{2}, {4}}, LevelReport::kToTheEnd), display);
  reporter.Report(0.0, false);
  EXPECT_TRUE(display.shown.empty());
  reporter.Report(0.0, true);
  reporter.Report(0.5, false);
  EXPECT_TRUE(display.done.empty());
  reporter.Report(0.8, true);
  EXPECT_EQ(std::vector<unsigned>{2}, display.done);
  reporter.Report(1.0, false);
  reporter.Finish(true);
  EXPECT_EQ((std::vector<unsigned>{2, 4}), display.done);
  EXPECT_EQ((std::vector<std::pair<unsigned, int>>{{2, 0}, {2, 40}, {4, 80}, {4, 100}}),
            display.shown);
  EXPECT_EQ(1, display.cleared);
}

TEST(ProgressReporter, ALevelThatWasNotFinishedIsNotDone) {
  Recording display;
  ProgressReporter reporter(ProgressModel({{2}, {4}}, LevelReport::kToTheEnd), display);
  reporter.Report(0.0, true);
  reporter.Report(0.3, false);
  reporter.Finish(false);
  EXPECT_TRUE(display.done.empty());
  EXPECT_EQ(1, display.cleared);
}

}  // namespace
}  // namespace orin::app
