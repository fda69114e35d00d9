// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/storedsize.h"

#include <algorithm>
#include <set>

#include "host/datasources/pyramidlevels.h"

namespace orin::drivers {
namespace {

constexpr uint64_t kDirectoryBytes = 2048;  // of entries and texts, more than are ever written
constexpr uint64_t kTileHeadBytes = 1024;   // that a codec may put before a tile's data

/// What a codec makes of samples that do not compress, relative to them.
double WorstGrowth(uint16_t compression) {
  switch (compression) {
    case COMPRESSION_NONE:
      return 1.0;
    case COMPRESSION_LZW:
    case COMPRESSION_JPEG:
      return 1.5;
    default:
      return 1.02;
  }
}

/// Stored bytes of a tile without compression.
uint64_t PackedTileBytes(const PixelFormat& format) {
  const uint64_t rowBits = uint64_t{format.tileWidth} * format.TileSamples() * format.bitsPerSample;
  return (rowBits + 7) / 8 * format.tileHeight;
}

uint64_t DirectoryBytes(const LevelCoding& level, bool isBig) {
  uint64_t bytes = kDirectoryBytes + (isBig ? 16 : 8) * level.format.TileCount();
  for (const NewEntry& entry : level.inherited) bytes += entry.bytes.size();
  return bytes;
}

}  // namespace

StoredSize& StoredSize::operator+=(const StoredSize& other) {
  expected += other.expected;
  most += other.most;
  return *this;
}

StoredSize StoredSizeOf(const LevelCoding& level, uint32_t planes, bool isBig) {
  const PixelFormat& format = level.format;
  const uint64_t tiles = format.TilesPerPlane() * planes;
  const uint64_t samples = PackedTileBytes(format) * tiles;
  const bool isPlain = format.compression == COMPRESSION_NONE;
  const uint64_t directory = DirectoryBytes(level, isBig);
  StoredSize size;
  size.most = isPlain ? samples
                      : static_cast<uint64_t>(double(samples) * WorstGrowth(format.compression)) +
                            tiles * kTileHeadBytes;
  if (level.imageBytes && !isPlain) size.most = std::min(size.most, *level.imageBytes);
  const bool isExact = isPlain && !level.mayBeSparse;
  size.expected = isExact ? samples : static_cast<uint64_t>(double(samples) * level.storedPart);
  size.expected = std::min(size.expected, size.most) + directory;
  size.most += directory;
  return size;
}

uint64_t MostBytesOfPyramids(uint32_t imageWidth, uint32_t imageHeight, LevelCoding level) {
  std::set<unsigned> factors;
  for (const unsigned step : {2u, 3u})
    for (const unsigned factor : ComputePyramidLevel(imageWidth, imageHeight, step))
      if (imageWidth / factor > 0 && imageHeight / factor > 0) factors.insert(factor);
  uint64_t bytes = 0;
  for (const unsigned factor : factors) {
    level.format.width = imageWidth / factor;
    level.format.height = imageHeight / factor;
    bytes += StoredSizeOf(level, level.Planes(), true).most;
  }
  return bytes;
}

}  // namespace orin::drivers
