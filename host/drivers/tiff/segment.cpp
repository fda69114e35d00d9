// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/segment.h"

#include <algorithm>
#include <array>

#include "host/drivers/tiff/structure.h"

namespace orin::drivers {
namespace {

constexpr std::array<uint8_t, 16> kMagic = {'O', 'r', 'i', 'n', ' ', 'l',  'e',  'v',
                                            'e', 'l', 's', 0,   1,   '\r', '\n', 26};
constexpr ByteOrder kOrder{std::endian::little};
constexpr size_t kChecksumAt = 48;

/// FNV-1a.
uint64_t ChecksumOf(const uint8_t* bytes, size_t count) {
  uint64_t sum = 14695981039346656037u;
  for (size_t i = 0; i < count; ++i) sum = (sum ^ bytes[i]) * 1099511628211u;
  return sum;
}

std::optional<Segment> ParseMarker(const uint8_t* bytes, uint64_t position) {
  if (!std::equal(kMagic.begin(), kMagic.end(), bytes)) return std::nullopt;
  const auto number = [&](size_t at) { return kOrder.Number(bytes + at, 8); };
  if (number(kChecksumAt) != ChecksumOf(bytes, kChecksumAt)) return std::nullopt;
  const Segment segment{number(16), number(24), number(32)};
  const bool isPlausible = segment.marker == position && segment.start <= position &&
                           position - segment.start < kMarkerBytes &&
                           (segment.end == 0 || segment.end >= segment.Body());
  return isPlausible ? std::optional(segment) : std::nullopt;
}

}  // namespace

std::vector<uint8_t> ComposeMarker(const Segment& segment) {
  std::vector<uint8_t> bytes(kMarkerBytes);
  uint8_t* at = std::copy(kMagic.begin(), kMagic.end(), bytes.data());
  for (const uint64_t number : {segment.start, segment.marker, segment.end, uint64_t{0}}) {
    kOrder.Put(number, 8, at);
    at += 8;
  }
  kOrder.Put(ChecksumOf(bytes.data(), kChecksumAt), 8, at);
  return bytes;
}

std::optional<Segment> ReadMarker(const PositionedFile& file, uint64_t position) {
  const uint64_t size = file.Size();
  if (position % kMarkerBytes != 0 || position > size || size - position < kMarkerBytes)
    return std::nullopt;
  std::array<uint8_t, kMarkerBytes> bytes;
  file.Read(position, bytes.data(), bytes.size());
  return ParseMarker(bytes.data(), position);
}

std::optional<Segment> FindMarker(const PositionedFile& file, uint64_t start, uint64_t end,
                                  uint64_t& budget) {
  constexpr uint64_t kAtOnce = 1 << 16;
  std::vector<uint8_t> bytes;
  for (uint64_t at = MarkerBehind(start); at < end && end - at >= kMarkerBytes;) {
    const uint64_t count = std::min(kAtOnce, (end - at) / kMarkerBytes * kMarkerBytes);
    if (count > budget) return std::nullopt;
    budget -= count;
    bytes.resize(count);
    file.Read(at, bytes.data(), bytes.size());
    for (uint64_t i = 0; i < count; i += kMarkerBytes)
      if (const auto segment = ParseMarker(&bytes[i], at + i)) return segment;
    at += count;
  }
  return std::nullopt;
}

}  // namespace orin::drivers
