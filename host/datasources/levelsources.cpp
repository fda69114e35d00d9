// SPDX-License-Identifier: MIT
#include "host/datasources/levelsources.h"

namespace orin::datasources {

void CheckSources(std::vector<LevelDescription>& levels) {
  std::vector<model::Provenance> sources;
  std::vector<model::Freshness> answers;
  for (const LevelDescription& level : levels) {
    sources.push_back({level.level, level.bytes, level.sourceLevel, level.sourceBytes});
    answers.push_back({level.status, level.reason});
  }
  model::CheckSources(sources, answers);
  for (size_t i = 0; i < levels.size(); ++i) {
    if (levels[i].status == answers[i].status) continue;
    levels[i].status = answers[i].status;
    levels[i].reason = answers[i].reason;
    levels[i].validChannels.assign(levels[i].validChannels.size(), false);
  }
}

}  // namespace orin::datasources
