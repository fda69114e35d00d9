// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfablocks.h"

#include <utility>

#include "host/drivers/hfa/hfatree.h"

namespace orin::drivers {
namespace {

// Positions within the list, bytes.
constexpr uint32_t kCompressionAt = 12, kListPositionAt = 18, kFirstEntryAt = 22;
constexpr uint32_t kEntryBytes = 14;
// Positions within an entry.
constexpr uint32_t kFileAt = 0, kBlockAt = 2, kBytesAt = 6, kIsWrittenAt = 10, kIsPackedAt = 12;

uint16_t ShortAt(const std::string& bytes, size_t at) {
  return static_cast<uint16_t>(HfaNumberAt(bytes, at) & 0xffff);
}

void PutShort(std::string& bytes, size_t at, uint16_t number) {
  bytes.at(at) = static_cast<char>(number & 255);
  bytes.at(at + 1) = static_cast<char>(number >> 8);
}

}  // namespace

bool IsHfaBlockMap(const HfaNode& node) { return node.type == "Edms_State"; }

HfaBlockMap ReadHfaBlockMap(HfaTree& tree, const HfaNode& node) {
  const std::string data = tree.DataOf(node);
  const uint64_t count = HfaNumberAt(data, 0);
  if (data.size() < kFirstEntryAt || count > (data.size() - kFirstEntryAt) / kEntryBytes)
    tree.Fail();
  HfaBlockMap map;
  map.node = node;
  map.isCompressed = ShortAt(data, kCompressionAt) != 0;
  map.list = HfaNumberAt(data, kListPositionAt);
  map.listPointer = node.data + kListPositionAt;
  for (uint32_t i = 0; i < count; ++i) {
    const uint32_t at = kFirstEntryAt + i * kEntryBytes;
    map.isHere = map.isHere && ShortAt(data, at + kFileAt) == 0;
    map.blocks.push_back({HfaNumberAt(data, at + kBlockAt), HfaNumberAt(data, at + kBytesAt),
                          node.data + at + kBlockAt});
  }
  return map;
}

std::optional<HfaBlockMap> FindHfaBlockMap(const std::string& path, unsigned channel,
                                           unsigned factor) {
  HfaTree tree(path);
  const std::vector<HfaLayer> layers = HfaLayersOf(tree);
  if (channel < 1 || channel > layers.size()) return std::nullopt;
  for (const HfaNode& part : layers[channel - 1].parts) {
    if (factor == 1 && IsHfaBlockMap(part)) return ReadHfaBlockMap(tree, part);
    if (FactorOfHfaPart(part) != factor) continue;
    for (const HfaNode& node : tree.ChildrenOf(part))
      if (IsHfaBlockMap(node)) return ReadHfaBlockMap(tree, node);
  }
  return std::nullopt;
}

void RenewHfaBlocks(PatchedFile& file, const HfaBlockMap& map) {
  std::string data = HfaTree(file.LibraryName()).DataOf(map.node);
  const auto start = static_cast<uint32_t>(file.Size());
  auto room = static_cast<uint32_t>(start + data.size());
  PutHfaNumber(data, kListPositionAt, start + kFirstEntryAt);
  for (uint32_t i = 0; i < map.blocks.size(); ++i) {
    const uint32_t at = kFirstEntryAt + i * kEntryBytes;
    const uint32_t bytes = map.isCompressed ? 0 : map.blocks[i].bytes;
    PutHfaNumber(data, at + kBlockAt, map.isCompressed ? 0 : room);
    PutHfaNumber(data, at + kBytesAt, bytes);
    PutShort(data, at + kIsWrittenAt, 0);
    PutShort(data, at + kIsPackedAt, map.isCompressed ? 1 : 0);
    room += bytes;
  }
  file.Write(start, data.data(), data.size());
  // The library appends more behind what is there: the room has to be.
  if (room > file.Size()) file.Write(room - 1, "", 1);
  std::string position(4, '\0');
  PutHfaNumber(position, 0, start);
  file.Write(map.node.position + kHfaDataAt, position.data(), position.size());
  file.RequireWritten();
}

}  // namespace orin::drivers
