/// Levels of a TIFF that is no file by itself: in an archive, on a server.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/levelstore.h"
#include "host/drivers/gdal/gdalformats.h"

namespace orin::drivers {

/// Told of, and neither used nor changed: they are hidden levels, and everything but asking for
/// them is refused.
std::unique_ptr<datasources::ILevelStore> ArchivedLevels(const std::string& name,
                                                         const GdalFormat& format);

}  // namespace orin::drivers
