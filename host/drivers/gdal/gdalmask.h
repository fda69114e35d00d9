/// The mask of a raster of the GDAL library: which of its pixels hold data.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/validity.h"
#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

/// True when one mask for all channels is part of the raster: the mask of a virtual raster, of a
/// JPEG file. What alpha, no-data values or a mask file beside it say is none.
bool HasMaskInside(const GdalHandle& handle);

/// A reader of that mask on a handle of its own. \throws orin::Exception  it cannot be opened
std::unique_ptr<datasources::IValidityReader> OpenMaskInside(const std::string& name,
                                                             const GdalFormat& format);

}  // namespace orin::drivers
