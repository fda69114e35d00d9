/// The formats of the GDAL library that are in use, in the library itself.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/drivers/gdal/formattable.h"

namespace orin::drivers {

/// Registers those of our drivers that the installed library has; once a process.
void RegisterGdalFormats();

/// The format that the library opens `name` as, or null. Neither a directory nor memory of a
/// program is a raster here.
const GdalFormat* IdentifyGdalFormat(const std::string& name);

}  // namespace orin::drivers
