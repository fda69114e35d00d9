// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildreport.h"

#include <algorithm>
#include <iterator>

#include "apps/orin-overviews/numberlist.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

/// Lines at which a run reports, see the messages there.
enum WarningLine : unsigned {
  kChannelOutside = 609,
  kLevelTooSmall = 625,
  kLevelLargerThanImage = 641,
  kFormatHoldsNoLevels = 658,
  kFileIsReadOnly = 670,
  kComplexNotSupported = 698,
  kRunFailed = 913,
};

/// The levels that this run built: valid now and not kept.
std::vector<unsigned> BuiltLevels(const BuildPlan& plan, const LevelState& state) {
  std::vector<unsigned> built;
  for (const unsigned level : state.valid)
    if (std::find(plan.kept.begin(), plan.kept.end(), level) == plan.kept.end())
      built.push_back(level);
  return built;
}

std::string PlaceText(const datasources::LevelDescription& level) {
  return level.place == datasources::LevelPlace::kInternal
             ? std::string(_("inside the file"))
             : FormatString(_("in %s"), level.file.c_str());
}

/// "already up to date: 2; kept unverified: 4" as far as there are such levels.
std::string KeptText(const BuildPlan& plan) {
  std::vector<unsigned> verified;
  std::set_difference(plan.kept.begin(), plan.kept.end(), plan.unverified.begin(),
                      plan.unverified.end(), std::back_inserter(verified));
  std::string text;
  if (!verified.empty())
    text = FormatString(_("already up to date: %s"), JoinNumbers(verified).c_str());
  if (plan.unverified.empty()) return text;
  return text + (text.empty() ? "" : "; ") +
         FormatString(_("kept unverified: %s"), JoinNumbers(plan.unverified).c_str());
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

std::string ContinueText(const BuildOptions& options) {
  return options.force ? _("The same command without --force continues there.")
                       : _("The same command continues there.");
}

/// After a failure, which comes back unless its cause goes.
std::string RetryText(const BuildOptions& options) {
  return options.force
             ? _("When the cause is removed, the same command without --force continues there.")
             : _("When the cause is removed, the same command continues there.");
}

}  // namespace

std::string AfterFileName(const std::string& file, const std::string& text) {
  const std::string name = file + ": ";
  std::string lines;
  for (size_t start = 0; start < text.size();) {
    const size_t end = std::min(text.find('\n', start), text.size());
    const std::string line = text.substr(start, end - start);
    start = end + 1;
    if (line.empty()) continue;
    if (!lines.empty()) lines += '\n';
    lines += line.compare(0, name.size(), name) == 0 ? line : name + line;
  }
  return lines;
}

std::string SummaryText(const BuildPlan& plan, const LevelState& state) {
  const std::vector<unsigned> built = BuiltLevels(plan, state);
  if (built.empty()) return NothingToDoText(plan);
  const auto level = std::find_if(state.descriptions.begin(), state.descriptions.end(),
                                  [&](const auto& l) { return l.level == built.front(); });
  std::string text = FormatString(_("levels built: %s (%s, %s)"), JoinNumbers(built).c_str(),
                                  level->method.c_str(), PlaceText(*level).c_str());
  if (!plan.kept.empty()) text += "; " + KeptText(plan);
  return text;
}

std::string NothingToDoText(const BuildPlan& plan) {
  if (plan.channels.empty())
    return _("nothing to do: all channels are masks of one bit, which have no levels");
  if (!plan.kept.empty()) return FormatString(_("nothing to do; %s"), KeptText(plan).c_str());
  if (!plan.building.empty())
    return _("nothing to do: every level asked for is larger than the image");
  return FormatString(_("nothing to do: %u x %u pixels need no levels"), plan.width, plan.height);
}

std::string StaleText(const BuildPlan& plan) {
  if (plan.stale.empty()) return "";
  return FormatString(_("the image was changed after these levels were built: %s."),
                      JoinNumbers(plan.stale).c_str());
}

std::string LeftOutText(const BuildPlan& plan, unsigned level) {
  return FormatString(_("level %u is left out: of %u x %u pixels nothing would remain."), level,
                      plan.width, plan.height);
}

std::string BlendedClassesText() {
  return _(
      "the pixels are numbers of palette colours or classes: this method invents colours and "
      "classes that the image does not hold. Use --method mode or --method nearest.");
}

std::string BlurredAlphaText() {
  return _(
      "JPEG keeps the alpha channel of the levels roughly: transparent pixels do not stay quite "
      "transparent, opaque ones not quite opaque. Programs that read the masks of the levels see "
      "them exactly. Another COMPRESS keeps alpha as it is.");
}

std::string HiddenLevelsText(const LevelState& state) {
  const auto stands = [&](datasources::LevelPlace place) {
    return std::any_of(state.descriptions.begin(), state.descriptions.end(),
                       [&](const auto& level) { return level.place == place; });
  };
  if (!stands(datasources::LevelPlace::kInternal) || !stands(datasources::LevelPlace::kSideCar))
    return "";
  return _("many programs see only the levels inside the file when there are some beside it too.");
}

std::string InterruptedText(const LevelState& state, const BuildOptions& options) {
  const std::string text = std::string(_("Interrupted.")) + " " + StateText(state);
  return state.unfinished.empty() ? text : text + " " + ContinueText(options);
}

std::string AdviceAfterFailure(unsigned line, const LevelState& state,
                               const BuildOptions& options) {
  switch (line) {
    case kLevelLargerThanImage:
      return _("Leave out --force, which makes this an error, or name smaller levels.");
    case kFormatHoldsNoLevels:
    case kFileIsReadOnly:
      return _("Use --external instead of --internal: the levels go to a file beside it.");
    case kComplexNotSupported:
      return _("Use --method nearest or --method average.");
    case kRunFailed:
      return state.unfinished.empty() ? "" : StateText(state) + " " + RetryText(options);
    default:
      return "";
  }
}

ExitCode CodeOfWarning(unsigned line) {
  switch (line) {
    case kChannelOutside:
    case kLevelTooSmall:
    case kLevelLargerThanImage:
    case kComplexNotSupported:
      return kWrongUsage;
    default:
      return kCannotBuild;
  }
}

}  // namespace orin::app
