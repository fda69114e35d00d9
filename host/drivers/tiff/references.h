/// Finds the bytes of a TIFF file that something in it refers to.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "host/drivers/common/byteranges.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

struct References {
  ByteRanges extents;
  bool areAllKnown = true;  ///< false: more may be referred to than was found
};

/// The header, the directories of the chain and those inside them (SubIFDs, EXIF, GPS), their
/// values, and the tiles or strips of all of them.
/// \throws orin::Exception  the file cannot be read
References ReferencesIn(const PositionedFile& file, const TiffStructure& structure);

/// The same of one directory.
References ReferencesOf(const PositionedFile& file, const TiffStructure& structure,
                        const TiffDirectory& directory);

}  // namespace orin::drivers
