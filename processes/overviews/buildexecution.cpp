// SPDX-License-Identifier: MIT
#include "processes/overviews/buildexecution.h"

#include <algorithm>
#include <chrono>

#include "host/services/exception.h"
#include "host/services/text.h"
#include "processes/overviews/levelpass.h"
#include "processes/overviews/overviewmethod.h"

namespace orin::overviews {
namespace {

using Clock = std::chrono::steady_clock;

/// A level has 1 / level^2 of the image's pixels.
double CostOf(unsigned level) { return 1.0 / level / level; }

class Execution {
 public:
  Execution(datasources::IRasterDataset& raster, const BuildPlan& plan, IBuildObserver& observer)
      : raster_(raster), plan_(plan), observer_(observer) {
    for (const PlannedLevel& planned : plan.building) costOfAll_ += CostOf(planned.level);
  }

  /// \returns false when the observer refused to go on
  bool BuildLevel(const PlannedLevel& planned);

 private:
  bool BuildPasses(const PlannedLevel& planned, BuiltLevel& built);
  int Report(double ofPass);
  static int ReportTo(double ofPass, const char* /*message*/, void* execution) {
    return static_cast<Execution*>(execution)->Report(ofPass);
  }

  datasources::IRasterDataset& raster_;
  const BuildPlan& plan_;
  IBuildObserver& observer_;
  double costOfAll_ = 0;
  double costBefore_ = 0;     ///< of the passes that are done
  double costOfPass_ = 0;     ///< of the one that runs
  size_t reportsOfPass_ = 0;  ///< one before each block, one at the end
};

int Execution::Report(double ofPass) {
  ++reportsOfPass_;
  return observer_.Advance(std::min(1.0, (costBefore_ + costOfPass_ * ofPass) / costOfAll_));
}

bool Execution::BuildPasses(const PlannedLevel& planned, BuiltLevel& built) {
  std::vector<std::vector<unsigned>> passes = {plan_.channels};
  if (!plan_.inOnePass) {
    passes.clear();
    for (const unsigned channel : plan_.channels) passes.push_back({channel});
  }
  const OverviewMethod method = MethodOf(planned.method);
  costOfPass_ = CostOf(planned.level) / static_cast<double>(passes.size());
  for (const std::vector<unsigned>& channels : passes) {
    reportsOfPass_ = 0;
    const PassResult result =
        BuildPass({&raster_, planned.level, channels, method.factory.get(), method.name,
                   planned.method == ResampleAverage, plan_.inOnePass},
                  {.callback = ReportTo, .userData = this});
    if (!result.isComplete || result.isCancelled) return false;
    costBefore_ += costOfPass_;
    built.sourceLevel = result.sourceLevel;
    built.blocks += reportsOfPass_ > 0 ? reportsOfPass_ - 1 : 0;
  }
  return true;
}

bool Execution::BuildLevel(const PlannedLevel& planned) {
  const auto start = Clock::now();
  observer_.LevelBegins(planned);
  BuiltLevel built = {planned.level, 1, StoredNameOf(planned.method), 0, 0.0};
  if (!BuildPasses(planned, built)) return false;
  built.seconds = std::chrono::duration<double>(Clock::now() - start).count();
  observer_.LevelDone(built);
  return true;
}

}  // namespace

BuildResult ExecuteBuild(datasources::IRasterDataset& raster, const BuildPlan& plan,
                         IBuildObserver& observer) {
  Execution execution(raster, plan, observer);
  try {
    for (const PlannedLevel& planned : plan.building)
      if (!execution.BuildLevel(planned)) return {BuildEnd::kCancelled, ""};
  } catch (const Exception& failure) {
    // Texts that are fixed in English are translated here, where they are shown.
    return {BuildEnd::kFailed, _(failure.GetMessage().c_str())};
  }
  return {};
}

}  // namespace orin::overviews
