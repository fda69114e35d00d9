/// The sentences that a build ends with.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/datasources/levelsite.h"
#include "processes/overviews/buildplan.h"

namespace orin::app {

/// The levels of a plan after its build.
struct LevelState {
  std::vector<unsigned> valid;       ///< wanted, and valid for the plan's channels
  std::vector<unsigned> unfinished;  ///< wanted, and not valid
  std::vector<datasources::LevelDescription> inside;
  std::vector<datasources::LevelDescription> beside;

  /// The level that the plan's place shows; null when there is none.
  const datasources::LevelDescription* Find(unsigned level, datasources::LevelPlace place) const;
};

LevelState StateOf(datasources::LevelSite& site, const overviews::BuildPlan& plan);

std::string SummaryText(const overviews::BuildPlan& plan, const overviews::RasterFacts& facts,
                        const LevelState& state);
std::string NothingToDoText(const overviews::BuildPlan& plan, const overviews::RasterFacts& facts);
/// What other programs make of levels in both places; empty when they stand in one.
std::string BothPlacesText(const LevelState& state);
/// \param force  the request was forced: the rest is built without
std::string InterruptedText(const LevelState& state, bool force);
/// After a failure, which comes back unless its cause goes; empty when nothing is left to do.
std::string RetryText(const LevelState& state, bool force);

/// "inside the file" or "in FILE.ovr"
std::string PlaceText(datasources::LevelPlace place, const std::string& file);

}  // namespace orin::app
