/// Knows which bytes of a file were written by this program, and which of them nothing refers to.
// SPDX-License-Identifier: MIT
//
// What is appended without a break is a stretch. A stretch begins with a marker that says where it
// ends, and every directory in it is preceded by a pointer back to the marker. So the space of
// this program is found again from its levels; behind the last byte that anything refers to also
// without them, after a build that was killed. Bytes of other programs are in no stretch.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "host/drivers/common/byteranges.h"
#include "host/drivers/tiff/references.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

struct Stretch {
  uint64_t start = 0;   ///< where the file ended; what lies between here and the marker is padding
  uint64_t marker = 0;  ///< position of the marker: the next one that does not cut a disk sector
  uint64_t end = 0;     ///< 0: not known yet, bytes are being appended
  uint64_t previous = 0;  ///< marker of the stretch before, 0: there is none

  uint64_t Body() const;
};

inline constexpr uint64_t kMarkerBytes = 64;
inline constexpr uint64_t kPointerBytes = 16;  ///< in front of a directory

inline uint64_t Stretch::Body() const { return marker + kMarkerBytes; }

/// A stretch that begins at a file's end.
Stretch StretchAt(uint64_t fileEnd, uint64_t previous);
std::vector<uint8_t> ComposeMarker(const Stretch& stretch);
/// The stretch whose marker stands at `position`; none when no whole marker stands there.
std::optional<Stretch> ReadMarker(const PositionedFile& file, uint64_t position);
/// What goes in front of a directory.
/// \param marker  of the stretch that the directory lies in; 0: in none
std::vector<uint8_t> ComposePointer(uint64_t marker, uint64_t directory);

struct OwnSpace {
  std::vector<Stretch> stretches;  ///< ascending; none is open
  ByteRanges used;                 ///< what the file refers to, pointers included
  ByteRanges free;                 ///< what it does not, within the stretches
  std::vector<Stretch> unclosed;   ///< of `stretches`: those whose marker does not yet tell the end
  std::vector<uint64_t> directories;  ///< offsets of the chain's directories in the stretches

  /// How short the file can become without losing more than space of this program and `given`.
  uint64_t ShortestEnd(uint64_t fileSize, const ByteRanges& given) const;
};

/// Markers that are to be written so that two stretches become one. A stretch that holds no
/// directory, and begins where another one ends, becomes part of that one.
struct Joining {
  std::vector<Stretch> relinked;  ///< first: they follow another stretch now
  std::vector<Stretch> grown;     ///< once the former are durable

  bool IsEmpty() const { return grown.empty(); }
};
Joining JoinStretches(const OwnSpace& space);

/// Without any stretch where not all that is in use is known.
/// \throws orin::Exception  the file cannot be read
OwnSpace FindOwnSpace(const PositionedFile& file, const TiffStructure& structure);

}  // namespace orin::drivers
