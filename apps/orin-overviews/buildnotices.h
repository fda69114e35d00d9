/// What a user is told before a build: why it cannot be, what is built again, and where levels go.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "apps/orin-overviews/exitcode.h"
#include "host/datasources/levelsite.h"
#include "processes/overviews/buildplan.h"

namespace orin::app {

/// Why the plan's request cannot be met, and what to do. \pre plan.fault is one
std::string FaultText(const overviews::BuildPlan& plan, const overviews::RasterFacts& facts,
                      const datasources::LevelSite& site);
ExitCode CodeOf(overviews::Fault fault);

/// One text for each thing worth knowing, in order.
std::vector<std::string> NoticesOf(const overviews::BuildPlan& plan,
                                   const overviews::BuildRequest& request,
                                   const overviews::RasterFacts& facts, const std::string& file);
/// What may go wrong with the pixels.
std::vector<std::string> WarningsOf(const overviews::BuildPlan& plan,
                                    const overviews::RasterFacts& facts, bool blursAlpha);
/// Why a level is not built that would have no pixel.
std::string EmptyLevelText(unsigned level, const overviews::RasterFacts& facts);

}  // namespace orin::app
