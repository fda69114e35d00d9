/// The fingerprint of the image that a TIFF file holds.
// SPDX-License-Identifier: MIT
#pragma once

#include <stop_token>
#include <string>

#include "host/datasources/fingerprint.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

/// Of the stored bytes of the image's tiles or strips in index order, and then of those of its
/// mask, when the file has a directory for one. Where in the file they stand does not count, nor
/// does any other tag, but for the tables that JPEG tiles share; see imagecoding.h for those.
/// \returns empty when `stop` was requested
/// \throws orin::Exception  the file or one of the tiles cannot be read; the text names the file
std::string FingerprintOfTiff(const std::string& path, const std::stop_token& stop);

/// Adds the stored bytes of a directory's tiles or strips in index order, wherever they stand.
/// \returns false when `stop` was requested
/// \throws orin::Exception  one of them cannot be read; the text names the file
bool AddStoredTiles(const PositionedFile& file, const TiffStructure& structure,
                    const TiffDirectory& directory, datasources::Fingerprinter& fingerprint,
                    const std::stop_token& stop);
/// Adds how many bytes each of them has. \throws orin::Exception  the table cannot be read
void AddTileSizes(const PositionedFile& file, const TiffStructure& structure,
                  const TiffDirectory& directory, datasources::Fingerprinter& fingerprint);

}  // namespace orin::drivers
