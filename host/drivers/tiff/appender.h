/// Adds pixels and directories to a TIFF file, and links them in with one write.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <mutex>
#include <optional>
#include <vector>

#include "host/drivers/common/positionedfile.h"
#include "host/drivers/tiff/freespacemap.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

/// One entry of a directory to be written.
struct NewEntry {
  uint16_t tag = 0;
  uint16_t type = 0;
  uint64_t count = 0;          ///< elements
  std::vector<uint8_t> bytes;  ///< elements in the machine's byte order
};

/// An entry of unsigned numbers. \param type  TIFF_SHORT, TIFF_LONG or TIFF_LONG8
NewEntry NumbersEntry(uint16_t tag, uint16_t type, const std::vector<uint64_t>& numbers);
/// An entry of text, with its closing zero.
NewEntry TextEntry(uint16_t tag, const std::string& text);

/// Nothing that the file holds is changed, but for `Link`: bytes go into space of this program that
/// was free from the start, else to the file's end. What is added is never written over by the same
/// appender, and bytes that another program adds meanwhile are left alone. Adding is safe from
/// several threads.
class Appender {
 public:
  /// \param file   open for update; outlives the appender
  /// \param map    as it is now
  Appender(PositionedFile& file, bool isBig, ByteOrder byteOrder, FreeSpaceMap map = {});

  /// Adds `bytes`, near those added before. \returns their position, which is even
  /// \throws orin::Exception  a classic file would pass 4 GiB, or the bytes cannot be written
  uint64_t Append(const std::vector<uint8_t>& bytes);
  /// Adds a directory, its entries sorted by tag; nothing points at it yet.
  /// \param next  the directory that follows it in the chain, or 0. \returns its position
  uint64_t AppendDirectory(std::vector<NewEntry> entries, uint64_t next);
  /// Keeps room for a directory. \returns its place
  uint64_t ReserveDirectory(const std::vector<NewEntry>& entries);
  /// Writes the directory into the place kept for it. \returns its position
  uint64_t WriteDirectory(std::vector<NewEntry> entries, uint64_t next, uint64_t reserved);
  /// Records whose space it is that was added so far. Before the sync that precedes a `Link`.
  void Close();
  /// Makes the link at `linkPosition` point at `target`, in one write.
  void Link(uint64_t linkPosition, uint64_t target);

  /// Bytes that a directory takes with its values.
  uint64_t SizeOfDirectory(const std::vector<NewEntry>& entries) const;
  /// Where the file ends.
  uint64_t End() const;
  /// Something in the file refers to what was added so far: it is never given up.
  void Keep();
  /// Gives up what was added and not kept: everything from `end` on, unless it is another
  /// program's, and the space taken elsewhere.
  void CutBackTo(uint64_t end);

 private:
  using Taking = std::optional<uint64_t> (ByteRanges::*)(uint64_t bytes);

  /// \param take  null: nothing is taken from the free space
  uint64_t Reserve(uint64_t bytes, Taking take);
  void NoticeOthers();
  bool HasOpenSegment() const;
  void EndSegment();
  void PadSegment();
  void BeginSegment(uint64_t bytes);
  void RequireBelowLimit(uint64_t position, uint64_t bytes) const;

  PositionedFile& file_;
  bool isBig_;
  ByteOrder byteOrder_;
  mutable std::mutex mutex_;
  uint64_t end_;
  uint64_t kept_ = 0;  ///< the file is never cut before this
  FreeSpaceMap map_;   ///< `free`: what may be taken; the last segment may be open
  ByteRanges taken_;   ///< of the free space, since the last Keep
};

}  // namespace orin::drivers
