/// The tool: puts the host's parts together and hands over to the sub-command.
// SPDX-License-Identifier: MIT
#include <fmt/core.h>

#include <csignal>
#include <cstdio>

#include "apps/orin-overviews/build.h"
#include "apps/orin-overviews/clean.h"
#include "apps/orin-overviews/commandline.h"
#include "apps/orin-overviews/console.h"
#include "apps/orin-overviews/exitcode.h"
#include "apps/orin-overviews/info.h"
#include "apps/orin-overviews/locale.h"
#include "apps/orin-overviews/terminaltext.h"
#ifdef ORIN_HAS_GDAL
#include "host/drivers/gdal/gdaldriver.h"
#endif
#include "host/drivers/memory/memorydriver.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/exception.h"
#include "host/services/preferences.h"
#include "host/services/text.h"

namespace {

using namespace orin::app;

bool IsQuiet(const Invocation& invocation) {
  return (invocation.command == Command::kBuild && invocation.build.quiet) ||
         (invocation.command == Command::kClean && invocation.clean.quiet);
}

ExitCode RunCommand(const Invocation& invocation, Console& console) {
  switch (invocation.command) {
    case Command::kInfo:
      return RunInfo(invocation.info, console);
    case Command::kClean:
      return RunClean(invocation.clean, console);
    case Command::kBuild:
      break;
  }
  return RunBuild(invocation.build, console);
}

int Run(const Invocation& invocation) {
  Console console({IsQuiet(invocation), invocation.verbose, invocation.logFile});
  const LibraryReports reports(console);
  orin::drivers::RegisterMemoryDriver();
  orin::drivers::RegisterTiffDriver();
#ifdef ORIN_HAS_GDAL
  orin::drivers::RegisterGdalDriver();  // after it: local TIFF files are the TIFF driver's
#endif
  PreferenceRegistry::Install(
      orin::LoadPreferences(orin::PreferenceFilePath(), orin::IsPreferenceFileNamed()));
  const ExitCode code = RunCommand(invocation, console);
  if (console.OutputProblem().empty()) return code;
  console.Error(
      FormatString(_("The output cannot be written: %s."), console.OutputProblem().c_str()));
  return code == kDone ? kCannotBuild : code;
}

}  // namespace

int main(int argc, char** argv) {
  std::signal(SIGXFSZ, SIG_IGN);  // a file that grows too large is reported as an error
  std::signal(SIGPIPE, SIG_IGN);  // so is a reader that went away; no build is lost to it
  try {
    ChooseLanguage();
    Invocation invocation;
    if (const auto ended = ParseCommandLine(argc, argv, invocation)) return *ended;
    return Run(invocation);
  } catch (const orin::Exception& error) {
    fmt::print(stderr, "orin-overviews: {}\n", Printable(error.GetMessage()));
  } catch (const std::exception& error) {
    fmt::print(stderr, "orin-overviews: {}\n", Printable(error.what()));
  }
  return kCannotBuild;
}
