/// Where the pixels of a channel or of its levels stand in an ERDAS Imagine file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/drivers/hfa/hfanode.h"
#include "host/drivers/hfa/patchedfile.h"

namespace orin::drivers {

/// A block of 64 x 64 pixels as it is stored.
struct HfaBlock {
  uint32_t position = 0;  ///< 0 while it has no room
  uint32_t bytes = 0;
  uint32_t pointer = 0;  ///< where the number stands that leads to it
};

/// The list of a raster's blocks.
struct HfaBlockMap {
  HfaNode node;
  bool isCompressed = false;  ///< blocks get room when they are written, as much as they need
  bool isHere = true;         ///< all of them stand in this file
  uint32_t list = 0;          ///< where the list proper begins, as the file says
  uint32_t listPointer = 0;   ///< where it says so
  std::vector<HfaBlock> blocks;
};

/// True for the node that holds a raster's list of blocks.
bool IsHfaBlockMap(const HfaNode& node);
/// \throws orin::Exception  the list is damaged
HfaBlockMap ReadHfaBlockMap(HfaTree& tree, const HfaNode& node);
/// Of a stored level of a channel (1-based), or for factor 1 of the image; none where the file has
/// no such level, or keeps its blocks elsewhere.
/// \throws orin::Exception  the tree or the list is damaged
std::optional<HfaBlockMap> FindHfaBlockMap(const std::string& path, unsigned channel,
                                           unsigned factor);

/// Appends a list like `map`, whose blocks have new room at the end of the file, and has the node
/// lead to it: what is written to the level from then on goes there, and the old blocks stay as
/// they are.
void RenewHfaBlocks(PatchedFile& file, const HfaBlockMap& map);

}  // namespace orin::drivers
