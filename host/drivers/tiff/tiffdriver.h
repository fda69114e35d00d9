/// TIFF files: reading their pixels, and keeping levels inside them or in a side-car beside any
/// image.
// SPDX-License-Identifier: MIT
#pragma once

namespace orin::drivers {

/// Adds the format "TIFF" and the side-car `NAME.EXT.ovr` to the registry.
void RegisterTiffDriver();

}  // namespace orin::drivers
