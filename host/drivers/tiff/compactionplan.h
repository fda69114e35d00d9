/// Decides which levels move where so that free space between them comes to the end of the file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "host/drivers/common/byteranges.h"
#include "host/drivers/tiff/freespacemap.h"

namespace orin::drivers {

/// What moves as one: a directory of this program with its values and tiles.
struct Movable {
  size_t index = 0;    ///< in the chain
  uint64_t bytes = 0;  ///< that it takes in one piece, from an even position on
  ByteRanges extents;  ///< that it takes now
};

struct Move {
  std::vector<size_t> indices;  ///< in the chain, ascending
  std::optional<ByteRange>
      gap;  ///< free space that holds them all; none: they go to the file's end
};

/// So often all levels may go to the file's end before a compaction is given up. None was seen to
/// need more than a little over two.
inline constexpr uint64_t kMaxRounds = 3;

/// Bytes of free space before `end` that can be taken.
uint64_t FreeBytesBefore(const ByteRanges& free, uint64_t end);

/// The next one of the moves that close the gaps. What fits into a gap before it moves there, the
/// largest first. Where nothing fits, what stands behind the largest gap goes to the file's end, by
/// which the gap grows. None when neither can be done.
/// \param map  whose segments are joined
std::optional<Move> NextMove(const FreeSpaceMap& map, const std::vector<Movable>& items);

}  // namespace orin::drivers
