// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildnotices.h"

#include <algorithm>
#include <map>

#include "apps/orin-overviews/numberlist.h"
#include "host/services/text.h"
#include "processes/overviews/overviewmethod.h"

namespace orin::app {
namespace {

using datasources::LevelPlace;
using overviews::BuildPlan;
using overviews::Fault;
using overviews::PlaceReason;
using overviews::RasterFacts;
using overviews::Reason;

std::string UseExternal() {
  return _("Use --external instead of --internal: the levels go to a file beside it.");
}

/// Why levels cannot stand inside, as the file's driver says it.
std::string ReadOnlyText(const datasources::LevelSite& site) {
  const std::string reason = site.UpdateRefusal().empty()
                                 ? std::string(_("The file is open for reading only."))
                                 : site.UpdateRefusal();
  return reason + " " + UseExternal();
}

/// "Levels 2, 4 ..." for each method that levels with `reason` had before.
std::vector<std::string> OtherMethodTexts(const BuildPlan& plan,
                                          const overviews::BuildRequest& request) {
  if (!request.method) return {};
  std::map<std::string, std::vector<unsigned>> byMethod;
  for (const auto& planned : plan.building)
    if (planned.reason == Reason::kOtherMethod)
      byMethod[planned.methodBefore].push_back(planned.level);
  std::vector<std::string> texts;
  const std::string now = overviews::StoredNameOf(*request.method);
  for (const auto& [before, levels] : byMethod)
    texts.push_back(
        before.empty()
            ? FormatString(_("Rebuilding levels %s by %s: another program made them, by a method "
                             "that they do not record."),
                           JoinNumbers(levels).c_str(), now.c_str())
            : FormatString(_("Rebuilding levels %s by %s: they were made by %s."),
                           JoinNumbers(levels).c_str(), now.c_str(), before.c_str()));
  return texts;
}

std::vector<unsigned> LevelsOf(const overviews::PlaceFacts& place) {
  std::vector<unsigned> levels;
  for (const auto& level : place.levels) levels.push_back(level.level);
  return levels;
}

/// Where new levels go and why, when that is not what one would expect.
std::vector<std::string> PlaceTexts(const BuildPlan& plan, const RasterFacts& facts,
                                    const std::string& file) {
  const bool isInside = plan.place == LevelPlace::kInternal;
  if (plan.placeReason == PlaceReason::kCloudOptimized)
    return {
        FormatString(_("The file is a cloud optimized GeoTIFF. The levels go to %s.ovr, so that "
                       "it stays one; use --internal to put them inside."),
                     file.c_str())};
  std::vector<std::string> texts;
  if (isInside && facts.isCloudOptimized)
    texts.push_back(
        _("With these levels inside, the file is no longer a cloud optimized GeoTIFF: readers on a "
          "network need more requests. Use --external to keep it one."));
  if (isInside && !facts.beside.levels.empty())
    texts.push_back(FormatString(
        _("Levels %s stand in %s. Other programs read the levels inside the file instead."),
        JoinNumbers(LevelsOf(facts.beside)).c_str(), facts.beside.levels.front().file.c_str()));
  return texts;
}

std::string RebuildText(Reason reason, const std::string& levels) {
  const char* text = levels.c_str();
  switch (reason) {
    case Reason::kStale:
      return FormatString(_("Rebuilding levels %s: they no longer match the image."), text);
    case Reason::kChanged:
      return FormatString(
          _("Rebuilding levels %s: another program wrote into them after they were built."), text);
    case Reason::kUnfinished:
      return FormatString(_("Building levels %s again: they were not finished."), text);
    case Reason::kOtherForm:
      return FormatString(_("Rebuilding levels %s: they are stored otherwise than --co says."),
                          text);
    case Reason::kSourceRebuilt:
      return FormatString(
          _("Rebuilding levels %s: the levels they were computed from are rebuilt."), text);
    default:
      return "";
  }
}

}  // namespace

std::string FaultText(const BuildPlan& plan, const RasterFacts& facts,
                      const datasources::LevelSite& site) {
  switch (plan.fault) {
    case Fault::kChannelOutside:
      return FormatString(_("--channels names %u, but the file's channels are 1 to %zu."),
                          plan.faultAt, facts.channels.size());
    case Fault::kChannelIsBits:
      return FormatString(
          _("channel %u is a mask of one bit, which has no levels. Leave it out of --channels."),
          plan.faultAt);
    case Fault::kOnlyBits:
      return _("All channels are masks of one bit, which have no levels. Leave out --levels.");
    case Fault::kLevelTooSmall:
      return FormatString(_("There is no level %u: levels are reduction factors of 2 or more."),
                          plan.faultAt);
    case Fault::kLevelEmpty:
      return FormatString(
          _("Level %u would be empty (the image has %u x %u pixels). Leave it out."), plan.faultAt,
          facts.width, facts.height);
    case Fault::kFormatHoldsNoLevels:
      return FormatString(_("%s files hold no levels inside. %s"),
                          site.Format().description.c_str(), UseExternal().c_str());
    case Fault::kFileIsReadOnly:
      return ReadOnlyText(site);
    case Fault::kComplexNotSupported:
      return _("Complex pixels take --method nearest or --method average only.");
    case Fault::kOtherChannelsLackLevel:
      return FormatString(_("Level %u would hold the channels named only, and other programs would "
                            "see zeros in the others. Leave out --channels, or use --external."),
                          plan.faultAt);
    case Fault::kPartInOtherForm:
      return FormatString(_("Level %u is stored otherwise than --co says, and all channels of a "
                            "level are stored alike. Leave out --channels or --co."),
                          plan.faultAt);
    case Fault::kBigTiffInside:
      return _(
          "BIGTIFF= is the form of a side-car that is made, and these levels go inside the "
          "file. Leave it out, or use --external.");
    case Fault::kNone:
      break;
  }
  return "";
}

ExitCode CodeOf(Fault fault) {
  switch (fault) {
    case Fault::kNone:
      return kDone;
    case Fault::kFormatHoldsNoLevels:
    case Fault::kFileIsReadOnly:
      return kCannotBuild;
    default:
      return kWrongUsage;
  }
}

std::vector<std::string> NoticesOf(const BuildPlan& plan, const overviews::BuildRequest& request,
                                   const RasterFacts& facts, const std::string& file) {
  std::vector<std::string> notices;
  if (plan.building.empty()) return notices;
  for (const Reason reason : {Reason::kStale, Reason::kChanged, Reason::kUnfinished,
                              Reason::kOtherForm, Reason::kSourceRebuilt}) {
    const std::vector<unsigned> levels = plan.Levels(reason);
    if (!levels.empty()) notices.push_back(RebuildText(reason, JoinNumbers(levels)));
  }
  for (auto& text : OtherMethodTexts(plan, request)) notices.push_back(std::move(text));
  for (auto& text : PlaceTexts(plan, facts, file)) notices.push_back(std::move(text));
  if (plan.replacesLeftOver)
    notices.push_back(FormatString(
        _("Replacing %s: it holds levels of an image of another size (%u x %u pixels)."),
        facts.leftOver->file.c_str(), facts.leftOver->width, facts.leftOver->height));
  return notices;
}

std::vector<std::string> WarningsOf(const BuildPlan& plan, const RasterFacts& facts,
                                    bool blursAlpha) {
  std::vector<std::string> warnings;
  const bool blends =
      std::any_of(plan.building.begin(), plan.building.end(),
                  [](const auto& planned) { return overviews::Blends(planned.method); });
  if (facts.isCategorical && blends)
    warnings.emplace_back(
        _("the pixels are numbers of palette colours or classes: this method invents colours and "
          "classes that the image does not hold. Use --method mode or --method nearest."));
  if (blursAlpha)
    warnings.emplace_back(
        _("JPEG keeps the alpha channel of the levels roughly: transparent pixels do not stay "
          "quite transparent, opaque ones not quite opaque. Programs that read the masks of the "
          "levels see them exactly. Another COMPRESS keeps alpha as it is."));
  return warnings;
}

std::string EmptyLevelText(unsigned level, const RasterFacts& facts) {
  return FormatString(_("Skipping level %u: it would be empty (the image has %u x %u pixels)."),
                      level, facts.width, facts.height);
}

}  // namespace orin::app
