/// Finds the levels of an image in the chain of directories, and the place of a new one.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/drivers/tiff/file/catalogue.h"
#include "host/drivers/tiff/levelmetadata.h"
#include "host/drivers/tiff/pixelformat.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

/// What a directory must fit to be a level.
struct ImageShape {
  uint32_t width = 0;
  uint32_t height = 0;
  uint32_t samples = 0;
  gobs::DataType type;    ///< as delivered
  bool isInFile = false;  ///< the file's first directory is the image itself; else all are levels
};

struct StoredLevel {
  unsigned level = 0;
  size_t index = 0;            ///< in the chain
  std::optional<size_t> mask;  ///< index of its mask in the chain
  bool isOurs = false;         ///< it carries a validity for every channel
  PixelFormat format;
  LevelMetadata metadata;
  uint64_t validityPosition = 0;  ///< in the file
  uint64_t imagePosition = 0;     ///< of the record of the image, in the file; 0: it has none
  uint64_t contentPosition = 0;   ///< of the record of the content, as above
};

/// The levels of the image, in the order of the chain; those that differ from it in channels or
/// type are left out.
std::vector<StoredLevel> FindLevels(const PositionedFile& file, const TiffStructure& structure,
                                    const Catalogue& catalogue, const ImageShape& image);
/// The same of those inside the image's directory; their index in the chain means nothing.
std::vector<StoredLevel> FindSubLevels(const PositionedFile& file, const TiffStructure& structure,
                                       const Catalogue& catalogue, const ImageShape& image);

/// Where a link is to be changed, and what the directory linked there must link on to.
struct Place {
  uint64_t linkPosition = 0;
  uint64_t next = 0;
};

/// The place of a new level of that size: largest first, behind the image and its mask, before the
/// image's first smaller level and before any other image of the file.
Place PlaceOfNew(const TiffStructure& structure, const Catalogue& catalogue,
                 const ImageShape& image, uint32_t width, uint32_t height);
/// The place of a directory that takes over that of directory `index`.
Place PlaceOf(const TiffStructure& structure, size_t index);

}  // namespace orin::drivers
