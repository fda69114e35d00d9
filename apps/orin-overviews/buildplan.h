/// What a build is going to do with one file, as the library will decide it.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "apps/orin-overviews/buildoptions.h"
#include "apps/orin-overviews/progressmodel.h"
#include "host/datasources/dataset.h"
#include "host/datasources/levelroom.h"
#include "host/model/levelsize.h"

namespace orin::app {

/// A file opened as a job with this placement opens it: for update where that is possible, through
/// the generic layer where levels belong into the side-car.
/// \throws orin::Exception  it cannot be opened; the text names the file and the reason
std::unique_ptr<datasources::IDataset> OpenForBuild(const std::string& file, Placement placement);

struct BuildPlan {
  unsigned width = 0;   ///< pixels
  unsigned height = 0;  ///< pixels
  unsigned channelCount = 0;
  std::vector<unsigned> bitChannels;  ///< masks of one bit, which have no levels
  bool holdsClasses = false;          ///< pixels number colours of a palette, or classes
  std::vector<unsigned> channels;   ///< to be treated; those of the user, or all wider than one bit
  std::vector<unsigned> requested;  ///< levels, ascending, each once
  std::vector<unsigned> kept;       ///< of these: present, valid and not to be forced
  std::vector<unsigned> unverified;  ///< of the kept ones: whether they match the image is unknown
  std::vector<unsigned> stale;       ///< of those to be built: computed from other data than now
  std::vector<PlannedLevel>
      building;  ///< the others in the order of building, repeated ones repeated
  LevelReport report = LevelReport::kWithinShare;
  datasources::LevelRoom room;  ///< that the levels to be built take

  bool IsEmpty(unsigned level) const { return model::LevelSizeOf(width, height, level).IsEmpty(); }
};

/// \throws orin::Exception  the file cannot be opened or is no raster
BuildPlan PlanBuild(const BuildOptions& options, const std::string& file);

/// The levels of `plan` that are valid for its channels now, ascending.
struct LevelState {
  std::vector<unsigned> valid;
  std::vector<unsigned> unfinished;  ///< requested, not empty, and not valid
  std::vector<datasources::LevelDescription>
      descriptions;  ///< of all levels that the build can see
};

/// Looks at the file again. \throws orin::Exception  the file cannot be opened
LevelState LookAtLevels(const BuildPlan& plan, const BuildOptions& options,
                        const std::string& file);

}  // namespace orin::app
