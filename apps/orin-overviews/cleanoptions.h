/// What a user can ask of `clean`.
// SPDX-License-Identifier: MIT
#pragma once

#include <CLI/App.hpp>
#include <string>
#include <vector>

#include "apps/orin-overviews/buildoptions.h"

namespace orin::app {

struct CleanOptions {
  std::vector<std::string> files;
  std::vector<unsigned> levels;                 ///< empty: all
  Placement placement = Placement::kAutomatic;  ///< kAutomatic: in both places
  bool quiet = false;
};

/// Adds the sub-command. `options` is filled while the command line is parsed and outlives `app`.
CLI::App* AddCleanCommand(CLI::App& app, CleanOptions& options);

}  // namespace orin::app
