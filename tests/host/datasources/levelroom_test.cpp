// SPDX-License-Identifier: MIT
#include "host/datasources/levelroom.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "host/services/exception.h"

namespace orin::datasources {
namespace {

std::string FileSomewhere() {
  return (std::filesystem::temp_directory_path() / "none.tif").string();
}

LevelRoom RoomIn(const std::string& file, uint64_t bytes) {
  LevelRoom room;
  room.file = file;
  room.bytes = bytes;
  return room;
}

TEST(LevelRoom, WhatFitsIsNoProblem) {
  EXPECT_EQ("", SpaceProblem(RoomIn(FileSomewhere(), 1)));
  EXPECT_NO_THROW(RequireRoom(RoomIn(FileSomewhere(), 1)));
}

TEST(LevelRoom, NoFileNeedsNoSpace) { EXPECT_EQ("", SpaceProblem(RoomIn("", uint64_t{1} << 62))); }

TEST(LevelRoom, ProblemNamesTheFileWhatIsNeededAndWhatIsFree) {
  const std::string file = FileSomewhere();
  const std::string problem = SpaceProblem(RoomIn(file, uint64_t{1} << 62));
  EXPECT_TRUE(problem.starts_with(file + ": ")) << problem;
  EXPECT_NE(std::string::npos, problem.find("4611686018427387904 bytes (4398046511104.0 MiB)"))
      << problem;
  EXPECT_NE(std::string::npos, problem.find("are free")) << problem;
}

TEST(LevelRoom, UnknownSpaceIsNoReasonToRefuse) {
  EXPECT_EQ("", SpaceProblem(RoomIn("/no/such/folder/a.tif", uint64_t{1} << 62)));
}

TEST(LevelRoom, ObstacleComesFirstAndWithItsAdvice) {
  try {
    RequireRoom({.file = FileSomewhere(),
                 .bytes = uint64_t{1} << 62,
                 .obstacle = "a.tif: is too small.",
                 .advice = "Stretch it."});
    ADD_FAILURE() << "nothing was refused";
  } catch (const Exception& refusal) {
    EXPECT_EQ("a.tif: is too small. Stretch it.", refusal.GetMessage());
  }
}

}  // namespace
}  // namespace orin::datasources
