/// The sub-command `clean`: removes levels from every file named, and from the side-cars.
// SPDX-License-Identifier: MIT
#pragma once

#include "apps/orin-overviews/cleanoptions.h"
#include "apps/orin-overviews/console.h"
#include "apps/orin-overviews/exitcode.h"

namespace orin::app {

/// Treats the files one by one; a file that fails does not stop the others.
/// \returns the file's own code for one file; for several `kDone` or `kSomeFailed`
ExitCode RunClean(const CleanOptions& options, Console& console);

}  // namespace orin::app
