/// What a user can ask of `build`.
// SPDX-License-Identifier: MIT
#pragma once

#include <CLI/App.hpp>
#include <string>
#include <vector>

#include "host/datasources/leveloptions.h"
#include "processes/overviews/resampletype.h"

namespace orin::app {

enum class Placement { kAutomatic, kInternal, kExternal };

struct BuildOptions {
  std::vector<std::string> files;
  std::vector<unsigned> levels;                           ///< empty: the whole pyramid of `factor`
  unsigned factor = 0;                                    ///< 2 or 3; 0: the user's preference
  QRTOverviewResampleType method = ResampleInvalid;       ///< ResampleInvalid: none is named
  QRTOverviewResampleType usualMethod = ResampleInvalid;  ///< of the environment; likewise
  std::vector<unsigned> channels;  ///< empty: all that are wider than one bit
  Placement placement = Placement::kAutomatic;
  datasources::LevelOptions storing;  ///< how new levels are stored
  bool force = false;
  bool quiet = false;
};

/// Adds the sub-command. `options` is filled while the command line is parsed and outlives `app`.
CLI::App* AddBuildCommand(CLI::App& app, BuildOptions& options);

/// Levels stand behind --levels; some other programs take them behind the file.
/// \throws CLI::ValidationError  a file that does not exist is named like a list of levels
void RefuseLevelsAmongFiles(const std::vector<std::string>& files);

}  // namespace orin::app
