/// The node tree of an ERDAS Imagine file (.img), as far as it tells of levels.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

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

/// Where a metadata item of the file stands: its text, and its node with the node's neighbours.
struct HfaItemPlace {
  uint32_t text = 0;       ///< position, bytes
  uint32_t textBytes = 0;  ///< with the zero at its end
  uint32_t node = 0;
  uint32_t previous = 0;  ///< 0: it is the first child of `parent`
  uint32_t next = 0;      ///< 0: it is the last one
  uint32_t parent = 0;
};

/// A pointer of the tree that gets another value.
struct HfaPointer {
  uint32_t position;
  uint32_t value;
};

/// What takes an item out of the tree.
std::vector<HfaPointer> PointersWithout(const HfaItemPlace& item);

/// Nothing when the file has no such item. \param path  as below
/// \throws orin::Exception  the file's tree cannot be read
std::optional<HfaItemPlace> FindHfaItem(const std::string& path, const std::string& key);

/// \param path  also a name of the library: "/vsizip/..."
/// \throws orin::Exception  the file's tree cannot be read
HfaPyramid ReadHfaPyramid(const std::string& path);

}  // namespace orin::drivers
