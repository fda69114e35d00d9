/// What is known of a raster and its levels before a build is planned.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "basic/gobs/datatype.h"
#include "host/datasources/levelsite.h"
#include "host/datasources/overviewinfo.h"

namespace orin::overviews {

/// The levels in one place.
struct PlaceFacts {
  std::vector<datasources::LevelDescription> levels;  ///< ascending
  std::vector<unsigned> otherForm;  ///< of these: stored otherwise than the options say
};

struct RasterFacts {
  uint32_t width = 0;   ///< pixels
  uint32_t height = 0;  ///< pixels
  std::vector<gobs::DataType> channels;
  bool isTiff = false;            ///< inside, all channels are treated in one pass
  bool isCloudOptimized = false;  ///< levels that are added inside cost the file this property
  std::optional<datasources::LeftOver> leftOver;  ///< beside, of an image of another size
  bool isCategorical = false;  ///< pixels number colours of a palette, or classes
  bool holdsLevels = false;    ///< the format keeps levels inside
  bool isWritable = false;     ///< the file is open for update
  PlaceFacts inside;
  PlaceFacts beside;

  const PlaceFacts& In(datasources::LevelPlace place) const {
    return place == datasources::LevelPlace::kInternal ? inside : beside;
  }
};

/// Looks at what `site` has open. \throws orin::Exception  it is no raster
RasterFacts FactsOf(datasources::LevelSite& site, const datasources::LevelOptions& storing);

/// The levels in one place now, ascending.
std::vector<datasources::LevelDescription> LevelsIn(datasources::LevelSite& site,
                                                    datasources::LevelPlace place);

}  // namespace orin::overviews
