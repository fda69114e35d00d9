/// Which overviews a raster has, and whether they are up to date.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <string>
#include <vector>

#include "host/model/freshness.h"

namespace orin::datasources {

/// Where the pixels of a level are kept.
enum class LevelPlace { kInternal, kSideCar };

using model::LevelStatus;
using model::StaleReason;

/// Everything that is known of one level.
struct LevelDescription {
  unsigned level = 0;   ///< decimation factor, 2 or more
  unsigned width = 0;   ///< pixels, as stored
  unsigned height = 0;  ///< pixels, as stored
  LevelPlace place = LevelPlace::kInternal;
  std::string file;          ///< the file that holds the pixels
  std::string method;        ///< "NEAREST" ...; empty when another program made the level
  unsigned sourceLevel = 0;  ///< level it was computed from, 1 for full resolution; 0 unknown
  std::string program;       ///< program and version that made it; empty when unknown
  std::vector<bool> presentChannels;  ///< one entry for each channel of the raster: created
  std::vector<bool> validChannels;  ///< one entry for each channel of the raster: finished, and not
                                    ///< known to be out of date
  LevelStatus status = LevelStatus::kUnverified;
  StaleReason reason = StaleReason::kNone;  ///< of a stale level
  model::ImageRecord image = {};            ///< that it was computed from; blank when unknown
  std::string bytes = {};        ///< digest of what it stores, its generation; empty when unknown
  std::string sourceBytes = {};  ///< generation of the level that it was computed from; empty for
                                 ///< the image, or when unknown
  bool hasMask = false;          ///< a mask of its own stands with its pixels
  /// It stands in a directory inside the image's own (SubIFD): listed, never used or changed.
  bool isInSubDirectory = false;
};

/// True when `entries` holds true for every one of `channels` (1-based).
inline bool HoldsForAll(const std::vector<bool>& entries, const std::vector<unsigned>& channels) {
  return std::all_of(channels.begin(), channels.end(), [&](unsigned channel) {
    return channel >= 1 && channel <= entries.size() && entries[channel - 1];
  });
}

class IOverviewInfo {
 public:
  virtual ~IOverviewInfo() = default;
  /// Decimation factors of the levels present, ascending.
  virtual std::vector<unsigned> GetLevels() const = 0;
  /// All that is known of the levels present, in the order of `GetLevels`.
  virtual std::vector<LevelDescription> Describe() const = 0;
  /// The method that made `level`; empty when it is unknown or the level is absent.
  virtual std::string GetResamplingName(unsigned level) const = 0;
  /// True when that channel's overview (1-based) at that level exists, is finished, and is not
  /// known to be out of date.
  virtual bool IsLevelValid(unsigned channel, unsigned level) const = 0;
};

}  // namespace orin::datasources
