// SPDX-License-Identifier: MIT
#include "processes/overviews/levelrun.h"

#include "host/services/counter.h"
#include "host/services/text.h"
#include "processes/overviews/levelpass.h"

namespace {

/// Work for a level, relative to the others.
double CostOf(unsigned level) { return (1.0 / level) / level; }

}  // namespace

LevelRun::LevelRun(const LevelRequest& request) : request_(request) {
  for (const unsigned level : request_.levels) totalCost_ += CostOf(level);
}

bool LevelRun::Build() {
  for (const unsigned level : request_.levels) {
    const bool empty =
        request_.raster->GetWidth() / level == 0 || request_.raster->GetHeight() / level == 0;
    if (!empty && !BuildLevel(level)) return false;
  }
  return true;
}

bool LevelRun::BuildLevel(unsigned level) {
  if (request_.showProgress)
    orin::tarn::Counter::Update(static_cast<float>(done_),
                                MkString(_("Generating overview level: %d"), int(level)), nullptr);
  const double share = CostOf(level) / totalCost_;
  const auto step = static_cast<float>(share / double(request_.channels.size()));
  Range range{static_cast<float>(done_), static_cast<float>(done_) + step};
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
  const orin::overviews::PassResult result =
      orin::overviews::BuildPass({request_.raster, level, channels, request_.factory,
                                  request_.methodName, request_.onlyFromDivisors, request_.isTiff},
                                 {.start = range.start, .end = range.end});
  return result.isComplete && !result.isCancelled;
}
