// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/storedsize.h"

#include <algorithm>
#include <optional>
#include <set>

#include "host/datasources/pyramidlevels.h"
#include "host/model/levelsize.h"

namespace orin::drivers {
namespace {

constexpr uint64_t kDirectoryBytes = 3072;  // of entries, texts and markers, more than are written
constexpr uint64_t kSampleBytes = 16;       // of what a directory says of each sample
constexpr uint64_t kTileHeadBytes = 1024;   // that a codec may put before a tile's data

/// What a codec makes of samples that do not compress, relative to them.
double WorstGrowth(uint16_t compression) {
  switch (compression) {
    case COMPRESSION_NONE:
      return 1.0;
    case COMPRESSION_LZW:
      return 1.5;
    case COMPRESSION_JPEG:
      return 2.0;
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
  uint64_t bytes = kDirectoryBytes + kSampleBytes * level.format.samplesPerPixel +
                   (isBig ? 16 : 8) * level.format.TileCount();
  for (const NewEntry& entry : level.inherited) bytes += entry.bytes.size();
  return bytes;
}

/// How many times the bytes of its image a level may take in the same codec; none where the image
/// says nothing of its levels: LERC and WebP levels are without loss whatever the image is, means
/// of whole numbers fill floating point samples, runs end where means begin, and long windows find
/// what tiles do not hold.
std::optional<uint64_t> ShareOfImage(const LevelCoding& level) {
  constexpr uint64_t kSpread = 4;  // level pixels into which a method carries one of the image
  switch (level.format.compression) {
    case COMPRESSION_JPEG:
      return 2;
    case COMPRESSION_DEFLATE:
    case COMPRESSION_ADOBE_DEFLATE:
    case COMPRESSION_LZW:
      if (level.format.type.isFloat || level.format.bitsPerSample > 16) return std::nullopt;
      return kSpread;
    default:
      return std::nullopt;
  }
}

}  // namespace

uint64_t MostBytesOf(const LevelCoding& level, uint32_t planes, bool isBig) {
  const PixelFormat& format = level.format;
  const uint64_t tiles = format.TilesPerPlane() * planes;
  const uint64_t samples = PackedTileBytes(format) * tiles;
  const uint64_t directory = DirectoryBytes(level, isBig);
  if (format.compression == COMPRESSION_NONE) return samples + directory;
  uint64_t bytes = static_cast<uint64_t>(double(samples) * WorstGrowth(format.compression));
  const auto share = ShareOfImage(level);
  if (level.imageBytes && share) {
    constexpr uint64_t kPadding = 32;  // part of the samples that rows behind the image's edge take
    bytes = std::min(bytes, *share * *level.imageBytes + samples / kPadding);
  }
  return bytes + tiles * kTileHeadBytes + directory;
}

uint64_t MostBytesOfPyramids(uint32_t imageWidth, uint32_t imageHeight, LevelCoding level) {
  std::set<unsigned> factors;
  for (const unsigned step : {2u, 3u})
    for (const unsigned factor : ComputePyramidLevel(imageWidth, imageHeight, step))
      if (!model::LevelSizeOf(imageWidth, imageHeight, factor).IsEmpty()) factors.insert(factor);
  uint64_t bytes = 0;
  for (const unsigned factor : factors) {
    const auto size = model::LevelSizeOf(imageWidth, imageHeight, factor);
    level.format.width = size.width;
    level.format.height = size.height;
    bytes += MostBytesOf(level, level.Planes(), true);
  }
  return bytes;
}

}  // namespace orin::drivers
