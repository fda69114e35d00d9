/// The masks of an image: a directory of its TIFF file, and the mask file `NAME.EXT.msk` beside an
/// image of any format.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "host/datasources/levelstore.h"
#include "host/datasources/validity.h"

namespace orin::drivers {

/// Reads a mask directory: one sample a pixel, 0 for no data.
/// \param directoryOffset  in bytes, 0 is the first directory
/// \throws orin::Exception  it cannot be read, or holds several samples a pixel
std::unique_ptr<datasources::IValidityReader> OpenTiffMask(const std::string& path,
                                                           uint64_t directoryOffset);

/// A reader of the file `IMAGEFILE.msk` if it says how it applies, and to all channels alike. Null
/// without one; the user is warned of a file that cannot serve.
/// \throws orin::Exception  there is such a file, and it cannot be read
std::unique_ptr<datasources::IValidityReader> OpenMaskBeside(const std::string& imageFile,
                                                             unsigned width, unsigned height);

}  // namespace orin::drivers
