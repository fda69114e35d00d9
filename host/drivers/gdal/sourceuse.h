/// What a raster is opened for.
// SPDX-License-Identifier: MIT
#pragma once

namespace orin::drivers {

enum class SourceUse {
  kRead,
  kUpdate,       ///< levels are made in it, or changed
  kRemoveLevels  ///< what can take no more levels can still lose those that it has
};

}  // namespace orin::drivers
