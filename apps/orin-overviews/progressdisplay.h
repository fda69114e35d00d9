/// Shows a run's progress: a bar on a terminal, else one line for each finished level.
// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "apps/orin-overviews/console.h"

namespace orin::app {

class ProgressDisplay {
 public:
  virtual ~ProgressDisplay() = default;
  /// `overall` of the run is done (0.0 to 1.0) and `level` is being built.
  virtual void Show(double overall, unsigned level) = 0;
  virtual void LevelDone(unsigned level) = 0;
  /// Takes away what is not to stay.
  virtual void Clear() = 0;
};

/// The display that suits: none when `quiet`, a bar when standard error is a terminal, else lines.
/// \param file  as the user names it. `console` outlives the display.
std::unique_ptr<ProgressDisplay> MakeProgressDisplay(Console& console, const std::string& file,
                                                     bool quiet);

/// The bar's one line: file, level, bar and per cent in at most `columns` columns.
std::string ProgressLine(const std::string& file, unsigned level, double overall, unsigned columns);

}  // namespace orin::app
