/// The command line as a whole: what was asked, or the answer that ends the program at once.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>

#include "apps/orin-overviews/buildoptions.h"
#include "apps/orin-overviews/cleanoptions.h"
#include "apps/orin-overviews/infooptions.h"

namespace orin::app {

enum class Command { kBuild, kInfo, kClean };

/// A command line that was understood.
struct Invocation {
  Command command = Command::kBuild;
  bool verbose = false;
  std::string logFile;  ///< empty: none
  BuildOptions build;
  InfoOptions info;
  CleanOptions clean;
};

/// Reads the command line into `invocation`. Help and version go to standard output, a wrong usage
/// to standard error. \returns the exit status when the program ends here
std::optional<int> ParseCommandLine(int argc, const char* const* argv, Invocation& invocation);

}  // namespace orin::app
