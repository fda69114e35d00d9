/// How a format without a header of its own stores its pixels, as a file beside it tells.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

/// Digest of what turns the stored bytes into pixels: size, types, byte order, places, palettes.
/// Texts and places on the earth that the header holds as well are no part of it.
std::string RawLayoutOf(const GdalHandle& handle, const GdalFormat& format);

}  // namespace orin::drivers
