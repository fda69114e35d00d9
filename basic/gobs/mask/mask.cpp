// SPDX-License-Identifier: MIT
#include "basic/gobs/mask/mask.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <new>

#include "host/services/exception.h"

namespace orin::gobs {
namespace {

uint64_t BufferPixels(const Mask& mask) {
  return (uint64_t{mask.height} + 2 * uint64_t{mask.marginY}) * mask.stride;
}

/// A byte may hold the end of one line and the start of the next, which other threads work on.
void ClearBits(uint8_t& byte, unsigned bits) {
  std::atomic_ref(byte).fetch_and(static_cast<uint8_t>(~bits), std::memory_order_relaxed);
}

}  // namespace

Mask::Mask(uint32_t width_, uint32_t height_, const parallelio::ProcessWindow& window)
    : width(width_),
      height(height_),
      marginX(window.marginX),
      marginY(window.marginY),
      x(window.x),
      y(window.y),
      stride(width_ + 2 * window.marginX) {
  const uint64_t bytes = (BufferPixels(*this) + 7) / 8;
  bits_.reset(new (std::nothrow) uint8_t[bytes]);
  if (!bits_) ThrowOutOfMemory();
  begin = bits_.get();
  end = begin + bytes;
  std::fill(begin, end, uint8_t{0xFF});
}

void Mask::SetValid(int64_t pixelX, int64_t pixelY, bool valid) {
  const uint64_t index = LayoutOf(*this).Index(pixelX, pixelY);
  const uint8_t bit = static_cast<uint8_t>(0x80u >> (index % 8));
  uint8_t& byte = begin[index / 8];
  byte = valid ? static_cast<uint8_t>(byte | bit) : static_cast<uint8_t>(byte & ~bit);
}

void Mask::ClearRun(int64_t pixelX, int64_t pixelY, uint64_t count) {
  if (count == 0) return;
  const uint64_t first = LayoutOf(*this).Index(pixelX, pixelY);
  const uint64_t last = first + count - 1;
  uint8_t* const firstByte = begin + first / 8;
  uint8_t* const lastByte = begin + last / 8;
  const auto behind = static_cast<uint8_t>(0xFFu >> (first % 8));
  const auto before = static_cast<uint8_t>(0xFFu << (7 - last % 8));
  if (firstByte == lastByte) return ClearBits(*firstByte, behind & before);
  ClearBits(*firstByte, behind);
  std::fill(firstByte + 1, lastByte, uint8_t{0});
  ClearBits(*lastByte, before);
}

std::optional<bool> Mask::Uniform() const {
  const uint64_t pixels = BufferPixels(*this);
  const uint8_t whole = pixels == 0 || (begin[0] & 0x80u) != 0 ? 0xFF : 0;
  const uint64_t bytes = pixels / 8;
  if (bytes > 0 && (begin[0] != whole || std::memcmp(begin, begin + 1, bytes - 1) != 0))
    return std::nullopt;
  for (uint64_t n = pixels / 8 * 8; n < pixels; ++n)
    if (((begin[n / 8] << n % 8) & 0x80) != (whole & 0x80)) return std::nullopt;
  return whole != 0;
}

void Mask::Intersect(const Mask& other) {
  std::transform(begin, end, other.begin, begin,
                 [](uint8_t a, uint8_t b) { return static_cast<uint8_t>(a & b); });
}

void Mask::RetrieveRaster(Raster* out) const {
  if (out->dataType == eDT_BIT) {
    const auto bytes = std::min<uint64_t>(static_cast<uint64_t>(end - begin), out->byteSize);
    std::copy_n(begin, bytes, out->data);
  } else if (out->dataType == eDT_8U) {
    RetrieveBytes(out);
  } else {
    throw DataException(N_("We can only rasterize into a eDT_BIT or eDT_8U Raster"),
                        "basic/gobs/mask/mask",
                        "void orin::gobs::Mask::RetrieveRaster(orin::gobs::Raster*) const", 233);
  }
}

void Mask::RetrieveBytes(Raster* out) const {
  const uint64_t wanted =
      (out->height + 2 * uint64_t{out->marginY}) * (out->width + 2 * uint64_t{out->marginX});
  const uint64_t pixels =
      std::min({wanted, uint64_t{out->byteSize}, static_cast<uint64_t>(end - begin) * 8});
  const uint64_t groups = pixels / 8;
  for (uint64_t group = 0; group < groups; ++group)
    std::memcpy(out->data + group * 8, &kBitTable[begin[group] * uint64_t{8}], 8);
  for (uint64_t pixel = groups * 8; pixel < pixels; ++pixel)
    out->data[pixel] = kBitTable[begin[groups] * uint64_t{8} + pixel % 8];
}

std::unique_ptr<Raster> ByteRasterOf(const Mask& mask) {
  const RasterInfo info(mask.width, mask.height, 1, eDT_8U);
  auto bytes = std::make_unique<Raster>(
      info, parallelio::ProcessWindow{mask.marginX, mask.marginY, mask.x, mask.y});
  mask.RetrieveRaster(bytes.get());
  return bytes;
}

}  // namespace orin::gobs
