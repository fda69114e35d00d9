// SPDX-License-Identifier: MIT
#include "processes/overviews/buildplan.h"

#include <algorithm>
#include <set>

#include "host/datasources/pyramidlevels.h"
#include "host/model/levelsize.h"
#include "processes/overviews/overviewmethod.h"

namespace orin::overviews {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;
using datasources::LevelStatus;

bool Has(const std::vector<unsigned>& numbers, unsigned number) {
  return std::find(numbers.begin(), numbers.end(), number) != numbers.end();
}

std::vector<unsigned> AscendingOnce(std::vector<unsigned> levels) {
  std::sort(levels.begin(), levels.end());
  levels.erase(std::unique(levels.begin(), levels.end()), levels.end());
  return levels;
}

bool IsOutOfDate(const LevelDescription& level) {
  return level.status != LevelStatus::kCurrent && level.status != LevelStatus::kUnverified;
}

/// Makes one plan: facts and request in, every decision out.
class Planner {
 public:
  Planner(const RasterFacts& facts, const BuildRequest& request)
      : facts_(facts), request_(request) {}

  BuildPlan Plan();

 private:
  bool Fail(Fault fault, unsigned at = 0);
  bool ChooseChannels();
  bool CheckLevels();
  bool ChoosePlace();
  void CollectExisting();
  void CollectWanted();
  void ChooseLevels();
  void AddDescendants();
  bool CheckBuilding();

  const LevelDescription* Find(unsigned level) const;
  bool IsEmpty(unsigned level) const {
    return model::LevelSizeOf(facts_.width, facts_.height, level).IsEmpty();
  }
  std::optional<Reason> ReasonToBuild(unsigned level) const;
  QRTOverviewResampleType MethodFor(const LevelDescription* level) const;
  PlannedLevel Planned(unsigned level, Reason reason) const;

  const RasterFacts& facts_;
  const BuildRequest& request_;
  BuildPlan plan_;
  std::vector<LevelDescription> existing_;  ///< that a build in the plan's place sees
};

BuildPlan Planner::Plan() {
  if (!ChooseChannels() || !CheckLevels() || !ChoosePlace()) return plan_;
  if (plan_.channels.empty()) return plan_;
  CollectExisting();
  CollectWanted();
  ChooseLevels();
  AddDescendants();
  plan_.replacesLeftOver =
      facts_.leftOver && plan_.place == LevelPlace::kSideCar && !plan_.building.empty();
  CheckBuilding();
  return plan_;
}

/// \returns false
bool Planner::Fail(Fault fault, unsigned at) {
  plan_.fault = fault;
  plan_.faultAt = at;
  return false;
}

/// Those of the request, or all that are no masks of one bit.
bool Planner::ChooseChannels() {
  const auto count = static_cast<unsigned>(facts_.channels.size());
  for (const unsigned channel : request_.channels) {
    if (channel < 1 || channel > count) return Fail(Fault::kChannelOutside, channel);
    if (facts_.channels[channel - 1].bits == 1) return Fail(Fault::kChannelIsBits, channel);
  }
  plan_.channels = request_.channels;
  for (unsigned channel = 1; channel <= count && request_.channels.empty(); ++channel)
    if (facts_.channels[channel - 1].bits > 1) plan_.channels.push_back(channel);
  if (plan_.channels.empty() && !request_.levels.empty()) return Fail(Fault::kOnlyBits);
  return true;
}

bool Planner::CheckLevels() {
  for (const unsigned level : request_.levels) {
    if (level < 2) return Fail(Fault::kLevelTooSmall, level);
    if (!IsEmpty(level)) continue;
    if (request_.force) return Fail(Fault::kLevelEmpty, level);
    plan_.empty.push_back(level);
  }
  plan_.empty = AscendingOnce(plan_.empty);
  return true;
}

bool Planner::ChoosePlace() {
  const auto choose = [&](LevelPlace place, PlaceReason reason) {
    plan_.place = place;
    plan_.placeReason = reason;
    plan_.inOnePass = place == LevelPlace::kInternal && facts_.isTiff;
    return true;
  };
  if (request_.place == LevelPlace::kInternal) {
    if (!facts_.holdsLevels) return Fail(Fault::kFormatHoldsNoLevels);
    if (!facts_.isWritable) return Fail(Fault::kFileIsReadOnly);
  }
  if (request_.place) return choose(*request_.place, PlaceReason::kAsked);
  if (!facts_.holdsLevels) return choose(LevelPlace::kSideCar, PlaceReason::kFormatHoldsNone);
  if (!facts_.isWritable) return choose(LevelPlace::kSideCar, PlaceReason::kReadOnly);
  if (facts_.inside.levels.empty() && !facts_.beside.levels.empty())
    return choose(LevelPlace::kSideCar, PlaceReason::kLevelsBeside);
  if (facts_.isCloudOptimized) return choose(LevelPlace::kSideCar, PlaceReason::kCloudOptimized);
  return choose(LevelPlace::kInternal, PlaceReason::kUsual);
}

/// A build beside the file sees the levels inside it as well, those beside it first.
void Planner::CollectExisting() {
  existing_ = facts_.In(plan_.place).levels;
  if (plan_.place == LevelPlace::kInternal) return;
  for (const LevelDescription& level : facts_.inside.levels)
    if (!Find(level.level)) existing_.push_back(level);
}

const LevelDescription* Planner::Find(unsigned level) const {
  const auto found = std::find_if(existing_.begin(), existing_.end(),
                                  [&](const LevelDescription& l) { return l.level == level; });
  return found == existing_.end() ? nullptr : &*found;
}

void Planner::CollectWanted() {
  std::vector<unsigned> wanted = request_.levels;
  if (wanted.empty()) {
    wanted = ComputePyramidLevel(facts_.width, facts_.height, request_.factor);
    for (const LevelDescription& level : existing_)
      if (IsOutOfDate(level)) wanted.push_back(level.level);
  }
  std::erase_if(wanted, [&](unsigned level) { return IsEmpty(level); });
  plan_.wanted = AscendingOnce(wanted);
}

std::optional<Reason> Planner::ReasonToBuild(unsigned level) const {
  const LevelDescription* stored = Find(level);
  if (!stored) return Reason::kMissing;
  if (stored->status == LevelStatus::kStale)
    return stored->reason == datasources::StaleReason::kSourceRebuilt ? Reason::kSourceRebuilt
                                                                      : Reason::kStale;
  if (IsOutOfDate(*stored) && stored->status != LevelStatus::kUnfinished) return Reason::kChanged;
  if (!datasources::HoldsForAll(stored->validChannels, plan_.channels)) return Reason::kUnfinished;
  if (request_.force) return Reason::kForced;
  if (request_.method && stored->method != StoredNameOf(*request_.method))
    return Reason::kOtherMethod;
  if (Has(facts_.In(stored->place).otherForm, level)) return Reason::kOtherForm;
  return std::nullopt;
}

/// The one named, else the one that the level records, else that of the first level that records
/// one.
QRTOverviewResampleType Planner::MethodFor(const LevelDescription* level) const {
  if (request_.method) return *request_.method;
  if (level && TypeOfStoredName(level->method) != ResampleInvalid)
    return TypeOfStoredName(level->method);
  for (const auto* levels : {&existing_, &facts_.beside.levels})
    for (const LevelDescription& other : *levels)
      if (TypeOfStoredName(other.method) != ResampleInvalid) return TypeOfStoredName(other.method);
  return request_.usualMethod;
}

PlannedLevel Planner::Planned(unsigned level, Reason reason) const {
  const LevelDescription* stored = Find(level);
  return {level, MethodFor(stored), reason, stored ? stored->method : ""};
}

void Planner::ChooseLevels() {
  for (const unsigned level : plan_.wanted) {
    if (const auto reason = ReasonToBuild(level)) plan_.building.push_back(Planned(level, *reason));
    else plan_.kept.push_back(level);
  }
}

/// A level that was computed from one that is built again is out of date then. The levels of the
/// other place stay what they are.
void Planner::AddDescendants() {
  const auto standsHere = [&](const LevelDescription* level) {
    return level && level->place == plan_.place;
  };
  std::set<unsigned> rebuilt;
  for (const PlannedLevel& planned : plan_.building)
    if (standsHere(Find(planned.level))) rebuilt.insert(planned.level);
  std::sort(existing_.begin(), existing_.end(),
            [](const auto& a, const auto& b) { return a.level < b.level; });
  for (const LevelDescription& level : existing_) {
    if (!standsHere(&level) || rebuilt.contains(level.level) ||
        !rebuilt.contains(level.sourceLevel))
      continue;
    rebuilt.insert(level.level);
    std::erase(plan_.kept, level.level);
    plan_.building.push_back(Planned(level.level, Reason::kSourceRebuilt));
    plan_.wanted.push_back(level.level);
  }
  plan_.wanted = AscendingOnce(plan_.wanted);
  std::sort(plan_.building.begin(), plan_.building.end(),
            [](const auto& a, const auto& b) { return a.level < b.level; });
}

bool Planner::CheckBuilding() {
  if (plan_.building.empty()) return true;
  const bool isPartial =
      std::any_of(facts_.channels.begin(), facts_.channels.end(), [&](const auto& type) {
        const auto channel = static_cast<unsigned>(&type - facts_.channels.data()) + 1;
        return type.bits > 1 && !Has(plan_.channels, channel);
      });
  const bool isInside = plan_.place == LevelPlace::kInternal;
  for (const PlannedLevel& planned : plan_.building) {
    const auto& type = facts_.channels[plan_.channels.front() - 1];
    if (type.isComplex && planned.method != ResampleNearest && planned.method != ResampleAverage)
      return Fail(Fault::kComplexNotSupported);
    const LevelDescription* stored = Find(planned.level);
    if (!isPartial) continue;
    if (isInside &&
        !(stored && std::all_of(stored->presentChannels.begin(), stored->presentChannels.end(),
                                [](bool present) { return present; })))
      return Fail(Fault::kOtherChannelsLackLevel, planned.level);
    if (stored && Has(facts_.In(plan_.place).otherForm, planned.level))
      return Fail(Fault::kPartInOtherForm, planned.level);
  }
  if (isInside && request_.storing.saysBigTiff) return Fail(Fault::kBigTiffInside);
  return true;
}

}  // namespace

std::vector<unsigned> BuildPlan::Levels(Reason reason) const {
  std::vector<unsigned> levels;
  for (const PlannedLevel& planned : building)
    if (planned.reason == reason) levels.push_back(planned.level);
  return levels;
}

BuildPlan PlanBuild(const RasterFacts& facts, const BuildRequest& request) {
  return Planner(facts, request).Plan();
}

}  // namespace orin::overviews
