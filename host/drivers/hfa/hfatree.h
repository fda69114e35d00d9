/// The node tree of an ERDAS Imagine file (.img), as far as it tells of levels.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "host/drivers/hfa/hfanamelist.h"
#include "host/drivers/hfa/hfanode.h"

namespace orin::drivers {

struct HfaPyramid {
  /// One list a channel, in the order of the list in the file.
  std::vector<std::vector<HfaLevelName>> channels;
  bool isSpilled = false;  ///< pixels stand in a second file (.ige)

  /// True when a list names another file than `name`: the file was copied or renamed, or its levels
  /// stand elsewhere. What the lists lead to is not this file's then.
  bool NamesAnotherFileThan(const std::string& name) const;
  /// Position of the level in the channel's list, or -1. \param channel  1-based
  int Find(unsigned channel, unsigned factor) const;
  /// How many levels the channel has.
  size_t CountOf(unsigned channel) const;
};

/// \param path  also a name of the library: "/vsizip/..."
/// \throws orin::Exception  the file's tree cannot be read
HfaPyramid ReadHfaPyramid(const std::string& path);
HfaPyramid HfaPyramidOf(HfaTree& tree);

/// Where the text of a metadata item of the file stands.
struct HfaItemPlace {
  uint32_t text = 0;       ///< position, bytes
  uint32_t textBytes = 0;  ///< with the zero at its end
};

/// Nothing when the file has no such item.
/// \throws orin::Exception  the file's tree cannot be read
std::optional<HfaItemPlace> FindHfaItem(const std::string& path, const std::string& key);
/// The metadata items of the file, by their names. \throws orin::Exception  the tree is damaged
std::map<std::string, HfaItemPlace> HfaItemsOf(HfaTree& tree);
/// True for the node whose children are the metadata items of the file.
bool IsHfaItemTable(const HfaNode& node);
/// True for an item.
bool IsHfaItem(const HfaNode& node);

/// The node of a channel's image, with what belongs to its levels.
struct HfaLayer {
  HfaNode node;
  std::vector<HfaNode> parts;  ///< its children
};

/// True for the node of a channel.
bool IsHfaLayer(const HfaNode& node);
/// \throws orin::Exception  the file's tree cannot be read
uint64_t CountHfaNodes(const std::string& path);
/// The channels in their order.
std::vector<HfaLayer> HfaLayersOf(HfaTree& tree);
/// The decimation factor of the level that `part` of a channel is; 0: it is none.
unsigned FactorOfHfaPart(const HfaNode& part);
/// True for a channel's list of levels.
bool IsHfaNameList(const HfaNode& part);

}  // namespace orin::drivers
