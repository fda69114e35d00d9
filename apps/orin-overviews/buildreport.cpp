// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildreport.h"

#include <algorithm>
#include <iterator>

#include "apps/orin-overviews/numberlist.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;
using datasources::LevelStatus;
using overviews::BuildPlan;
using overviews::RasterFacts;

const LevelDescription* FindIn(const std::vector<LevelDescription>& levels, unsigned level) {
  const auto found = std::find_if(levels.begin(), levels.end(),
                                  [&](const LevelDescription& l) { return l.level == level; });
  return found == levels.end() ? nullptr : &*found;
}

/// "already up to date: 2; kept unverified: 4" as far as there are such levels.
std::string KeptText(const BuildPlan& plan, const RasterFacts& facts) {
  const LevelState before{{}, {}, facts.inside.levels, facts.beside.levels};
  std::vector<unsigned> verified;
  std::vector<unsigned> unverified;
  for (const unsigned level : plan.kept) {
    const LevelDescription* stored = before.Find(level, plan.place);
    const bool isProved = stored && stored->status != LevelStatus::kUnverified;
    (isProved ? verified : unverified).push_back(level);
  }
  std::string text;
  if (!verified.empty())
    text = FormatString(_("already up to date: %s"), JoinNumbers(verified).c_str());
  if (unverified.empty()) return text;
  return text + (text.empty() ? "" : "; ") +
         FormatString(_("kept unverified: %s"), JoinNumbers(unverified).c_str());
}

/// "2, 4 (AVERAGE, inside the file); 8 (MODE, inside the file)"
std::string BuiltText(const BuildPlan& plan, const LevelState& state) {
  std::string text;
  std::vector<unsigned> run;
  std::string manner;
  const auto flush = [&] {
    if (!run.empty()) text += (text.empty() ? "" : "; ") + JoinNumbers(run) + " (" + manner + ")";
    run.clear();
  };
  for (const overviews::PlannedLevel& planned : plan.building) {
    const LevelDescription* level = state.Find(planned.level, plan.place);
    if (!level) continue;
    const std::string now = level->method + ", " + PlaceText(level->place, level->file);
    if (now != manner) flush();
    manner = now;
    run.push_back(planned.level);
  }
  flush();
  return text;
}

/// "Levels finished: 2, 4; still to do: 8." as far as there are such levels.
std::string StateText(const LevelState& state) {
  if (state.valid.empty())
    return FormatString(_("Levels finished: none; still to do: %s."),
                        JoinNumbers(state.unfinished).c_str());
  if (state.unfinished.empty())
    return FormatString(_("Levels finished: %s."), JoinNumbers(state.valid).c_str());
  return FormatString(_("Levels finished: %s; still to do: %s."), JoinNumbers(state.valid).c_str(),
                      JoinNumbers(state.unfinished).c_str());
}

std::vector<unsigned> FactorsOf(const std::vector<LevelDescription>& levels) {
  std::vector<unsigned> factors;
  for (const LevelDescription& level : levels) factors.push_back(level.level);
  return factors;
}

}  // namespace

const LevelDescription* LevelState::Find(unsigned level, LevelPlace place) const {
  if (place == LevelPlace::kInternal) return FindIn(inside, level);
  const LevelDescription* stored = FindIn(beside, level);
  return stored ? stored : FindIn(inside, level);
}

LevelState StateOf(datasources::LevelSite& site, const BuildPlan& plan) {
  LevelState state{{},
                   {},
                   overviews::LevelsIn(site, LevelPlace::kInternal),
                   overviews::LevelsIn(site, LevelPlace::kSideCar)};
  for (const unsigned level : plan.wanted) {
    const LevelDescription* stored = state.Find(level, plan.place);
    const bool isValid = stored && datasources::HoldsForAll(stored->validChannels, plan.channels);
    (isValid ? state.valid : state.unfinished).push_back(level);
  }
  return state;
}

std::string SummaryText(const BuildPlan& plan, const RasterFacts& facts, const LevelState& state) {
  if (plan.building.empty()) return NothingToDoText(plan, facts);
  std::string text = FormatString(_("levels built: %s"), BuiltText(plan, state).c_str());
  if (!plan.kept.empty()) text += "; " + KeptText(plan, facts);
  return text;
}

std::string NothingToDoText(const BuildPlan& plan, const RasterFacts& facts) {
  if (plan.channels.empty())
    return _("nothing to do: all channels are masks of one bit, which have no levels");
  if (!plan.kept.empty())
    return FormatString(_("nothing to do; %s"), KeptText(plan, facts).c_str());
  if (!plan.empty.empty())
    return _("nothing to do: every level asked for is larger than the image");
  return FormatString(_("nothing to do: %u x %u pixels need no levels"), facts.width, facts.height);
}

std::string BothPlacesText(const LevelState& state) {
  if (state.inside.empty() || state.beside.empty()) return "";
  return FormatString(
      _("Levels stand inside the file (%s) and in %s (%s). Other programs read those inside only."),
      JoinNumbers(FactorsOf(state.inside)).c_str(), state.beside.front().file.c_str(),
      JoinNumbers(FactorsOf(state.beside)).c_str());
}

std::string InterruptedText(const LevelState& state, bool force) {
  const std::string text = std::string(_("Interrupted.")) + " " + StateText(state);
  if (state.unfinished.empty()) return text;
  return text + " " +
         (force ? _("Run the same command without --force to resume.")
                : _("Run the same command again to resume."));
}

std::string RetryText(const LevelState& state, bool force) {
  if (state.unfinished.empty()) return "";
  return StateText(state) + " " +
         (force ? _("Fix the problem, then run the same command without --force to resume.")
                : _("Fix the problem, then run the same command again to resume."));
}

std::string PlaceText(LevelPlace place, const std::string& file) {
  return place == LevelPlace::kInternal ? std::string(_("inside the file"))
                                        : FormatString(_("in %s"), file.c_str());
}

}  // namespace orin::app
