/// What `info` tells of a raster, and its two forms.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "basic/gobs/datatype.h"
#include "host/datasources/dataset.h"
#include "host/datasources/levelsite.h"

namespace orin::app {

struct RasterInfo {
  std::string file;
  std::string formatName;         ///< "TIFF"
  std::string formatDescription;  ///< "TIFF / GeoTIFF"
  unsigned width = 0;             ///< pixels
  unsigned height = 0;            ///< pixels
  std::vector<gobs::DataType> channels;
  std::vector<datasources::LevelDescription> levels;  ///< ascending, those in both places twice
  bool hasMask = false;       ///< of the image, inside its file or beside it
  unsigned alphaChannel = 0;  ///< 1-based, 0: none
  bool isCloudOptimized = false;
  std::optional<datasources::LeftOver> leftOver = {};  ///< beside it, of an image of another size
};

/// \param keepsAnswers  keep with the levels what had to be read, if their file may be written
/// \throws orin::Exception  the file cannot be opened or is no raster
RasterInfo CollectInfo(const std::string& file, bool keepsAnswers);

/// "uint8", "int16", "float32", "complex float64", "bit" ...
std::string TypeName(const gobs::DataType& type);

/// A heading and a table with one line for each level.
std::string TableOf(const RasterInfo& info);

/// One JSON object; docs/cli.md describes it.
std::string JsonOf(const RasterInfo& info);

}  // namespace orin::app
