/// Takes levels out of the tree of an ERDAS Imagine file.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/drivers/gdal/byteranges.h"

namespace orin::drivers {

/// Takes the levels of `factors` out of all channels, and items out of the file's metadata: first
/// out of the lists of levels, then out of the tree, so that no list names what is not there.
/// \returns the bytes that nothing refers to any more
/// \throws orin::Exception  the tree cannot be read or written; what is gone stays gone
ByteRanges RemoveHfaLevels(const std::string& path, const std::vector<unsigned>& factors,
                           const std::vector<std::string>& items);

/// Takes what a removal left of a level that was stopped between its two steps out of the tree: the
/// level would stand there twice when it is made again.
/// \throws orin::Exception  the tree cannot be read or written
void RemoveUnlistedHfaLevel(const std::string& path, unsigned factor);

}  // namespace orin::drivers
