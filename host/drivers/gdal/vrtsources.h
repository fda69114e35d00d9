/// The files that the pixels of a virtual raster (VRT) come from.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

struct VrtSources {
  /// Plain files, each once, in order of appearance, those of sources of sources too; for a part of
  /// an archive the archive. A file that does not exist may be one of them.
  std::vector<std::string> files;
  /// False when pixels come from what is no plain file: a server, a database, a directory.
  bool areAllFiles = true;
};

/// \param vrt  opened as a virtual raster from a plain file
VrtSources SourcesOfVrt(const GdalHandle& vrt);

/// Of the virtual raster's text and of the sizes and times of its sources; empty when some of them
/// cannot be traced to a file, so that nothing can be told of them.
/// \throws orin::Exception  the virtual raster cannot be read
std::string FingerprintOfVrt(const std::string& file, const GdalFormat& format);

}  // namespace orin::drivers
