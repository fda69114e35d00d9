/// Levels inside files of other formats, which a driver of their own keeps.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/levelstore.h"
#include "host/drivers/gdal/gdalformats.h"
#include "host/drivers/gdal/sourceuse.h"

namespace orin::drivers {

/// Opens the levels inside the file `name`; null when it holds none that are its own and cannot
/// take any.
/// \param image  its full resolution; outlives the store
/// \throws orin::Exception  the file cannot be read, or it cannot be used so
using OpenInternalLevels =
    std::unique_ptr<datasources::ILevelStore> (*)(const std::string& name, const GdalFormat& format,
                                                  datasources::IRasterSource& image, SourceUse use);

}  // namespace orin::drivers
