/// What a caller asks of a build.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <vector>

#include "host/datasources/leveloptions.h"
#include "host/datasources/overviewinfo.h"
#include "processes/overviews/resampletype.h"

namespace orin::overviews {

struct BuildRequest {
  std::vector<unsigned> channels;  ///< 1-based; empty: all that are wider than one bit
  std::vector<unsigned> levels;    ///< empty: the pyramid of `factor`, and what is out of date
  unsigned factor = 2;             ///< 2 or 3
  std::optional<QRTOverviewResampleType> method;  ///< none: as levels record it, else the usual one
  QRTOverviewResampleType usualMethod = ResampleNearest;
  std::optional<datasources::LevelPlace> place;  ///< none: where it suits the file
  datasources::LevelOptions storing;             ///< how new levels are stored
  bool force = false;                            ///< build levels that are up to date, too
};

}  // namespace orin::overviews
