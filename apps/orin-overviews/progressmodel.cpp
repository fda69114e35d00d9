// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/progressmodel.h"

#include <algorithm>

namespace orin::app {
namespace {

/// A level has 1 / level^2 of the image's pixels.
double CostOf(unsigned level) { return 1.0 / level / level; }

}  // namespace

ProgressModel::ProgressModel(std::vector<PlannedLevel> levels, LevelReport report)
    : report_(report) {
  for (const PlannedLevel& planned : levels) {
    costOfAll_ += CostOf(planned.level);
    if (planned.empty) continue;
    costOfBuilt_ += CostOf(planned.level);
    levels_.push_back(planned);
  }
}

void ProgressModel::StartLevel(double done) {
  if (started_ == levels_.size()) return;
  if (started_ > 0) costBefore_ += CostOf(CurrentLevel());
  ++started_;
  done_ = done;
}

double ProgressModel::LevelFraction(double fraction) const {
  const double range =
      report_ == LevelReport::kToTheEnd ? 1.0 - done_ : CostOf(CurrentLevel()) / costOfAll_;
  return range > 0 ? std::clamp((fraction - done_) / range, 0.0, 1.0) : 0.0;
}

double ProgressModel::Overall(double fraction) {
  if (!HasLevel()) return overall_;
  const double part = LevelFraction(fraction);
  const bool complete = started_ == levels_.size() && part == 1.0;
  const double now = complete ? 1.0 : (costBefore_ + CostOf(CurrentLevel()) * part) / costOfBuilt_;
  overall_ = std::clamp(now, overall_, 1.0);
  return overall_;
}

}  // namespace orin::app
