/// Builds that stop half-way: given up, killed, or never marked valid.
// SPDX-License-Identifier: MIT
#include <sys/wait.h>
#include <unistd.h>

#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

const Layout kImage{
    .width = 200, .height = 160, .samples = 3, .tile = 32, .photometric = PHOTOMETRIC_RGB};
constexpr unsigned kBlocks = 6;  // of 40 pixels, of level 2

class Interrupted : public TiffStore {
 protected:
  Interrupted() : file_(folder_.File("image.tif")) { WriteImage(file_, kImage); }

  /// Builds level 2 in a process of its own, which ends without any clean-up before block `stop`,
  /// or before the level is marked valid.
  void KilledBuild(unsigned stop, const std::string& method = "NEAREST") const {
    const pid_t child = fork();
    ASSERT_LE(0, child);
    if (child == 0) {
      const auto dataset = Open(file_, datasources::kUpdate);
      datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
      accessor.SetResamplingName(method);
      accessor.CreateLevel(2);
      const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
      WriteBlocks(*writer, LevelLayout(kImage, 2), 40, [&](unsigned block) {
        if (block == stop) _exit(7);
        return true;
      });
      _exit(7);
    }
    int status = 0;
    ASSERT_EQ(child, waitpid(child, &status, 0));
    ASSERT_TRUE(WIFEXITED(status));
    ASSERT_EQ(7, WEXITSTATUS(status));
  }
  std::string file_;
};

TEST_F(Interrupted, BuildLeavesTheFileAsItWas) {
  const auto before = BytesOf(file_);
  for (unsigned stop = 0; stop < kBlocks; ++stop) {
    Build(file_, kImage,
          {.level = 2,
           .edge = 40,
           .goesOn = [=](unsigned block) { return block < stop; },
           .marksValid = false});
    EXPECT_EQ(before, BytesOf(file_)) << "stopped before block " << stop;
  }
}

TEST_F(Interrupted, TheSecondOfTwoBuildsAtOnceIsRefusedAndTheFirstOneFinishes) {
  const auto first = Open(file_, datasources::kUpdate);
  const auto second = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor toFirst(first.get(), {1, 2, 3});
  datasources::BasicOverviewWriterAccessor toSecond(second.get(), {1, 2, 3});
  for (auto* accessor : {&toFirst, &toSecond}) {
    accessor->SetResamplingName("NEAREST");
    accessor->CreateLevel(2);
  }
  const std::unique_ptr<IRasterWriter> writer(toFirst.CreateRasterWriter(2));
  const std::unique_ptr<IRasterWriter> other(toSecond.CreateRasterWriter(2));
  bool isRefused = false;
  WriteBlocks(*writer, LevelLayout(kImage, 2), 40, [&](unsigned block) {
    if (block != 1) return true;
    try {
      WriteBlocks(*other, LevelLayout(kImage, 2), 40, [](unsigned) { return true; });
    } catch (const orin::Exception& refusal) {
      const std::string text = refusal.GetMessage();
      isRefused = text.find("another build is writing") != std::string::npos;
      EXPECT_NE(text.npos, text.find("(process " + std::to_string(getpid()) + ")")) << text;
    }
    return true;
  });
  toFirst.SetLevelValid(2, true);
  EXPECT_TRUE(isRefused);
  const auto levels = LevelsOf(*Open(file_, datasources::kReadOnly));
  ASSERT_EQ(1u, levels.size());
  EXPECT_EQ(std::vector<bool>(3, true), levels[0].validChannels);
}

TEST_F(Interrupted, BuildOfALaterLevelLeavesTheEarlierOnes) {
  Build(file_, kImage, {.level = 2});
  const auto before = BytesWithoutRecords(file_);
  Build(file_, kImage,
        {.level = 4,
         .edge = 20,
         .goesOn = [](unsigned block) { return block < 3; },
         .marksValid = false});
  EXPECT_EQ(before, BytesWithoutRecords(file_));
  EXPECT_EQ("111", ValidityOf(LevelsOf(file_).at(0)));
}

TEST_F(Interrupted, RebuildKeepsTheOldPixelsButNotTheirValidity) {
  Build(file_, kImage, {.level = 2});
  const auto before = BytesOf(file_);
  for (unsigned stop = 1; stop < kBlocks; ++stop) {
    Build(file_, kImage,
          {.level = 2,
           .edge = 40,
           .goesOn = [=](unsigned block) { return block < stop; },
           .marksValid = false});
    EXPECT_EQ(before.size(), BytesOf(file_).size());
    EXPECT_EQ("000", ValidityOf(LevelsOf(file_).at(0)));
    EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
  }
}

TEST_F(Interrupted, CompleteLevelThatNobodyMarkedIsKeptAsNotValid) {
  Build(file_, kImage, {.level = 2, .marksValid = false});
  EXPECT_EQ("000", ValidityOf(LevelsOf(file_).at(0)));
  EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
}

TEST_F(Interrupted, KilledBuildLeavesTheImageAndNoLevelAndTheNextBuildFinishes) {
  const auto before = BytesOf(file_);
  for (unsigned stop = 0; stop <= kBlocks; ++stop) {
    KilledBuild(stop);
    EXPECT_TRUE(StartsWith(BytesOf(file_), before)) << "killed before block " << stop;
    EXPECT_TRUE(LevelsOf(file_).empty());
  }
  Build(file_, kImage, {.level = 2});
  EXPECT_EQ("111", ValidityOf(LevelsOf(file_).at(0)));
  EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
}

TEST_F(Interrupted, KilledRebuildIsNotValidAndStillHoldsTheOldPixels) {
  Build(file_, kImage, {.level = 2});
  for (const char* method : {"NEAREST", "AVERAGE"})
    for (unsigned stop = 1; stop <= kBlocks; ++stop) {
      KilledBuild(stop, method);
      EXPECT_EQ("000", ValidityOf(LevelsOf(file_).at(0)));
      EXPECT_EQ("NEAREST", LevelsOf(file_).at(0).method);
      EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
    }
  Build(file_, kImage, {.level = 2, .method = "AVERAGE"});
  EXPECT_EQ("111", ValidityOf(LevelsOf(file_).at(0)));
}

TEST_F(Interrupted, BuildTakesNoTileOfALevelThatIsRebuiltMeanwhile) {
  Build(file_, kImage, {.level = 2});
  const auto dataset = Open(file_, datasources::kUpdate);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
  accessor.CreateLevel(4);
  {
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(4));
    WriteBlocks(*writer, LevelLayout(kImage, 4), 32, [](unsigned block) { return block < 1; });
    Build(*dataset, kImage, {.level = 2});
  }
  EXPECT_EQ("111", ValidityOf(LevelsOf(file_).at(0)));
  EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(kImage, 2)));
}

TEST_F(Interrupted, SomeChannelsOfAPlanarLevelAreKeptWhenOthersAreGivenUp) {
  Layout planar = kImage;
  planar.planar = true;
  WriteImage(file_, planar);
  Build(file_, planar, {.level = 2, .channels = {2}});
  EXPECT_EQ("-1-", ValidityOf(LevelsOf(file_).at(0)));
  Build(file_, planar,
        {.level = 2,
         .edge = 40,
         .channels = {1},
         .goesOn = [](unsigned block) { return block < 2; },
         .marksValid = false});
  EXPECT_EQ("-1-", ValidityOf(LevelsOf(file_).at(0)));
  Build(file_, planar, {.level = 2, .channels = {1, 3}});
  EXPECT_EQ("111", ValidityOf(LevelsOf(file_).at(0)));
  EXPECT_EQ("", WrongTile(file_, 1, LevelLayout(planar, 2)));
}

}  // namespace
}  // namespace orin::tests
