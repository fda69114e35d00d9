/// Makes an ERDAS Imagine file give back the space that replaced and removed levels had.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

#include "host/drivers/common/byteranges.h"
#include "host/drivers/common/positionedfile.h"
#include "host/drivers/hfa/hfaspace.h"

namespace orin::drivers {

/// Moves levels and nodes into free bytes before them, and cuts off the file's end.
///
///     before   | image | old level | new level | nodes |
///     pass 1   | image | new level | new level | nodes |   copied, synced
///              | image | new level |  (free)   | nodes |   then pointed to, synced
///     pass 2   | image | new level | nodes | (free)    |   the same for what follows
///     cut      | image | new level | nodes |
///
/// Safe by its order: a copy is durable before anything leads to it, and what it was copied from
/// stays as it is until the next pass. So any mixture of old and new pointers reads the same, where
/// a pass was stopped as well as for programs that open the file meanwhile. A pass overwrites what
/// the one before left, and begins only while no other program has the file open.
class HfaCompactor {
 public:
  /// \param file  open for writing; outlives the compactor
  explicit HfaCompactor(PositionedFile& file) : file_(file) {}

  /// \param freed  bytes that were used before levels were changed or removed
  /// \returns whether there is something to do
  bool IsWorthIt(const ByteRanges& freed) const;
  /// \throws orin::Exception  the file cannot be read or written; no level is harmed
  void Compact(const ByteRanges& freed) const;

 private:
  void Cut(const ByteRanges& freed) const;

  PositionedFile& file_;
};

/// One pass: moves what can be moved to free bytes before it. What it leaves stays as it is.
/// \returns how many bytes moved
/// \throws orin::Exception  it cannot be written; all that is reached is where it was, or where it
///                          goes
uint64_t MoveHfaLevelsDown(const std::string& path, HfaSpace space);

}  // namespace orin::drivers
