// SPDX-License-Identifier: MIT
#include "processes/overviews/levelrun.h"

#include <algorithm>

#include "host/model/levelsize.h"
#include "host/services/counter.h"
#include "host/services/text.h"
#include "processes/overviews/levelpass.h"

namespace orin::overviews {
namespace {

/// Work for a level, relative to the others.
double CostOf(unsigned level) { return (1.0 / level) / level; }

}  // namespace

LevelRun::LevelRun(const LevelRequest& request) : request_(request) {
  const size_t passesOfLevel = request_.isTiff ? 1 : request_.channels.size();
  for (const unsigned level : request_.levels) {
    totalCost_ += CostOf(level);
    if (!IsEmpty(level)) passesLeft_ += passesOfLevel;
  }
}

bool LevelRun::IsEmpty(unsigned level) const {
  return model::LevelSizeOf(request_.raster->GetWidth(), request_.raster->GetHeight(), level)
      .IsEmpty();
}

bool LevelRun::Build() {
  return std::all_of(request_.levels.begin(), request_.levels.end(),
                     [this](unsigned level) { return IsEmpty(level) || BuildLevel(level); });
}

bool LevelRun::BuildLevel(unsigned level) {
  if (request_.showProgress)
    tarn::Counter::Update(static_cast<float>(done_),
                          MkString(_("Generating overview level: %d"), int(level)), nullptr);
  const double share = CostOf(level) / totalCost_;
  const auto step = static_cast<float>(share / double(request_.channels.size()));
  Range range{static_cast<float>(done_), static_cast<float>(done_ + step)};
  done_ += share;
  if (request_.isTiff) {
    range.end = 1.0f;  // deliberate: a pass over all channels reports up to completion
    return request_.channels.empty() || BuildPass(level, request_.channels, range);
  }
  for (const unsigned channel : request_.channels) {
    if (!BuildPass(level, {channel}, range)) return false;
    range.start += step;
    range.end += step;
  }
  return true;
}

bool LevelRun::BuildPass(unsigned level, const std::vector<unsigned>& channels,
                         const Range& range) {
  const PassResult result =
      overviews::BuildPass({request_.raster, level, channels, request_.factory, request_.methodName,
                            request_.onlyFromDivisors, request_.isTiff},
                           {.start = range.start, .end = range.end});
  --passesLeft_;
  // Deliberate: with nothing left to do a refusal changes nothing.
  return result.isComplete && (passesLeft_ == 0 || !result.isCancelled);
}

}  // namespace orin::overviews
