/// Fetches the tiles and strips of one TIFF directory as samples in the machine's byte order.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "host/drivers/tiff/pixelformat.h"
#include "host/drivers/tiff/tiffhandle.h"

namespace orin::drivers {

/// Has a handle of its own; not for two threads at once. Delivered rows are
/// `Format().TileRowBytes()` bytes long, a tile's rows beyond the image's lower edge are zero.
class TileDecoder {
 public:
  /// \param directoryOffset  in bytes; 0 is the first directory
  /// \throws orin::Exception  the directory cannot be read, or its layout is not supported
  TileDecoder(const std::string& path, uint64_t directoryOffset);

  const PixelFormat& Format() const { return format_; }
  const std::string& Path() const { return tiff_.Path(); }
  const TiffHandle& Handle() const { return tiff_; }

  /// True when the file does not hold the tile: all its samples are `SparseSample()`.
  /// \throws orin::Exception  the file's table of tiles does not go as far
  bool IsSparse(uint32_t tile) const;
  /// One delivered sample: the declared no-data value where the type holds it, else 0.
  const std::vector<uint8_t>& SparseSample() const { return sparseSample_; }

  /// True when stored rows are delivered rows, so that any of them can be read by itself.
  bool IsRaw() const { return raw_; }
  /// Bytes [from, from + count) of a raw tile's rows, counted from the tile's first byte.
  /// \throws orin::Exception  the file does not hold them
  void ReadRaw(uint32_t tile, uint64_t from, uint64_t count, uint8_t* bytes) const;

  /// Rows that the tile holds inside the image.
  uint32_t RowsOf(uint32_t tile) const;

  /// Checks, before memory is taken for them, that `rows` rows of a tile can be decoded.
  /// \throws orin::Exception  the file ends inside the tile, or the rows are too large
  void RequireDecodable(uint32_t tile, uint32_t rows) const;
  /// A whole tile, `tileHeight` rows.
  /// \throws orin::Exception  it cannot be decoded
  void Decode(uint32_t tile, uint8_t* samples);
  /// Rows of a strip, decoded from the last row that was asked for or else from the strip's start.
  /// \throws orin::Exception  they cannot be decoded
  void DecodeRows(uint32_t strip, uint32_t firstRow, uint32_t count, uint8_t* samples);

 private:
  void DecodeStored(uint32_t tile, uint32_t rows, uint8_t* samples);
  const uint8_t* DecodeRow(uint8_t* samples);
  uint8_t* StoredRows(uint64_t bytes, uint8_t* samples);
  void Deliver(const uint8_t* stored, uint64_t rows, uint8_t* samples) const;
  [[noreturn]] void Fail(uint32_t tile, const std::string& reason) const;

  TiffHandle tiff_;
  PixelFormat format_;
  uint64_t storedRowBytes_;  ///< as libtiff hands a row out
  bool raw_;
  std::vector<uint8_t> sparseSample_;
  uint64_t tableLength_;               ///< tiles of which the directory tells the position
  std::unique_ptr<uint8_t[]> stored_;  ///< libtiff's rows, where they are not delivered rows
  uint64_t storedCapacity_ = 0;
  uint32_t openStrip_ = UINT32_MAX;  ///< the strip that is decoded row by row
  uint32_t nextRow_ = 0;             ///< its row that follows
};

}  // namespace orin::drivers
