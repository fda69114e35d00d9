// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/positionedfile.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// \param format  takes the file's name, then the reason
[[noreturn]] void Fail(const char* format, const std::string& path, const char* reason,
                       const char* function) {
  throw Exception(FormatString(format, path.c_str(), reason), "host/drivers/tiff/positionedfile",
                  function, 0);
}

constexpr char kCannotWrite[] =
    "%s: cannot be written: %s. Free space or change the permissions, "
    "then run again.";

int FlagsOf(PositionedFile::Mode mode) {
  switch (mode) {
    case PositionedFile::Mode::kRead:
      return O_RDONLY | O_NONBLOCK;  // a pipe of that name must not keep its reader waiting
    case PositionedFile::Mode::kUpdate:
      return O_RDWR;
    case PositionedFile::Mode::kCreate:
      break;
  }
  return O_RDWR | O_CREAT;
}

}  // namespace

PositionedFile::PositionedFile(std::string path, Mode mode)
    : path_(std::move(path)), descriptor_(open(path_.c_str(), FlagsOf(mode) | O_CLOEXEC, 0666)) {
  if (descriptor_ < 0)
    Fail(mode == Mode::kRead ? _("%s: cannot be opened: %s.")
                             : _("%s: cannot be opened for writing: %s."),
         path_, std::strerror(errno), "PositionedFile::PositionedFile(std::string, Mode)");
}

PositionedFile::~PositionedFile() { close(descriptor_); }

void PositionedFile::Lock() {
  // A file system without locks is none to refuse work on.
  if (flock(descriptor_, LOCK_EX | LOCK_NB) == 0 || errno != EWOULDBLOCK) return;
  throw Exception(FormatString(_("%s: another build is writing levels into it. Wait until it is "
                                 "finished, then run again."),
                               path_.c_str()),
                  "host/drivers/tiff/positionedfile", "PositionedFile::Lock()", 0);
}

uint64_t PositionedFile::Size() const {
  struct stat status;
  if (fstat(descriptor_, &status) != 0)
    Fail(_("%s: its size cannot be read: %s."), path_, std::strerror(errno),
         "PositionedFile::Size() const");
  return static_cast<uint64_t>(status.st_size);
}

void PositionedFile::Read(uint64_t position, void* bytes, size_t count) const {
  constexpr char kFunction[] = "PositionedFile::Read(uint64_t, void*, size_t) const";
  auto* to = static_cast<uint8_t*>(bytes);
  while (count > 0) {
    const ssize_t got = pread(descriptor_, to, count, static_cast<off_t>(position));
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) Fail(_("%s: cannot be read: %s."), path_, std::strerror(errno), kFunction);
    if (got == 0)
      Fail(_("%s: cannot be read: %s."), path_, _("the file ends too early"), kFunction);
    to += got;
    position += static_cast<uint64_t>(got);
    count -= static_cast<size_t>(got);
  }
}

void PositionedFile::Write(uint64_t position, const void* bytes, size_t count) {
  constexpr char kFunction[] = "PositionedFile::Write(uint64_t, const void*, size_t)";
  const auto* from = static_cast<const uint8_t*>(bytes);
  while (count > 0) {
    const ssize_t put = pwrite(descriptor_, from, count, static_cast<off_t>(position));
    if (put < 0 && errno == EINTR) continue;
    if (put < 0) Fail(_(kCannotWrite), path_, std::strerror(errno), kFunction);
    if (put == 0) Fail(_(kCannotWrite), path_, std::strerror(ENOSPC), kFunction);
    from += put;
    position += static_cast<uint64_t>(put);
    count -= static_cast<size_t>(put);
  }
}

void PositionedFile::Sync() {
  if (fsync(descriptor_) != 0)
    Fail(_(kCannotWrite), path_, std::strerror(errno), "PositionedFile::Sync()");
}

void PositionedFile::Truncate(uint64_t size) {
  if (ftruncate(descriptor_, static_cast<off_t>(size)) != 0)
    Fail(_("%s: cannot be shortened: %s."), path_, std::strerror(errno),
         "PositionedFile::Truncate(uint64_t)");
}

void PositionedFile::Rename(const std::string& path) {
  if (std::rename(path_.c_str(), path.c_str()) != 0)
    Fail(_("%s: cannot be renamed: %s."), path_, std::strerror(errno),
         "PositionedFile::Rename(const std::string&)");
  path_ = path;
  const std::string folder = std::filesystem::path(path).parent_path().string();
  const int directory =
      open(folder.empty() ? "." : folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (directory < 0)
    return;  // deliberate: the name is given; not every file system lets it be synced
  fsync(directory);
  close(directory);
}

}  // namespace orin::drivers
