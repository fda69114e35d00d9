/// The node tree of an ERDAS Imagine file (.img), as far as it tells of levels.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/drivers/gdal/hfanode.h"

namespace orin::drivers {

/// An entry of a channel's list of levels.
struct HfaLevelName {
  std::string file;     ///< name, without folder, of the file that is said to hold the level;
                        ///< empty: this one, without a list
  unsigned factor = 0;  ///< decimation factor
};

struct HfaPyramid {
  /// One list a channel, in the order of the list in the file.
  std::vector<std::vector<HfaLevelName>> channels;
  bool isSpilled = false;  ///< pixels stand in a second file (.ige)

  /// True when a list names another file than `name`: the file was copied or renamed, or its levels
  /// stand elsewhere. What the lists lead to is not this file's then.
  bool NamesAnotherFileThan(const std::string& name) const;
  /// Position of the level in the channel's list, or -1. \param channel  1-based
  int Find(unsigned channel, unsigned factor) const;
};

/// \param path  also a name of the library: "/vsizip/..."
/// \throws orin::Exception  the file's tree cannot be read
HfaPyramid ReadHfaPyramid(const std::string& path);

/// Where the text of a metadata item of the file stands.
struct HfaItemPlace {
  uint32_t text = 0;       ///< position, bytes
  uint32_t textBytes = 0;  ///< with the zero at its end
};

/// Nothing when the file has no such item.
/// \throws orin::Exception  the file's tree cannot be read
std::optional<HfaItemPlace> FindHfaItem(const std::string& path, const std::string& key);
/// The lists of children that the metadata items of the file stand in, whole.
std::vector<std::vector<HfaNode>> HfaItemListsOf(HfaTree& tree);
/// True for the item of that name.
bool IsHfaItem(const HfaNode& node, const std::string& key);

/// The node of a channel's image, with what belongs to its levels.
struct HfaLayer {
  HfaNode node;
  std::vector<HfaNode> parts;  ///< its children
};

/// The channels in their order.
std::vector<HfaLayer> HfaLayersOf(HfaTree& tree);
/// The decimation factor of the level that `part` of a channel is; 0: it is none.
unsigned FactorOfHfaPart(const HfaNode& part);
/// True for a channel's list of levels.
bool IsHfaNameList(const HfaNode& part);

/// The factors that a list of levels names. \param data  of its node
std::vector<unsigned> FactorsInHfaList(const std::string& data);

/// A channel's list of levels without some of them, for a place of its own.
struct HfaNameList {
  std::string data;    ///< as many bytes as before; PlaceHfaNameList puts its pointers right
  unsigned names = 0;  ///< that are left
  bool isShorter = false;
};
HfaNameList NamesWithout(const std::string& data, const std::vector<unsigned>& factors);
/// Where the numbers stand in `data` that lead to its own bytes.
std::vector<uint32_t> PointersInHfaNameList(const std::string& data);
/// `data` of a list, with the pointers that it has when it stands at `position`.
std::string PlaceHfaNameList(std::string data, uint32_t position);

}  // namespace orin::drivers
