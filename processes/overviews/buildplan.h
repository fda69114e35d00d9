/// Decides, from what is known of a raster and what is asked, which levels are built, how and
/// where.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "processes/overviews/buildrequest.h"
#include "processes/overviews/rasterfacts.h"

namespace orin::overviews {

/// Why a request cannot be met at all.
enum class Fault {
  kNone,
  kChannelOutside,          ///< a channel that the raster does not have
  kChannelIsBits,           ///< a channel of one bit, which has no levels
  kOnlyBits,                ///< levels are named, and all channels are of one bit
  kLevelTooSmall,           ///< a level below 2
  kLevelEmpty,              ///< forced, and larger than the image
  kFormatHoldsNoLevels,     ///< asked to stand inside
  kFileIsReadOnly,          ///< asked to stand inside
  kComplexNotSupported,     ///< by the method named
  kOtherChannelsLackLevel,  ///< some channels only, inside: the others would read as zeros
  kPartInOtherForm,         ///< some channels only, of a level that is stored otherwise
  kBigTiffInside,           ///< the form of a side-car is named, and levels go inside
};

/// Why a level is built.
enum class Reason {
  kMissing,
  kUnfinished,
  kStale,
  kChanged,        ///< another program wrote into it
  kSourceRebuilt,  ///< it was computed from a level that is built again
  kOtherMethod,    ///< than the one named
  kOtherForm,      ///< than the options say
  kForced
};

/// Why levels go where they go.
enum class PlaceReason {
  kAsked,
  kUsual,
  kFormatHoldsNone,
  kReadOnly,
  kCloudOptimized,
  kLevelsBeside,  ///< levels stand beside, and none inside
};

struct PlannedLevel {
  unsigned level;  ///< decimation factor, 2 or more
  QRTOverviewResampleType method;
  Reason reason;
  std::string methodBefore;  ///< as the level recorded it; empty: none, or unknown
};

struct BuildPlan {
  Fault fault = Fault::kNone;
  unsigned faultAt = 0;  ///< the channel or level at fault

  datasources::LevelPlace place = datasources::LevelPlace::kInternal;
  PlaceReason placeReason = PlaceReason::kUsual;
  bool inOnePass = false;         ///< all channels at once
  bool replacesLeftOver = false;  ///< a side-car of an image of another size goes first
  std::vector<unsigned> channels;
  std::vector<unsigned> wanted;        ///< levels asked for or out of date, not empty, ascending
  std::vector<unsigned> kept;          ///< of these: present, valid and not to be built
  std::vector<PlannedLevel> building;  ///< the others, ascending
  std::vector<unsigned> empty;         ///< levels named that would have no pixels

  std::vector<unsigned> Levels(Reason reason) const;
};

BuildPlan PlanBuild(const RasterFacts& facts, const BuildRequest& request);

}  // namespace orin::overviews
