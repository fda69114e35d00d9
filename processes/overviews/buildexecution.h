/// Carries a plan out, level by level.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <string>

#include "host/datasources/dataset.h"
#include "processes/overviews/buildplan.h"

namespace orin::overviews {

/// A level that was built.
struct BuiltLevel {
  unsigned level;
  unsigned sourceLevel;  ///< 1: the image
  std::string method;
  size_t blocks;  ///< of all passes
  double seconds;
};

/// Is told how a build gets on, by the thread that runs it.
class IBuildObserver {
 public:
  virtual ~IBuildObserver() = default;
  virtual void LevelBegins(const PlannedLevel& level) = 0;
  /// \param overall  fraction of the whole build that is done, 0.0 to 1.0; never less than before
  /// \returns false to stop
  virtual bool Advance(double overall) = 0;
  virtual void LevelDone(const BuiltLevel& level) = 0;
};

enum class BuildEnd { kComplete, kCancelled, kFailed };

struct BuildResult {
  BuildEnd end = BuildEnd::kComplete;
  std::string reason;  ///< of a failure
};

/// \param raster  whose new levels go to the plan's place
/// \throws nothing of the host: a failure is a result
BuildResult ExecuteBuild(datasources::IRasterDataset& raster, const BuildPlan& plan,
                         IBuildObserver& observer);

}  // namespace orin::overviews
