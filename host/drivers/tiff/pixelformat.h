/// How one TIFF directory stores its pixels, and how they are delivered.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

#include "basic/gobs/datatype.h"
#include "host/drivers/tiff/tiffhandle.h"

namespace orin::drivers {

/// "Tile" stands for a tile or a strip; libtiff numbers them row by row, plane after plane.
struct PixelFormat {
  uint32_t width = 0;   ///< pixels
  uint32_t height = 0;  ///< pixels
  uint32_t samplesPerPixel = 0;
  gobs::DataType type;  ///< as delivered: odd widths widened to 8, 16 or 32 bits, JPEG YCbCr as RGB
  uint32_t bitsPerSample = 0;  ///< as stored; both components of a complex sample together
  uint32_t tileWidth = 0;      ///< pixels; strips: the image's width
  uint32_t tileHeight = 0;     ///< pixels; strips: rows per strip, at most the image's height
  bool tiled = false;
  bool planar = false;   ///< every channel in tiles of its own
  bool swapped = false;  ///< the file's byte order is not the machine's
  uint16_t compression = 0;
  uint16_t photometric = 0;
  uint16_t fillOrder = 1;
  uint16_t sampleFormat = 1;
  std::string
      noData;  ///< text of the no-data tag, blanks at its ends removed; empty when there is none
  bool noDataIsBeside = false;  ///< it is none of the tag: the file beside the image declares it

  /// Bytes of a delivered sample, both components of a complex one; the bit type takes one.
  uint32_t SampleBytes() const { return BytesPerComponent(type) * ComponentsPerSample(type); }
  /// Samples that a tile interleaves.
  uint32_t TileSamples() const { return planar ? 1 : samplesPerPixel; }
  uint64_t TilesAcross() const { return (uint64_t{width} + tileWidth - 1) / tileWidth; }
  uint64_t TilesDown() const { return (uint64_t{height} + tileHeight - 1) / tileHeight; }
  uint64_t TilesPerPlane() const { return TilesAcross() * TilesDown(); }
  uint64_t TileCount() const { return TilesPerPlane() * (planar ? samplesPerPixel : 1); }
  /// Bytes of a delivered row of a tile.
  uint64_t TileRowBytes() const { return uint64_t{tileWidth} * TileSamples() * SampleBytes(); }
  /// Samples are stored as they are delivered, but for compression and byte order.
  bool WholeBytes() const { return bitsPerSample == SampleBytes() * 8; }
};

/// The format of the directory at which `tiff` stands; libtiff is set up to deliver RGB where it
/// can.
/// \throws orin::Exception  a layout that is not supported; the text names the file and the layout
PixelFormat FormatOf(const TiffHandle& tiff);

}  // namespace orin::drivers
