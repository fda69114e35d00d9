/// Levels that were computed from other levels, which may have been built again since.
// SPDX-License-Identifier: MIT
#pragma once

#include <vector>

#include "host/datasources/overviewinfo.h"

namespace orin::datasources {

/// Makes levels stale whose source level is there but no more as it was, and those above them.
/// \param levels  all of one image, inside its file and beside it, in any order
void CheckSources(std::vector<LevelDescription>& levels);

}  // namespace orin::datasources
