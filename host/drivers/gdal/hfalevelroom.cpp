/// Looks, before a level is made, whether an ERDAS Imagine file and its file system can take it.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <filesystem>
#include <system_error>

#include "host/datasources/levelroom.h"
#include "host/drivers/gdal/hfablocks.h"
#include "host/drivers/gdal/hfalevelstore.h"
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
constexpr uint64_t kRecordBytes = 1024;    // of a level's item, but for a character a channel
constexpr uint64_t kNameListBytes = 3200;  // of a channel's list of levels, with its first name

uint64_t BlocksOf(uint64_t width, uint64_t height) {
  return ((width + kBlockEdge - 1) / kBlockEdge) * ((height + kBlockEdge - 1) / kBlockEdge);
}

uint64_t PixelBitsOf(const datasources::IRasterSource& image, unsigned channel) {
  const gobs::DataType type = image.TypeOf(channel);
  const unsigned stored = image.StoredBitsOf(channel);
  if (stored < 8) return stored;
  return uint64_t{8} * BytesPerComponent(type) * ComponentsPerSample(type);
}

}  // namespace

/// The most that the pixels of one channel take: a compressed block is none that would grow by it.
uint64_t HfaLevelStore::MostBytesOf(unsigned level, unsigned channel) const {
  const uint64_t blockBytes = kBlockEdge * kBlockEdge * PixelBitsOf(image_, channel) / 8;
  const uint64_t blocks = BlocksOf(WidthOf(level, false), HeightOf(level, false));
  return blocks * (blockBytes + kListEntryBytes) + kListBytes;
}

/// The same for what is compressed like the image: rows are stored by their runs, of which a
/// level's row has about as many as the image's.
uint64_t HfaLevelStore::ExpectedBytesOf(unsigned level, unsigned channel) const {
  const uint64_t most = MostBytesOf(level, channel);
  const auto image = FindHfaBlockMap(path_, channel, 1);
  const bool isStored = pyramid_.Find(channel, level) >= 0;
  const auto own = isStored ? FindHfaBlockMap(path_, channel, level) : image;
  if (!image || !image->isCompressed || !own || !own->isCompressed) return most;
  uint64_t packed = 0;
  for (const HfaBlock& block : image->blocks) packed += block.bytes;
  const uint64_t blocks = BlocksOf(WidthOf(level, false), HeightOf(level, false));
  return std::min(most, packed / level + blocks * (kPackedBytes + kListEntryBytes) + kListBytes);
}

/// What the tree gets where there is none of the levels yet.
uint64_t HfaLevelStore::TreeBytesOf(const std::vector<unsigned>& levels,
                                    const std::vector<unsigned>& channels) const {
  uint64_t bytes = 0;
  for (const unsigned level : levels) {
    if (!records_.contains(level)) bytes += kRecordBytes + image_.ChannelCount();
    for (const unsigned channel : channels)
      if (pyramid_.Find(channel, level) < 0) bytes += kNodesBytes;
  }
  for (const unsigned channel : channels)
    if (channel > pyramid_.channels.size() || pyramid_.channels[channel - 1].empty())
      bytes += kNameListBytes;
  return bytes;
}

LevelRoom HfaLevelStore::RoomFor(const std::vector<unsigned>& levels,
                                 const std::vector<unsigned>& channels) const {
  const std::lock_guard lock(mutex_);
  return RoomOf(levels, channels);
}

/// A stored level counts like a new one: the old pixels keep their room until the store goes.
LevelRoom HfaLevelStore::RoomOf(const std::vector<unsigned>& levels,
                                const std::vector<unsigned>& channels) const {
  LevelRoom room;
  std::vector<unsigned> made = levels;
  std::erase_if(made, [&](unsigned level) {
    return !datasources::LevelHasPixels(image_.Width(), image_.Height(), level);
  });
  if (made.empty() || channels.empty()) return room;
  room.bytes = TreeBytesOf(made, channels);
  uint64_t most = room.bytes;
  for (const unsigned level : made)
    for (const unsigned channel : channels) {
      room.bytes += ExpectedBytesOf(level, channel);
      most += MostBytesOf(level, channel);
    }
  room.file = path_;
  std::error_code unknown;
  const uint64_t size = std::filesystem::file_size(path_, unknown);
  if (unknown || size + most <= kMostHfaBytes) return room;
  room.obstacle = FormatString(
      _("%s: would grow beyond the 2 GB that the format keeps in one file."), path_.c_str());
  room.advice = _("Use --external: the levels then go to a file beside it.");
  return room;
}

}  // namespace orin::drivers
