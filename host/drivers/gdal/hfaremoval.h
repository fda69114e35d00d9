/// Takes levels out of the tree of an ERDAS Imagine file.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/drivers/common/byteranges.h"

namespace orin::drivers {

/// Takes the levels of `factors` out of all channels, and items out of the file's metadata: first
/// out of the lists of levels, then out of the tree, so that no list names what is not there; the
/// items last.
/// \returns the bytes that nothing refers to any more
/// \throws orin::Exception  the tree cannot be read or written; what is gone stays gone
ByteRanges RemoveHfaLevels(const std::string& path, const std::vector<unsigned>& factors,
                           const std::vector<std::string>& items);

/// Takes what a removal that was stopped between its two steps left in the tree out of it: levels
/// that no list of their channel names, if they are `factor`, which would stand there twice when it
/// is made again, or have an item of ours; with the items.
/// \throws orin::Exception  the tree cannot be read or written
void RemoveUnlistedHfaLevels(const std::string& path, unsigned factor);

}  // namespace orin::drivers
