/// Encodes the tiles of a level with libtiff's codecs, in memory, and decodes them again.
// SPDX-License-Identifier: MIT
#pragma once

#include <bit>
#include <cstdint>
#include <string>
#include <vector>

#include "host/drivers/tiff/levelcoding.h"

namespace orin::drivers {

/// Encoders share nothing: several may run on several threads, each on one.
class TileEncoder {
 public:
  /// \param file  named in error texts
  TileEncoder(const LevelCoding& coding, std::string file);

  /// The stored bytes of one tile.
  /// \param samples  coding.TileBytes() bytes: rows without gaps, the machine's byte order,
  ///                 samples as a reader delivers them
  /// \param plane    0-based; 0 for a level in one plane
  /// \throws orin::Exception  the codec fails; the text names the file and the reason
  std::vector<uint8_t> Encode(const std::vector<uint8_t>& samples, uint32_t plane) const;

  /// The samples of a tile that was encoded so, as `Encode` takes them.
  /// \throws orin::Exception  the codec does not know its own bytes again
  std::vector<uint8_t> Decode(const std::vector<uint8_t>& stored, uint32_t plane) const;

  /// True when a tile of this coding can be written here, found out with one.
  static bool CanEncode(const LevelCoding& coding);

 private:
  std::vector<uint8_t> Pack(const std::vector<uint8_t>& samples) const;
  std::vector<uint8_t> Unpack(const std::vector<uint8_t>& packed) const;
  std::endian CodecOrder() const;

  LevelCoding coding_;
  std::string file_;
};

}  // namespace orin::drivers
