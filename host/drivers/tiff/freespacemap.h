/// Knows which bytes of a file were written by this program, and which of them nothing refers to.
// SPDX-License-Identifier: MIT
//
// Nothing lists what is free. Segments are found by their markers, which stand in bytes that
// nothing refers to; of their bytes those are free that nothing in the file refers to either. So
// whatever a build that was killed left behind is found again, and bytes of other programs are in
// no segment:
//
//   | image | x | M tiles, directory | tiles, directory of another program | M tiles ...
//             |  \_____ segment ____/                                        \___ segment
//             some bytes of another program, searched for markers like every gap
#pragma once

#include <cstdint>
#include <vector>

#include "host/drivers/common/byteranges.h"
#include "host/drivers/tiff/segment.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

struct FreeSpaceMap {
  std::vector<Segment> segments;  ///< ascending; none is open, none shares bytes with another
  ByteRanges used;                ///< what the file refers to
  ByteRanges free;                ///< what it does not, within the segments
  std::vector<Segment> unclosed;  ///< of `segments`: those whose marker does not tell the true end

  /// Whether the byte lies in a segment, behind its marker.
  bool IsOwn(uint64_t position) const;
  /// How short the file can become without losing more than space of this program and `given`.
  uint64_t ShortestEnd(uint64_t fileSize, const ByteRanges& given) const;
  /// Segments as their markers are to say when those that touch each other become one: the ones
  /// that grow. A marker inside a longer segment means nothing, and is free.
  std::vector<Segment> Joined() const;
};

/// Without any segment where not all that is in use is known.
/// \throws orin::Exception  the file cannot be read
FreeSpaceMap FindFreeSpace(const PositionedFile& file, const TiffStructure& structure);

}  // namespace orin::drivers
