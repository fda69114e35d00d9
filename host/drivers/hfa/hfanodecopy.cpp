// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfanodecopy.h"

#include <algorithm>

namespace orin::drivers {

HfaNodeCopy::HfaNodeCopy(HfaTree& tree, const HfaNode& node, unsigned depth)
    : original(node), bytes_(tree.NodeBytes(node)) {
  if (depth > kDeepestHfaNode) tree.Fail();
  for (const HfaNode& child : tree.ChildrenOf(node))
    children.push_back(HfaNodeCopy(tree, child, depth + 1));
}

HfaNodeCopy::HfaNodeCopy(const std::string& name, const std::string& type)
    : bytes_(kHfaNodeBytes, '\0') {
  original.name = name;
  original.type = type;
  std::copy_n(name.begin(), std::min<size_t>(name.size(), kHfaTypeAt - kHfaNameAt - 1),
              bytes_.begin() + kHfaNameAt);
  std::copy_n(type.begin(), std::min<size_t>(type.size(), kHfaTypeBytes - 1),
              bytes_.begin() + kHfaTypeAt);
}

std::string HfaNodeCopy::BytesAt(uint32_t position) const {
  std::string bytes;
  Append(bytes, position, 0);
  return bytes;
}

size_t HfaNodeCopy::Append(std::string& bytes, uint32_t position, uint32_t parent) const {
  const size_t at = bytes.size();
  bytes += bytes_;
  for (const uint32_t pointer : {kHfaNextAt, kHfaPreviousAt, kHfaChildAt})
    PutHfaNumber(bytes, at + pointer, 0);
  PutHfaNumber(bytes, at + kHfaParentAt, parent);
  const auto place = [&](size_t offset) { return static_cast<uint32_t>(position + offset); };
  if (newData) {
    const std::string data = newData(place(bytes.size()));
    PutHfaNumber(bytes, at + kHfaDataAt, place(bytes.size()));
    PutHfaNumber(bytes, at + kHfaDataAt + 4,
                 newDataBytes != 0 ? newDataBytes : static_cast<uint32_t>(data.size()));
    bytes += data;
  }
  size_t pointer = at + kHfaChildAt, before = 0;
  for (const HfaNodeCopy& child : children) {
    const size_t childAt = child.Append(bytes, position, place(at));
    PutHfaNumber(bytes, pointer, place(childAt));
    if (before != 0) PutHfaNumber(bytes, childAt + kHfaPreviousAt, place(before));
    before = childAt;
    pointer = childAt + kHfaNextAt;
  }
  return at;
}

}  // namespace orin::drivers
