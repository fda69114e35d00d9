// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildprogress.h"

#include <fmt/core.h>

#include "apps/orin-overviews/terminaltext.h"
#include "host/services/text.h"

namespace orin::app {

bool BuildProgress::Advance(double overall) {
  display_.Show(overall, level_);
  return !interruption_.Requested();
}

void BuildProgress::LevelDone(const overviews::BuiltLevel& level) {
  display_.LevelDone(level.level);
  const std::string source = level.sourceLevel == 1
                                 ? std::string(_("the image"))
                                 : FormatString(_("level %u"), level.sourceLevel);
  const std::string seconds = fmt::format("{:.2f}", level.seconds);  // a point in every language
  console_.Event(
      AfterFileName(file_, FormatString(_("level %u: %s from %s, %zu blocks, %s s, %s"),
                                        level.level, level.method.c_str(), source.c_str(),
                                        level.blocks, seconds.c_str(), place_.c_str())));
}

}  // namespace orin::app
