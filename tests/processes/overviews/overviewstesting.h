/// What the tests of the job and its run share.
// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "processes/overviews/createoverviews.h"
#include "tests/testing/pictures.h"
#include "tests/testing/recordinghost.h"

namespace orin::testing {

constexpr char kRunSource[] = "processes/overviews/createoverviews";

/// A job for explicit levels by nearest neighbour.
inline CreateFileOverviews JobFor(const std::string& file, const std::vector<unsigned>& levels,
                                  bool force = false) {
  CreateFileOverviews job(file);
  job.SetPyramidType(ResampleNearest);
  job.SetPyramidLevels(levels, force);
  return job;
}

/// Expects exactly one warning, at `line` of the run's source.
inline void ExpectOneWarning(const RecordingHost& host, unsigned line, const std::string& message) {
  ASSERT_EQ(1u, host.Warnings().size());
  EXPECT_EQ(message, host.Warnings()[0].message);
  EXPECT_EQ(kRunSource, host.Warnings()[0].sourceFile);
  EXPECT_EQ(line, host.Warnings()[0].line);
}

/// Levels that `store.Create` or `sidecar.Create` was asked for, in order.
inline std::vector<unsigned> CreatedLevels(const RecordingHost& host) {
  std::vector<unsigned> levels;
  for (const char* start : {"store.Create(", "sidecar.Create("})
    for (const std::string& line : host.Log(start))
      levels.push_back(static_cast<unsigned>(std::stoul(line.substr(line.find('(') + 1))));
  return levels;
}

/// Pixels of every channel of every level.
using LevelPixels = std::map<unsigned, std::vector<std::vector<unsigned char>>>;

inline LevelPixels PixelsOf(RecordingHost& host, const std::string& file,
                            datasources::LevelPlace place) {
  LevelPixels pixels;
  for (const auto& [level, stored] : host.Levels(file, place).levels)
    for (const auto& channel : stored.channels) pixels[level].push_back(channel.samples);
  return pixels;
}

/// Whether every channel of a level that is marked valid holds the pixels of an undisturbed run.
inline ::testing::AssertionResult ValidChannelsHold(const LevelPixels& undisturbed,
                                                    RecordingHost& host, const std::string& file,
                                                    datasources::LevelPlace place) {
  for (const auto& [level, stored] : host.Levels(file, place).levels)
    for (size_t c = 0; c < stored.channels.size(); ++c)
      if (stored.channels[c].valid && stored.channels[c].samples != undisturbed.at(level).at(c))
        return ::testing::AssertionFailure()
               << "level " << level << ", channel " << c + 1 << " is valid and not complete";
  return ::testing::AssertionSuccess();
}

/// True when `level` is marked valid for all of the file's channels.
inline bool IsValid(RecordingHost& host, const std::string& file, unsigned level,
                    datasources::LevelPlace place = datasources::LevelPlace::kInternal) {
  const auto& levels = host.Levels(file, place).levels;
  const auto found = levels.find(level);
  if (found == levels.end()) return false;
  for (const auto& channel : found->second.channels)
    if (!channel.valid) return false;
  return true;
}

}  // namespace orin::testing
