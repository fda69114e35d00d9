/// What the tool's exit status tells a script.
// SPDX-License-Identifier: MIT
#pragma once

namespace orin::app {

enum ExitCode : int {
  kDone = 0,          ///< done, or nothing to do
  kSomeFailed = 1,    ///< one or more of several files failed; the others are done
  kWrongUsage = 2,    ///< the command line asks for something that cannot be
  kNotUpToDate = 3,   ///< `info` found a level that is stale or not finished
  kCannotOpen = 4,    ///< the file cannot be opened as a raster
  kCannotBuild = 5,   ///< something cannot be written or computed
  kInterrupted = 130  ///< the user stopped the run
};

}  // namespace orin::app
