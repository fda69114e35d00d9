/// Every raster format but local TIFF files, through the GDAL library.
// SPDX-License-Identifier: MIT
#pragma once

namespace orin::drivers {

/// Adds the formats of the GDAL library to the registry; to be called after the TIFF driver's
/// registration, so that local TIFF files stay that driver's. Sets up the library for the process:
/// it registers the formats in use and no others, prints nothing, and caches at most 64 MiB of
/// pixels. Options that the environment sets for the library stay in force.
void RegisterGdalDriver();

}  // namespace orin::drivers
