/// The item of a level's metadata that names the image of the file that the level was made from.
/// Only files of several pages need it: their levels stand behind the last page.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>

#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

/// A metadata tag's text with the item. \param page  1 for the file's first image
std::string WithPage(std::string text, unsigned page);

/// The page that the metadata of a directory names; none when it names none.
/// \throws orin::Exception  the file cannot be read
std::optional<unsigned> PageNamedIn(const PositionedFile& file, const TiffStructure& structure,
                                    const TiffDirectory& directory);

}  // namespace orin::drivers
