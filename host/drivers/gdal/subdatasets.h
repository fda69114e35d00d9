/// The rasters inside a container file.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

/// What to tell of a file that holds no raster of its own: the names of those inside it, if any.
std::string NoRasterText(const GdalHandle& handle);

}  // namespace orin::drivers
