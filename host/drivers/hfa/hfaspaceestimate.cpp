// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfaspaceestimate.h"

#include <algorithm>
#include <filesystem>
#include <system_error>

#include "host/datasources/levelroom.h"
#include "host/drivers/hfa/hfablocks.h"
#include "host/model/levelsize.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::LevelRoom;

constexpr uint64_t kBlockEdge = 64;  // pixels
// Bytes; those of the tree are what the library was seen to use, a little more for certainty.
constexpr uint64_t kListBytes = 64;        // of a list of blocks, but for its entries
constexpr uint64_t kListEntryBytes = 14;   // of a block in it
constexpr uint64_t kPackedBytes = 16;      // of a compressed block that holds one value
constexpr uint64_t kNodesBytes = 512;      // of a channel's level
constexpr uint64_t kRecordBytes = 1024;    // of a level's items, but for those of a channel
constexpr uint64_t kPendingBytes = 10;     // of a channel in an item
constexpr uint64_t kNameListBytes = 3200;  // of a channel's list of levels

/// Of a channel's level, whose size the format rounds up.
uint64_t BlocksOf(const datasources::IRasterSource& image, uint64_t level) {
  const auto blocks = [&](uint64_t size) {
    return (size + level * kBlockEdge - 1) / (level * kBlockEdge);
  };
  return blocks(image.Width()) * blocks(image.Height());
}

uint64_t PixelBitsOf(const datasources::IRasterSource& image, unsigned channel) {
  const gobs::DataType type = image.TypeOf(channel);
  const unsigned stored = image.StoredBitsOf(channel);
  if (stored < 8) return stored;
  return uint64_t{8} * BytesPerComponent(type) * ComponentsPerSample(type);
}

}  // namespace

/// The most that the pixels of one channel take: a compressed block is none that would grow by it.
uint64_t HfaSpaceEstimate::MaxBytesOf(unsigned level, unsigned channel) const {
  const uint64_t blockBytes = kBlockEdge * kBlockEdge * PixelBitsOf(image_, channel) / 8;
  const uint64_t blocks = BlocksOf(image_, level);
  return blocks * (blockBytes + kListEntryBytes) + kListBytes;
}

/// The same for what is compressed like the image: rows are stored by their runs, of which a
/// level's row has about as many as the image's.
uint64_t HfaSpaceEstimate::ExpectedBytesOf(unsigned level, unsigned channel) const {
  const uint64_t most = MaxBytesOf(level, channel);
  const auto image = FindHfaBlockMap(path_, channel, 1);
  const bool isStored = catalogue_.IsStored(channel, level);
  const auto own = isStored ? FindHfaBlockMap(path_, channel, level) : image;
  if (!image || !image->isCompressed || !own || !own->isCompressed) return most;
  uint64_t packed = 0;
  for (const HfaBlock& block : image->blocks) packed += block.bytes;
  const uint64_t blocks = BlocksOf(image_, level);
  return std::min(most, packed / level + blocks * (kPackedBytes + kListEntryBytes) + kListBytes);
}

/// What the tree gets: of each level a first copy, when its first channel waits for the others, and
/// another one, when it is complete.
uint64_t HfaSpaceEstimate::TreeBytesOf(const std::vector<unsigned>& levels,
                                       const std::vector<unsigned>& channels) const {
  const uint64_t lists = kNameListBytes * channels.size();
  const uint64_t items = kRecordBytes + 2 * kPendingBytes * image_.ChannelCount();
  const uint64_t parts = kNodesBytes * channels.size();
  const uint64_t tree = CountHfaNodes(path_) * kHfaNodeBytes + levels.size() * parts;
  return levels.size() * (2 * tree + lists + items + 2 * parts);
}

/// A stored level counts like a new one: the old pixels keep their room until the store goes.
LevelRoom HfaSpaceEstimate::For(const std::vector<unsigned>& levels,
                                const std::vector<unsigned>& channels) const {
  LevelRoom room;
  std::vector<unsigned> made = levels;
  std::erase_if(made, [&](unsigned level) {
    return model::LevelSizeOf(image_.Width(), image_.Height(), level).IsEmpty();
  });
  if (made.empty() || channels.empty()) return room;
  room.bytes = TreeBytesOf(made, channels);
  uint64_t most = room.bytes;
  for (const unsigned level : made)
    for (const unsigned channel : channels) {
      room.bytes += ExpectedBytesOf(level, channel);
      most += MaxBytesOf(level, channel);
    }
  room.file = path_;
  std::error_code unknown;
  const uint64_t size = std::filesystem::file_size(path_, unknown);
  if (unknown || size + most <= kMaxHfaBytes) return room;
  room.obstacle = FormatString(
      _("%s: would grow beyond the 2 GB that the format keeps in one file."), path_.c_str());
  room.advice = _("Use --external: the levels then go to a file beside it.");
  return room;
}

}  // namespace orin::drivers
