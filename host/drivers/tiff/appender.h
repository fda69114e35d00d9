/// Adds pixels and directories at the end of a TIFF file, and links them in with one write.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <mutex>
#include <vector>

#include "host/drivers/tiff/positionedfile.h"
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

/// Nothing that the file holds is changed, but for `Link`: bytes that another program adds
/// meanwhile are left alone too. Appending is safe from several threads.
class Appender {
 public:
  /// \param file  open for update; outlives the appender
  Appender(PositionedFile& file, bool isBig, ByteOrder byteOrder);

  /// Writes `bytes` at the file's end. \returns their position, which is even
  /// \throws orin::Exception  a classic file would pass 4 GiB, or the bytes cannot be written
  uint64_t Append(const std::vector<uint8_t>& bytes);
  /// Writes a directory at the file's end, its entries sorted by tag; nothing points at it yet.
  /// \param next  the directory that follows it in the chain, or 0. \returns its position
  uint64_t AppendDirectory(std::vector<NewEntry> entries, uint64_t next);
  /// Makes the link at `linkPosition` point at `target`, in one write.
  void Link(uint64_t linkPosition, uint64_t target);

  /// Where the next bytes go.
  uint64_t End() const;
  /// Something in the file refers to what was appended so far: it is never given up.
  void Keep();
  /// Gives up everything from `end` on, unless some of it is kept or another program's.
  void CutBackTo(uint64_t end);

 private:
  uint64_t Reserve(uint64_t bytes);

  PositionedFile& file_;
  bool isBig_;
  ByteOrder byteOrder_;
  mutable std::mutex mutex_;
  uint64_t end_;
  uint64_t kept_ = 0;  ///< the file is never cut before this
};

}  // namespace orin::drivers
