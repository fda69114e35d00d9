/// Virtual rasters (VRT): a text that names the files its pixels come from.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

namespace orin::datasources {

/// The files that the text of a virtual raster names as sources, and those that sources which are
/// virtual rasters themselves name, each once, in order of appearance. Relative names are completed
/// where the text says that they are relative to it.
/// \param file  the virtual raster; one that cannot be read names nothing
std::vector<std::string> SourcesOfVrt(const std::string& file);

/// Of the virtual raster's text and of the names, sizes and times of its sources.
/// \throws orin::Exception  the virtual raster cannot be read
std::string FingerprintOfVrt(const std::string& file);

}  // namespace orin::datasources
