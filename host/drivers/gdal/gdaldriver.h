/// Every raster format but local TIFF files, through the GDAL library, which is loaded for the
/// first file that needs it.
// SPDX-License-Identifier: MIT
#pragma once

namespace orin::drivers {

/// Adds the formats of the GDAL library to the registry; to be called after the registration of
/// all other drivers: a file that one of them takes does not load the library. The library comes
/// with a module, `orin-overviews-gdal.so`, which is looked for where the program's run path leads:
/// targets and pkg-config see to that. Where it cannot be loaded, such files are unrecognised, and
/// what is thrown for them says why.
void RegisterGdalDriver();

}  // namespace orin::drivers
