/// A file whose existing bytes a library changes in memory first, so that all changes of its
/// structure reach the disk at once, in an order of ours, when everything they refer to is there.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "host/drivers/common/positionedfile.h"

namespace orin::drivers {

/// Bytes to be put over existing ones.
struct FilePatch {
  uint64_t position;
  std::string bytes;
};

/// The library opens `LibraryName()`. What it appends goes to the file at once; what it writes over
/// bytes that were there before stays here until `Commit`. Given up without it, the file is cut
/// back to what it was. For one thread at a time.
class PatchedFile {
 public:
  /// \throws orin::Exception  the file cannot be opened for writing
  explicit PatchedFile(std::string path);
  ~PatchedFile();
  PatchedFile(const PatchedFile&) = delete;
  PatchedFile& operator=(const PatchedFile&) = delete;

  /// Its last part is the file's own name.
  const std::string& LibraryName() const { return libraryName_; }
  /// The overwrites that wait and change something, by descending position.
  std::vector<FilePatch> Waiting() const;
  /// Makes what was appended durable, then the waiting overwrites, each by one write.
  /// \throws orin::Exception  a write of the library failed, or one of these does
  void Commit();

  /// Overwrites bytes that nothing refers to, or that may change before everything else, at once.
  void WriteNow(uint64_t position, const void* bytes, size_t count);
  /// Makes durable what was written at once.
  /// \throws orin::Exception  it cannot be
  void Sync();

  /// Throws when a write failed, also one that the library said nothing of.
  /// \throws orin::Exception
  void RequireWritten() const;

  // For the library. A failed write is remembered: the library may not tell.
  size_t Read(uint64_t position, void* bytes, size_t count);
  size_t Write(uint64_t position, const void* bytes, size_t count);
  uint64_t Size() const { return size_; }

 private:
  static constexpr size_t kPageBytes = 4096;
  using Page = std::array<char, kPageBytes>;

  Page& PageAt(uint64_t number);
  bool PutThrough(uint64_t position, const char* bytes, size_t count);
  [[noreturn]] void FailToWrite() const;

  PositionedFile file_;
  std::string libraryName_;
  uint64_t end_;   ///< of what was there before; bytes
  uint64_t size_;  ///< with what was appended
  std::map<uint64_t, Page> pages_;
  int error_ = 0;  ///< errno of the first write that failed
  bool isCommitted_ = false;
};

}  // namespace orin::drivers
