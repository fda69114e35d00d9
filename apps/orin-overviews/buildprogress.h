/// Shows how a build gets on, and passes on the user's wish to stop.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "apps/orin-overviews/console.h"
#include "apps/orin-overviews/interruption.h"
#include "apps/orin-overviews/progressdisplay.h"
#include "processes/overviews/buildexecution.h"

namespace orin::app {

class BuildProgress final : public overviews::IBuildObserver {
 public:
  /// \param place  where the levels go, for the events: "inside the file"
  BuildProgress(ProgressDisplay& display, const Interruption& interruption, Console& console,
                std::string file, std::string place)
      : display_(display),
        interruption_(interruption),
        console_(console),
        file_(std::move(file)),
        place_(std::move(place)) {}

  void LevelBegins(const overviews::PlannedLevel& level) override { level_ = level.level; }
  bool Advance(double overall) override;
  void LevelDone(const overviews::BuiltLevel& level) override;

 private:
  ProgressDisplay& display_;
  const Interruption& interruption_;
  Console& console_;
  std::string file_;
  std::string place_;
  unsigned level_ = 0;  ///< that is being built
};

}  // namespace orin::app
