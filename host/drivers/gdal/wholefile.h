/// Finds files that end too early where their decoders would fill up what is missing, silently.
// SPDX-License-Identifier: MIT
#pragma once

#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

/// \throws orin::Exception  the file is shorter than its header says
void RequireWholeFile(const GdalHandle& handle, const GdalFormat& format);

}  // namespace orin::drivers
