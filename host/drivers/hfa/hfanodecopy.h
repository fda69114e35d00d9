/// Nodes of an ERDAS Imagine file, copied with all that hangs on them.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "host/drivers/hfa/hfanode.h"

namespace orin::drivers {

/// A node that is to stand elsewhere, with its children. Its data stays where it is, unless
/// `newData` makes other data for it.
class HfaNodeCopy {
 public:
  /// The data of a node, for the position where it will stand; always of one length.
  using Data = std::function<std::string(uint32_t position)>;

  /// \throws orin::Exception  the tree is damaged
  HfaNodeCopy(HfaTree& tree, const HfaNode& node) : HfaNodeCopy(tree, node, 0) {}
  /// A new one without data.
  HfaNodeCopy(const std::string& name, const std::string& type);

  HfaNode original = {};  ///< position 0: there is none
  std::vector<HfaNodeCopy> children = {};
  Data newData = {};
  uint32_t newDataBytes = 0;  ///< of it; what follows is something that it leads to. 0: all

  /// The copy's bytes, and those of all below it, to stand at `position` of the file. It stands
  /// first, and has neither parent nor siblings.
  std::string BytesAt(uint32_t position) const;

 private:
  HfaNodeCopy(HfaTree& tree, const HfaNode& node, unsigned depth);
  /// Appends the node and what is below it. \returns where the node stands in `bytes`
  size_t Append(std::string& bytes, uint32_t position, uint32_t parent) const;

  std::string bytes_;  ///< of the node
};

}  // namespace orin::drivers
