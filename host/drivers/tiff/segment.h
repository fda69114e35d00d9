/// The parts of a file that this program appended: how each of them says where it begins and ends.
// SPDX-License-Identifier: MIT
//
// What is appended without a break is a segment. It begins with a marker of 64 bytes, which stands
// at a multiple of 64, so that no write of it is cut by a disk sector:
//
//   0       16      24       32    40         48         56      64
//   | magic | start | marker | end | reserved | checksum | zeros |   little-endian in every file
//
// `start` is where the file ended, `marker` the marker's own position, by which a copy of its bytes
// elsewhere gives itself away. `end` is 0 while bytes are being appended. `reserved` is 0; versions
// before 0.1 kept another position there.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "host/drivers/common/positionedfile.h"

namespace orin::drivers {

struct Segment {
  uint64_t start = 0;   ///< what lies between here and the marker is padding
  uint64_t marker = 0;  ///< position of the marker
  uint64_t end = 0;     ///< 0: not known yet, bytes are being appended

  uint64_t Body() const;
};

inline constexpr uint64_t kMarkerBytes = 64;

inline uint64_t Segment::Body() const { return marker + kMarkerBytes; }

/// Where the marker of a segment stands that begins at `start`.
inline uint64_t MarkerBehind(uint64_t start) {
  return (start + kMarkerBytes - 1) / kMarkerBytes * kMarkerBytes;
}
/// A segment that begins at a file's end.
inline Segment SegmentAt(uint64_t fileEnd) { return {fileEnd, MarkerBehind(fileEnd), 0}; }

std::vector<uint8_t> ComposeMarker(const Segment& segment);
/// The segment whose marker stands at `position`; none when no whole marker stands there.
std::optional<Segment> ReadMarker(const PositionedFile& file, uint64_t position);

/// The first marker in a range, of whose bytes nothing else is known. \param budget  bytes that may
/// be read for it, and less those that were
std::optional<Segment> FindMarker(const PositionedFile& file, uint64_t start, uint64_t end,
                                  uint64_t& budget);

}  // namespace orin::drivers
