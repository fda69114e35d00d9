// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/buildplan.h"

#include <algorithm>
#include <optional>

#include "host/datasources/levelstore.h"
#include "host/datasources/pyramidlevels.h"
#include "host/services/exception.h"
#include "host/services/text.h"
#include "processes/overviews/levelplanning.h"
#include "processes/overviews/opening.h"

namespace orin::app {
namespace {

using datasources::IDataset;
using datasources::IRasterDataset;
using datasources::LevelDescription;

IRasterDataset& RasterOf(IDataset& dataset, const std::string& file) {
  auto* raster = dynamic_cast<IRasterDataset*>(&dataset);
  if (!raster || raster->GetChannelCount() == 0)
    throw Exception(FormatString(_("%s: holds no raster."), file.c_str()),
                    "apps/orin-overviews/buildplan", "orin::app::PlanBuild", 0);
  return *raster;
}

std::vector<unsigned> BitChannels(const IRasterDataset& raster) {
  std::vector<unsigned> channels;
  for (unsigned channel = 1; channel <= raster.GetChannelCount(); ++channel) {
    const std::unique_ptr<datasources::IChannelInfo> info(raster.GetChannelInfo(channel));
    if (info->GetDataType().bits == 1) channels.push_back(channel);
  }
  return channels;
}

/// Those of the user, or all that are no masks.
std::vector<unsigned> ChannelsToTreat(const BuildPlan& plan, const std::vector<unsigned>& chosen) {
  if (!chosen.empty()) return chosen;
  std::vector<unsigned> channels;
  for (unsigned channel = 1; channel <= plan.channelCount; ++channel)
    if (!std::binary_search(plan.bitChannels.begin(), plan.bitChannels.end(), channel))
      channels.push_back(channel);
  return channels;
}

std::vector<unsigned> RequestedLevels(const BuildOptions& options, const IRasterDataset& raster) {
  if (!options.levels.empty()) return options.levels;
  return ComputePyramidLevel(raster.GetWidth(), raster.GetHeight(),
                             options.factor ? options.factor : GetDefaultDecimationLevels());
}

std::vector<LevelDescription> DescribeLevels(IDataset& dataset) {
  auto* raster = dynamic_cast<IRasterDataset*>(&dataset);
  const std::unique_ptr<datasources::IOverviewInfo> info(raster ? raster->GetOverviewInfo()
                                                                : nullptr);
  return info ? info->Describe() : std::vector<LevelDescription>();
}

bool Has(const std::vector<LevelDescription>& levels, unsigned level,
         datasources::LevelStatus status) {
  return std::any_of(levels.begin(), levels.end(), [&](const LevelDescription& l) {
    return l.level == level && l.status == status;
  });
}

bool IsValid(const std::vector<LevelDescription>& levels, unsigned level,
             const std::vector<unsigned>& channels) {
  const auto found = std::find_if(levels.begin(), levels.end(),
                                  [&](const LevelDescription& l) { return l.level == level; });
  return found != levels.end() && datasources::HoldsForAll(found->validChannels, channels);
}

/// What the levels to be built take, each once.
datasources::LevelRoom RoomOf(IRasterDataset& raster, const BuildPlan& plan) {
  const datasources::ILevelStore* store = raster.GetSource()->Levels();
  std::vector<unsigned> levels;
  for (const PlannedLevel& planned : plan.building)
    if (!planned.empty && (levels.empty() || levels.back() != planned.level))
      levels.push_back(planned.level);
  if (!store || levels.empty()) return {};
  return store->RoomFor(levels, plan.channels);
}

std::vector<unsigned> AscendingOnce(std::vector<unsigned> levels) {
  std::sort(levels.begin(), levels.end());
  levels.erase(std::unique(levels.begin(), levels.end()), levels.end());
  return levels;
}

}  // namespace

std::unique_ptr<IDataset> OpenForBuild(const std::string& file, Placement placement) {
  std::optional<bool> external;
  if (placement != Placement::kAutomatic) external = placement == Placement::kExternal;
  bool isReadOnly = false;
  return orin::overviews::OpenForOverviews(file, external, isReadOnly);
}

BuildPlan PlanBuild(const BuildOptions& options, const std::string& file) {
  const auto dataset = OpenForBuild(file, options.placement);
  IRasterDataset& raster = RasterOf(*dataset, file);
  BuildPlan plan;
  plan.width = raster.GetWidth();
  plan.height = raster.GetHeight();
  plan.channelCount = raster.GetChannelCount();
  plan.bitChannels = BitChannels(raster);
  plan.holdsClasses = raster.GetSource()->HoldsClasses();
  plan.channels = ChannelsToTreat(plan, options.channels);
  plan.report = datasources::FormatNameOf(*dataset).find("TIFF") == std::string::npos
                    ? LevelReport::kWithinShare
                    : LevelReport::kToTheEnd;
  std::vector<unsigned> requested = RequestedLevels(options, raster);
  std::sort(requested.begin(), requested.end());
  plan.requested = AscendingOnce(requested);
  const auto existing = DescribeLevels(*dataset);
  for (const unsigned level : plan.requested)
    if (Has(existing, level, datasources::LevelStatus::kStale)) plan.stale.push_back(level);
  for (const unsigned level : requested) {
    if (level < 2) continue;  // the library refuses the request
    if (options.force || !IsValid(existing, level, plan.channels))
      plan.building.push_back({level, plan.IsEmpty(level)});
    else if (plan.kept.empty() || plan.kept.back() != level) plan.kept.push_back(level);
  }
  for (const unsigned level : plan.kept)
    if (Has(existing, level, datasources::LevelStatus::kUnverified))
      plan.unverified.push_back(level);
  plan.room = RoomOf(raster, plan);
  return plan;
}

LevelState LookAtLevels(const BuildPlan& plan, const BuildOptions& options,
                        const std::string& file) {
  LevelState state;
  const auto dataset = OpenForBuild(file, options.placement);
  state.descriptions = DescribeLevels(*dataset);
  for (const unsigned level : plan.requested) {
    if (level < 2 || plan.IsEmpty(level)) continue;
    const bool valid = IsValid(state.descriptions, level, plan.channels);
    (valid ? state.valid : state.unfinished).push_back(level);
  }
  if (const auto* store = RasterOf(*dataset, file).GetSource()->Levels())
    for (auto& hidden : store->ListHidden()) state.descriptions.push_back(std::move(hidden));
  return state;
}

}  // namespace orin::app
