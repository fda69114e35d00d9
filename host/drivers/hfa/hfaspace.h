/// Which bytes of an ERDAS Imagine file are used, which are free, and what can be moved.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "host/drivers/common/byteranges.h"
#include "host/drivers/hfa/hfanode.h"

namespace orin::drivers {

/// Bytes that can stand elsewhere: a node of the tree; data of a level or of an item of the file's
/// metadata; a block of a level.
struct HfaMovable {
  uint32_t position = 0;
  uint32_t bytes = 0;
};

struct HfaSpace {
  uint64_t size = 0;  ///< of the file, bytes
  uint64_t end = 0;   ///< behind the last byte that is used
  /// Bytes that nothing refers to: those behind the image and its data, those given, and nodes that
  /// a changed tree has replaced. Where something in the file may refer to more than we know of,
  /// there are none.
  ByteRanges free;
  std::vector<HfaMovable> movables;  ///< ascending, apart from one another
  /// Every number in the file that may lead to a movable, or into one; ascending.
  std::vector<HfaPointer> pointers;
};

/// \param given  bytes that were used before a change
/// \throws orin::Exception  the file's tree cannot be read
HfaSpace FindHfaSpace(const std::string& path, const ByteRanges& given);

/// All bytes that the tree leads to, as far as we know.
/// \throws orin::Exception  the file's tree cannot be read
ByteRanges UsedHfaBytes(const std::string& path);

}  // namespace orin::drivers
