/// The fingerprint of the image that a TIFF file holds.
// SPDX-License-Identifier: MIT
#pragma once

#include <stop_token>
#include <string>

namespace orin::drivers {

/// Of the stored bytes of the image's tiles or strips in index order, and then of those of its
/// mask, when the file has a directory for one. Where in the file they stand does not count, nor
/// does any other tag, but for the tables that JPEG tiles share.
/// \returns empty when `stop` was requested
/// \throws orin::Exception  the file or one of the tiles cannot be read; the text names the file
std::string FingerprintOfTiff(const std::string& path, const std::stop_token& stop);

}  // namespace orin::drivers
