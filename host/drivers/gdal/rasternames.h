/// Which names can be rasters of the GDAL library. Looks only, and needs no library for it.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace orin::drivers {

/// True for a path of the operating system, and not for the library's own kinds of names:
/// "/vsizip/...", "NETCDF:..."
bool IsRegularFile(const std::string& name);

/// A name that only the library understands: "/vsizip/...", "NETCDF:..."
bool IsLibraryName(const std::string& name);

}  // namespace orin::drivers
