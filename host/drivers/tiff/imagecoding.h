/// The tags of a TIFF directory that decide what its stored bytes mean.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

/// Digest of the tags that turn stored bytes into pixels: sizes and grid, codec and its tables,
/// sample format, order of bytes and bits, colour model, roles of samples. A tag that is left out
/// equals its default, and how a number is stored does not count. Georeference, texts and all else
/// that no pixel depends on are no part of it.
std::string CodingDigestOf(const PositionedFile& file, const TiffStructure& structure,
                           const TiffDirectory& directory);

/// Digest of the palette; empty without one.
std::string PaletteDigestOf(const PositionedFile& file, const TiffStructure& structure,
                            const TiffDirectory& directory);

}  // namespace orin::drivers
