/// The sub-command `build`: makes the missing levels of every file named.
// SPDX-License-Identifier: MIT
#pragma once

#include "apps/orin-overviews/buildoptions.h"
#include "apps/orin-overviews/console.h"
#include "apps/orin-overviews/exitcode.h"

namespace orin::app {

/// Treats the files one by one; a file that fails does not stop the others, an interruption does.
/// \returns the file's own code for one file; for several `kDone`, `kSomeFailed` or `kInterrupted`
ExitCode RunBuild(const BuildOptions& options, Console& console);

}  // namespace orin::app
