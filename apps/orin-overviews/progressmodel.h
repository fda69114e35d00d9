/// Turns the fractions that a run reports into one that only grows.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <vector>

namespace orin::app {

/// A level that the run is going to build.
struct PlannedLevel {
  unsigned level;      ///< decimation factor, 2 or more
  bool empty = false;  ///< larger than the image: the run counts it and leaves it out
};

/// How a run reports while it builds one level; `done` is the fraction at which the level began.
enum class LevelReport {
  kToTheEnd,    ///< from `done` up to 1.0: all channels in one pass
  kWithinShare  ///< from `done` up to `done` plus the level's share: one pass after another
};

class ProgressModel {
 public:
  /// \param levels  in the order in which they are built
  ProgressModel(std::vector<PlannedLevel> levels, LevelReport report);

  /// The next level begins. \param done  the fraction that the run reports with it
  void StartLevel(double done);

  /// The fraction of the whole run, 0.0 to 1.0, that `fraction` means: never less than the one
  /// before, and 1.0 only when the last level is complete.
  double Overall(double fraction);

  bool HasLevel() const { return started_ > 0; }
  /// The level being built. \pre HasLevel()
  unsigned CurrentLevel() const { return levels_[started_ - 1].level; }

 private:
  double LevelFraction(double fraction) const;

  std::vector<PlannedLevel> levels_;  ///< those that are built
  LevelReport report_;
  double costOfAll_ = 0;  ///< as the run counts it: what it leaves out included
  double costOfBuilt_ = 0;
  double costBefore_ = 0;  ///< of the levels before the current one
  size_t started_ = 0;
  double done_ = 0;  ///< where the current level began, as the run counts
  double overall_ = 0;
};

}  // namespace orin::app
