/// Reads windows of chosen channels from one directory of a TIFF file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/raster.h"
#include "host/datasources/rasterreader.h"
#include "host/datasources/samplecopy.h"
#include "host/drivers/tiff/pixelformat.h"
#include "host/drivers/tiff/tilecache.h"
#include "host/drivers/tiff/tiledecoder.h"

namespace orin::drivers {

/// Has handles of its own; not for two threads at once. A directory that is written meanwhile must
/// have been complete on disk when the reader was made.
class PixelReader {
 public:
  /// \param directoryOffset  in bytes; 0 is the first directory, any level's directory will do
  /// \param channels         1-based, in the order of the blocks' channels
  /// \throws orin::Exception  the directory cannot be read, or it has no such channel
  PixelReader(const std::string& path, uint64_t directoryOffset, std::vector<unsigned> channels);

  const PixelFormat& Format() const { return decoder_.Format(); }

  /// Fills the whole buffer of `block`: the pixels at its place, margins that lie in the image
  /// included; beyond the image the edge pixels are repeated. The bit type takes one byte a sample,
  /// 0 or 1.
  /// \pre the block has the reader's channel count, the format's type, and lies in the image
  /// \throws orin::Exception  the pixels cannot be read; the text names the file and the tile
  void Read(gobs::Raster& block);

  /// One tile or strip with all samples that it interleaves, whatever the channels.
  /// \param samples  receives tileHeight x TileRowBytes() bytes; rows below the image are 0
  /// \throws orin::Exception  it cannot be read
  void ReadTile(uint32_t tile, uint8_t* samples) { decoder_.Decode(tile, samples); }

 private:
  /// Channels that one tile delivers.
  struct Plane {
    uint32_t number;
    std::vector<uint32_t> samples;   ///< within the tile's pixel
    std::vector<uint32_t> channels;  ///< of the block, one for each of `samples`
    bool wholePixels;                ///< the block's pixels are the tile's pixels
  };
  /// A tile, or the rows of a long strip that are decoded together; clipped to the image.
  struct Unit {
    uint32_t tile;
    uint32_t firstRow;  ///< within the tile
    uint32_t rows;
    int64_t x, y;  ///< of its first pixel, in the image
    int64_t width;
  };
  /// Pixels to move, in the image.
  struct Piece {
    int64_t x, y, width, height;
  };
  /// Rows in memory, of which the first holds the pixels from a piece's first on.
  struct Rows {
    const uint8_t* first;
    uint64_t bytes;  ///< from row to row
  };

  Unit UnitAt(int64_t x, int64_t y) const;
  TileDecoder& DecoderOf(size_t plane);
  void LimitCache(const datasources::InsideWindow& window);
  void ReadUnit(const Unit& unit, const Piece& piece, gobs::Raster& block);
  void CopyRaw(const Unit& unit, const Plane& plane, const Piece& piece, gobs::Raster& block);
  void FillSparse(const Plane& plane, const Piece& piece, gobs::Raster& block) const;
  void CopyRows(const Rows& rows, const Plane& plane, const Piece& piece,
                gobs::Raster& block) const;
  Rows Decoded(const Unit& unit, size_t plane, bool keep);

  TileDecoder decoder_;
  std::vector<Plane> planes_;
  uint32_t bandRows_;  ///< rows decoded together; the tile's height but for long compressed strips
  std::vector<std::unique_ptr<TileDecoder>>
      planeDecoders_;  ///< where each plane keeps its position
  datasources::CopySamples copy_;
  TileCache cache_;
  TileCache::Buffer scratch_;
};

}  // namespace orin::drivers
