/// What an ERDAS Imagine file uses of its bytes, and how its levels come to end earlier.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "host/drivers/common/byteranges.h"
#include "host/drivers/gdal/hfanode.h"

namespace orin::drivers {

/// Bytes of a level, or of an item of the file's metadata, that can stand elsewhere: a block, a
/// node, or its data.
struct HfaMovable {
  uint32_t position = 0;
  uint32_t bytes = 0;
};

struct HfaSpace {
  uint64_t size = 0;  ///< of the file, bytes
  uint64_t end = 0;   ///< behind the last byte that is used
  /// Bytes that nothing refers to: those behind all that is no level, and those given. Where
  /// something in the file may refer to more than we know of, there are none.
  ByteRanges free;
  std::vector<HfaMovable> movables;  ///< ascending, apart from one another
  /// Every number in the file that may lead to a movable, or into one; ascending.
  std::vector<HfaPointer> pointers;
};

/// \param given  bytes that belonged to levels
/// \throws orin::Exception  the file's tree cannot be read
HfaSpace FindHfaSpace(const std::string& path, const ByteRanges& given);

/// Moves what can be moved to free bytes before it. What it leaves stays as it is, so that whoever
/// meets a pointer that still leads there reads the same.
/// \returns how many bytes moved
/// \throws orin::Exception  it cannot be written; all that is reached is where it was, or where it
///                          goes
uint64_t MoveHfaLevelsDown(const std::string& path, HfaSpace space);

/// The bytes of a node, and of all that it leads to.
/// \throws orin::Exception  the file's tree cannot be read
ByteRanges HfaBytesOf(const std::string& path, const HfaNode& node);

}  // namespace orin::drivers
