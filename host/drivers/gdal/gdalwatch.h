/// Where the data of an image stands that its levels were computed from.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "host/datasources/imagewatch.h"
#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

/// Watches what `handle` has open: of a virtual raster the text and its sources, of an ERDAS
/// Imagine file, whose bytes change with its levels, the pixels, of all others the bytes of those
/// files that hold pixels. Null for what is no file by itself.
std::shared_ptr<datasources::ImageWatch> WatchOf(const GdalHandle& handle,
                                                 const GdalFormat& format);

}  // namespace orin::drivers
