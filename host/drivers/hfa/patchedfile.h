/// A file whose existing bytes a library changes in memory alone, while it appends to the file.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <string>

#include "host/drivers/hfa/libraryfile.h"

#include "host/drivers/common/positionedfile.h"

namespace orin::drivers {

/// The library opens `LibraryName()`. What it appends goes to the file at once; what it writes over
/// bytes that were there before stays here, and is gone with the object. The file is cut back to
/// what it was then, unless what was appended is kept. For one thread at a time.
class PatchedFile final : public ILibraryFile {
 public:
  /// \throws orin::Exception  the file cannot be opened for writing
  explicit PatchedFile(std::string path);
  ~PatchedFile() override;
  PatchedFile(const PatchedFile&) = delete;
  PatchedFile& operator=(const PatchedFile&) = delete;

  /// Its last part is the file's own name.
  const std::string& LibraryName() const { return libraryName_; }
  /// Makes durable what was appended, which stays from now on.
  /// \throws orin::Exception  a write failed, or it cannot be made durable
  void Keep();
  /// Overwrites bytes of the file at once.
  void WriteNow(uint64_t position, const void* bytes, size_t count);
  /// Makes durable what was written.
  /// \throws orin::Exception  a write failed, or it cannot be made durable
  void Sync();

  /// Throws when a write failed, also one that the library said nothing of.
  /// \throws orin::Exception
  void RequireWritten() const;

  // For the library. A failed write is remembered: the library may not tell.
  size_t Read(uint64_t position, void* bytes, size_t count) override;
  size_t Write(uint64_t position, const void* bytes, size_t count) override;
  uint64_t Size() const override { return size_; }

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
  bool isKept_ = false;
};

}  // namespace orin::drivers
