/// From the image's codec and the user's options to the codec of a level.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

#include "host/datasources/leveloptions.h"
#include "host/drivers/tiff/levelcoding.h"

namespace orin::drivers {

/// Gives `coding`, still the image's codec in the level's size, what `options` say. Without a
/// compression among them the image's is kept where it can be written here and changes no value
/// more than the image's own storage does, and is DEFLATE elsewhere; so it is of a JPEG image with
/// alpha, whose transparent pixels would not stay transparent.
/// \param mostTileBytes  of a tile's samples
/// \throws datasources::OptionException  an option does not fit the samples
void ApplyOptions(const datasources::LevelOptions& options, const std::string& file,
                  uint64_t mostTileBytes, LevelCoding& coding);

}  // namespace orin::drivers
