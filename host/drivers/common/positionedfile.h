/// An open file that is read and written at given positions; every failure is an exception naming
/// it.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>

#include "host/drivers/common/descriptor.h"
#include "host/drivers/common/fileaccess.h"

namespace orin::drivers {

/// Reads and writes of different threads do not disturb each other.
class PositionedFile {
 public:
  enum class Mode {
    kRead,
    kUpdate,
    /// The same, but for a name that nobody gave to this program: a regular file that has no other
    /// name. Somebody may have planted a link to a file that they cannot write.
    kUpdateUnlinked
  };

  /// \throws orin::Exception  it cannot be opened in that mode
  PositionedFile(std::string path, Mode mode);
  /// Makes a file, for update, where nothing bears the name, be it a link that leads nowhere.
  /// Nobody has access to it who does not have `access`.
  /// \throws orin::Exception  it cannot be made
  static std::unique_ptr<PositionedFile> Make(const std::string& path, const FileAccess& access);
  ~PositionedFile();
  PositionedFile(const PositionedFile&) = delete;
  PositionedFile& operator=(const PositionedFile&) = delete;

  const std::string& Path() const { return path_; }
  /// Bytes.
  uint64_t Size() const;
  /// Whether the file belongs to the user of this process.
  bool IsOwn() const;
  /// Whether the file's owner may read, by what `access` says, all that is written to it.
  bool IsReadableAs(const FileAccess& access) const;
  /// \throws orin::Exception  the bytes cannot be read, or the file ends before them
  void Read(uint64_t position, void* bytes, size_t count) const;
  /// The same where a part will do, or a failure must not throw.
  Transfer ReadUpTo(uint64_t position, void* bytes, size_t count) const noexcept {
    return ReadAt(descriptor_, position, bytes, count);
  }
  /// \throws orin::Exception  not all bytes could be written
  void Write(uint64_t position, const void* bytes, size_t count);
  Transfer WriteUpTo(uint64_t position, const void* bytes, size_t count) noexcept;
  /// Returns when everything written is on the storage device.
  void Sync();
  void Truncate(uint64_t size);
  /// Sets the modification time, nanoseconds since 1970, as finely as the file system keeps it.
  /// \returns the time that it has then, which is another one where it may not be set
  int64_t SetModified(int64_t nanoseconds);
  /// True when the file's time showed, before one of the changes made through this object since the
  /// last call, that somebody else wrote to it or set its time. What falls into the same tick of
  /// the system's clock escapes.
  bool TakeWasTouched();
  /// Keeps other programs that ask for it from changing the file, until this object goes.
  /// \throws orin::Exception  another one has it (the text says who), or another file has taken
  ///                          over the name since this one was opened
  void Lock();
  /// Gives the file a new name, which no other file has, and makes the name durable.
  /// \throws orin::Exception  it cannot be renamed, or there is such a file
  void Rename(const std::string& path);
  /// Removes the file's name, durably.
  void Remove();

  enum class Alone { kDone, kOthersHaveItOpen, kCannotTell };
  /// Does `action` while nothing else has the file open, in this process or another, and nobody can
  /// open it. File systems that know no leases, and files of other owners, do not tell.
  /// \returns whether it was done, or why not
  Alone DoAlone(const std::function<void()>& action);

 private:
  PositionedFile(std::string path, int descriptor);
  void RequireUnlinked() const;
  int64_t Modified() const;
  void NoteTouch();

  std::string path_;
  int descriptor_;
  std::mutex mutex_;          // held while the file is changed
  int64_t lastModified_ = 0;  ///< after the last change by this object, or when it was opened
  bool wasTouched_ = false;
};

}  // namespace orin::drivers
