// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/info.h"

#include <fmt/core.h>

#include "apps/orin-overviews/buildreport.h"
#include "apps/orin-overviews/rasterinfo.h"
#include "host/services/exception.h"

namespace orin::app {

ExitCode RunInfo(const InfoOptions& options, Console& console) {
  try {
    const RasterInfo info = CollectInfo(options.file);
    fmt::print("{}", options.json ? JsonOf(info) : TableOf(info));
    return kDone;
  } catch (const Exception& error) {
    console.Error(AfterFileName(options.file, error.GetMessage()));
    return kCannotOpen;
  }
}

}  // namespace orin::app
