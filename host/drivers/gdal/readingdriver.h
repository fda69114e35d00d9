/// The driver of the formats that the GDAL library reads; it needs the library.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "host/datasources/formats.h"
#include "host/drivers/gdal/internallevels.h"

namespace orin::drivers {

/// Sets up the library for the process: it registers the formats in use and no others, prints
/// nothing, and caches at most 64 MiB of pixels. Options that the environment sets for the library
/// stay in force.
/// \param erdasLevels  of ERDAS Imagine files; null: their levels are kept beside them
std::unique_ptr<datasources::IFormatDriver> MakeReadingDriver(OpenInternalLevels erdasLevels);

}  // namespace orin::drivers
