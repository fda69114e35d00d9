// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/info.h"

#include <algorithm>

#include "apps/orin-overviews/rasterinfo.h"
#include "apps/orin-overviews/terminaltext.h"
#include "host/services/exception.h"

namespace orin::app {
namespace {

/// True unless a build would have a level of these to make again.
bool AreUpToDate(const std::vector<datasources::LevelDescription>& levels) {
  return std::none_of(levels.begin(), levels.end(), [](const auto& level) {
    return level.status == datasources::LevelStatus::kStale ||
           level.status == datasources::LevelStatus::kChanged ||
           level.status == datasources::LevelStatus::kUnfinished;
  });
}

}  // namespace

ExitCode RunInfo(const InfoOptions& options, Console& console) {
  try {
    const RasterInfo info = CollectInfo(options.file, options.update);
    console.Output(options.json ? JsonOf(info) : TableOf(info));
    return AreUpToDate(info.levels) && !info.leftOver ? kDone : kNotUpToDate;
  } catch (const Exception& error) {
    console.Error(AfterFileName(options.file, error.GetMessage()));
    return kCannotOpen;
  }
}

}  // namespace orin::app
