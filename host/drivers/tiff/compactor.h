/// Closes the gaps that replaced and removed levels left in a file: levels behind them are
/// relocated, and the file is shortened.
// SPDX-License-Identifier: MIT
//
// A level that fits into a gap is relocated there; one that does not goes to the file's end first,
// which makes the gap larger:
//
//   before      | image | M  gap  | A A A A | gap | B |
//   A to end    | image | M  gap  (A A A A)   gap | B | M A A A A |    A as before until it is
//   linked B, A down   | image | M  B  A A A A  gap                      | cut off     | image | M
//   B  A A A A |
//
// The order that makes it safe, whenever the program or the machine stops: a copy goes into free
// bytes or behind the end; it is synced; then one write a link leads to it; that is synced before
// the old place counts as free. The markers (M, see segment.h) tell at each moment to whom bytes
// belong, so that the next run finds what this one leaves behind.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "host/drivers/common/positionedfile.h"
#include "host/drivers/tiff/appender.h"
#include "host/drivers/tiff/compactionplan.h"
#include "host/drivers/tiff/freespacemap.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

class Compactor {
 public:
  /// \param file          open for update and locked; outlives the object
  /// \param firstMovable  index in the chain from which on levels stand: nothing else is relocated
  Compactor(PositionedFile& file, size_t firstMovable) : file_(file), firstMovable_(firstMovable) {}

  /// Whether free bytes are worth a compaction, or a part of it.
  /// \throws orin::Exception  the file cannot be read
  bool IsWorthwhile();
  /// Does what can be done while nobody else has the file open. What cannot be relocated, for want
  /// of space on the disk, stays.
  /// \throws orin::Exception  the file cannot be shortened
  void Compact();
  /// Shortens the file, whoever has it open, by what is free at its end and by `given`, to which
  /// nothing refers any more.
  /// \throws orin::Exception  it cannot be shortened
  void CutOff(const ByteRanges& given);

 private:
  struct Copy;

  void Parse();
  uint64_t ShortestEnd() const { return map_.ShortestEnd(file_.Size(), {}); }
  bool IsAlone();
  bool HasGaps() const;
  bool TakeStep(uint64_t& evacuated);
  void WriteMarkers(const std::vector<Segment>& segments);
  std::vector<Movable> Movables() const;
  Copy CopyTiles(Appender& appender, size_t index);
  void Relocate(const Move& move);
  void Shorten(uint64_t end);

  PositionedFile& file_;
  size_t firstMovable_;
  TiffStructure structure_;
  FreeSpaceMap map_;
};

}  // namespace orin::drivers
