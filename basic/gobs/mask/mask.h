/// One validity bit for every pixel of a block's buffer.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>

#include "basic/gobs/bufferlayout.h"
#include "basic/gobs/raster.h"

namespace orin::gobs {

/// Entry [b * 8 + k] is bit k of the byte b, counted from the most significant bit.
inline constexpr std::array<uint8_t, 256 * 8> kBitTable = [] {
  std::array<uint8_t, 256 * 8> table{};
  for (size_t b = 0; b < 256; ++b)
    for (size_t k = 0; k < 8; ++k) table[b * 8 + k] = (b >> (7 - k)) & 1u;
  return table;
}();

/// The mask's bit of the pixel (x, y) of the useful area; the margin is in reach.
struct MaskBits {
  static constexpr bool kAlways = false;
  const uint8_t* bits;
  BufferLayout layout;

  bool operator()(int64_t x, int64_t y) const {
    const uint64_t index = layout.Index(x, y);
    return kBitTable[bits[index / 8] * uint64_t{8} + index % 8] != 0;
  }
};

/// Validity of every buffer pixel of a block: 1 valid, 0 no data; most significant bit first. Lines
/// are not padded: pixel n of the buffer is bit n of the mask.
class Mask : public ThrowsOutOfMemory {
 public:
  /// A mask for blocks of this geometry, every bit set.
  /// \throws orin::OutOfMemory
  Mask(uint32_t width, uint32_t height, const parallelio::ProcessWindow& window);
  Mask(const Mask&) = delete;
  Mask& operator=(const Mask&) = delete;

  /// Copies the mask into a raster of the same geometry: bytes verbatim into the bit type, one byte
  /// of 1 (valid) or 0 (no data) per buffer pixel into `eDT_8U`.
  /// \throws orin::DataException  `out` has another type
  void RetrieveRaster(Raster* out) const;

  bool IsValid(int64_t pixelX, int64_t pixelY) const {
    return MaskBits{begin, LayoutOf(*this)}(pixelX, pixelY);
  }
  void SetValid(int64_t pixelX, int64_t pixelY, bool valid);
  /// Makes `count` pixels of a line no data, from (x, y) on; the margin is in reach. Several
  /// threads may do so at once for pixels of their own.
  void ClearRun(int64_t pixelX, int64_t pixelY, uint64_t count);
  /// Whether all of the buffer's pixels are valid, or none is; empty for a mixture.
  std::optional<bool> Uniform() const;
  /// Leaves valid what is valid in `other`, too, which has the same geometry.
  void Intersect(const Mask& other);

  uint32_t width;
  uint32_t height;
  uint32_t marginX;
  uint32_t marginY;
  uint32_t x;
  uint32_t y;
  uint32_t stride;  ///< pixels per buffer line: width + 2 marginX
  uint8_t* begin;
  uint8_t* end;

 private:
  void RetrieveBytes(Raster* out) const;

  std::unique_ptr<uint8_t[]> bits_;
};

/// A new one-channel `eDT_8U` raster of the mask's geometry, 1 valid and 0 no data.
std::unique_ptr<Raster> ByteRasterOf(const Mask& mask);

}  // namespace orin::gobs
