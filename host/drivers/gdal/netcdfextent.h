/// How long a classic netCDF file has to be, from its header.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

namespace orin::drivers {

/// Bytes up to the end of the last variable; 0 when the file is no classic netCDF (versions 1, 2
/// and 5), or its header does not tell.
uint64_t EndOfClassicNetcdf(const std::string& path);

}  // namespace orin::drivers
