/// What a user can ask of `info`.
// SPDX-License-Identifier: MIT
#pragma once

#include <CLI/App.hpp>
#include <string>

namespace orin::app {

struct InfoOptions {
  std::string file;
  bool json = false;
  bool update = false;  ///< keep what had to be read for the answer
};

/// Adds the sub-command. `options` is filled while the command line is parsed and outlives `app`.
CLI::App* AddInfoCommand(CLI::App& app, InfoOptions& options);

}  // namespace orin::app
