/// The sentences that a build ends with, and the exit code of a failed one.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "apps/orin-overviews/buildplan.h"
#include "apps/orin-overviews/exitcode.h"

namespace orin::app {

/// Every line of `text` after "FILE: ", which stands once however the line begins.
std::string AfterFileName(const std::string& file, const std::string& text);

std::string SummaryText(const BuildPlan& plan, const LevelState& state);
std::string NothingToDoText(const BuildPlan& plan);
/// Which levels are built again because the image was changed; empty without such levels.
std::string StaleText(const BuildPlan& plan);
/// Why a level larger than the image is not built.
std::string LeftOutText(const BuildPlan& plan, unsigned level);
/// Why a method that computes means does not suit a palette or classes.
std::string BlendedClassesText();
/// What becomes of an alpha channel that is stored with loss.
std::string BlurredAlphaText();
/// What to know of levels in both places; empty when they stand in one.
std::string HiddenLevelsText(const LevelState& state);
std::string InterruptedText(const LevelState& state, const BuildOptions& options);

/// What to do after the run warned at `line` of its source; 0: it did not. Empty when the warning
/// says all.
std::string AdviceAfterFailure(unsigned line, const LevelState& state, const BuildOptions& options);
ExitCode CodeOfWarning(unsigned line);

}  // namespace orin::app
