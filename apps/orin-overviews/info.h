/// The sub-command `info`: lists the levels of a file, wherever they are, and whether they match
/// it.
// SPDX-License-Identifier: MIT
#pragma once

#include "apps/orin-overviews/console.h"
#include "apps/orin-overviews/exitcode.h"
#include "apps/orin-overviews/infooptions.h"

namespace orin::app {

ExitCode RunInfo(const InfoOptions& options, Console& console);

}  // namespace orin::app
