/// Builds the missing levels of one raster, pass by pass.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"

namespace orin::overviews {

/// What a run builds, and with which method.
struct LevelRequest {
  datasources::IRasterDataset* raster;     ///< outlives the run
  std::vector<unsigned> channels;          ///< 1-based
  std::vector<unsigned> levels;            ///< to build, in this order
  resamplers::IResamplerFactory* factory;  ///< null for a method that does not exist
  std::string methodName;                  ///< recorded with the levels
  bool isTiff;                             ///< all channels in one pass
  bool onlyFromDivisors;                   ///< a level's source must divide it
  bool showProgress;                       ///< a message at the start of each level
};

class LevelRun {
 public:
  explicit LevelRun(const LevelRequest& request);

  /// Builds all levels. \returns false when the user asked to stop before everything was done
  /// \throws orin::Exception  what the host or the method throws; levels finished before stay valid
  bool Build();

 private:
  /// Part of the whole run's progress that one pass reports.
  struct Range {
    float start;
    float end;
  };

  bool IsEmpty(unsigned level) const;
  bool BuildLevel(unsigned level);
  bool BuildPass(unsigned level, const std::vector<unsigned>& channels, const Range& range);

  const LevelRequest& request_;
  double totalCost_ = 0;  ///< of all levels, in units of one full-resolution pass
  double done_ = 0;       ///< fraction of the run
  size_t passesLeft_ = 0;
};

}  // namespace orin::overviews
