// SPDX-License-Identifier: MIT
#include "host/drivers/common/positionedfile.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/drivers/common/lockholder.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// \param format  takes the file's name, then the reason
[[noreturn]] void Fail(const char* format, const std::string& path, const char* reason,
                       const char* function) {
  throw Exception(FormatString(format, path.c_str(), reason), "host/drivers/common/positionedfile",
                  function, 0);
}

constexpr int64_t kSecond = 1000000000;  // nanoseconds

const char* IsLink() {
  return _(
      "%s: is a link, or no regular file; nothing is written through it. Delete it, or move it "
      "away, and run again.");
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
    case PositionedFile::Mode::kUpdateUnlinked:
      break;
  }
  return O_RDWR | O_NOFOLLOW | O_NONBLOCK;
}

const char* CannotOpen(PositionedFile::Mode mode) {
  return mode == PositionedFile::Mode::kRead ? _("%s: cannot be opened: %s.")
                                             : _("%s: cannot be opened for writing: %s.");
}

bool HasNoLocks(int error) {
  return error == ENOLCK || error == ENOSYS || error == EOPNOTSUPP || error == EINVAL;
}

/// Makes the names in the folder durable; not every file system lets them be.
void SyncFolderOf(const std::string& path) {
  const std::string folder = std::filesystem::path(path).parent_path().string();
  const int directory = OpenDescriptor(folder.empty() ? "." : folder, O_RDONLY | O_DIRECTORY);
  if (directory < 0) return;
  fsync(directory);
  close(directory);
}

}  // namespace

PositionedFile::PositionedFile(std::string path, int descriptor)
    : path_(std::move(path)), descriptor_(descriptor) {
  if (descriptor_ >= 0) lastModified_ = Modified();
}

PositionedFile::PositionedFile(std::string path, Mode mode)
    : PositionedFile(path, OpenDescriptor(path, FlagsOf(mode))) {
  constexpr char kFunction[] = "PositionedFile::PositionedFile(std::string, Mode)";
  const bool isUnlinked = mode == Mode::kUpdateUnlinked;
  if (descriptor_ < 0 && isUnlinked && (errno == ELOOP || errno == EISDIR))
    Fail(IsLink(), path_, "", kFunction);
  if (descriptor_ < 0) Fail(CannotOpen(mode), path_, std::strerror(errno), kFunction);
  if (isUnlinked) RequireUnlinked();
}

std::unique_ptr<PositionedFile> PositionedFile::Make(const std::string& path,
                                                     const FileAccess& access) {
  const int descriptor =
      OpenDescriptor(path, O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW, access.ModeToBeginWith());
  if (descriptor < 0)
    Fail(CannotOpen(Mode::kUpdate), path, std::strerror(errno),
         "PositionedFile::Make(const std::string&, const FileAccess&)");
  access.ApplyTo(descriptor);
  return std::unique_ptr<PositionedFile>(new PositionedFile(path, descriptor));
}

PositionedFile::~PositionedFile() {
  if (descriptor_ >= 0) close(descriptor_);
}

/// \pre the destructor runs when this throws
void PositionedFile::RequireUnlinked() const {
  struct stat status {};
  if (fstat(descriptor_, &status) != 0 || !S_ISREG(status.st_mode) || status.st_nlink != 1)
    Fail(IsLink(), path_, "", "PositionedFile::RequireUnlinked() const");
}

bool PositionedFile::IsOwn() const {
  struct stat status {};
  return fstat(descriptor_, &status) == 0 && status.st_uid == geteuid();
}

bool PositionedFile::IsReadableAs(const FileAccess& access) const {
  struct stat status {};
  return fstat(descriptor_, &status) == 0 && access.LetsRead(status.st_uid, status.st_gid);
}

void PositionedFile::Lock() {
  constexpr char kFunction[] = "PositionedFile::Lock()";
  const auto lock = [this] { return flock(descriptor_, LOCK_EX | LOCK_NB); };
  struct stat own {};
  struct stat named {};
  if (Uninterrupted(lock) != 0 && !HasNoLocks(errno)) {  // no locks are no reason to refuse work
    if (errno != EWOULDBLOCK)
      Fail(_("%s: cannot be locked: %s."), path_, std::strerror(errno), kFunction);
    throw Exception(LockedText(path_, descriptor_), "host/drivers/common/positionedfile", kFunction,
                    0);
  }
  const bool isNamed = fstat(descriptor_, &own) == 0 && stat(path_.c_str(), &named) == 0 &&
                       own.st_dev == named.st_dev && own.st_ino == named.st_ino;
  if (!isNamed)
    throw Exception(
        FormatString(_("%s: was replaced by another program just now. Run again."), path_.c_str()),
        "host/drivers/common/positionedfile", kFunction, 0);
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
  const Transfer done = ReadUpTo(position, bytes, count);
  if (done.error != 0)
    Fail(_("%s: cannot be read: %s."), path_, std::strerror(done.error), kFunction);
  if (done.bytes < count)
    Fail(_("%s: cannot be read: %s."), path_, _("the file ends too early"), kFunction);
}

void PositionedFile::Write(uint64_t position, const void* bytes, size_t count) {
  const Transfer done = WriteUpTo(position, bytes, count);
  if (done.error != 0)
    Fail(_(kCannotWrite), path_, std::strerror(done.error),
         "PositionedFile::Write(uint64_t, const void*, size_t)");
}

Transfer PositionedFile::WriteUpTo(uint64_t position, const void* bytes, size_t count) noexcept {
  const std::lock_guard lock(mutex_);
  NoteTouch();
  const Transfer done = WriteAt(descriptor_, position, bytes, count);
  lastModified_ = Modified();
  return done;
}

int64_t PositionedFile::Modified() const {
  struct stat status;
  if (fstat(descriptor_, &status) != 0) return 0;
  return status.st_mtim.tv_sec * kSecond + status.st_mtim.tv_nsec;
}

void PositionedFile::NoteTouch() {
  if (Modified() != lastModified_) wasTouched_ = true;
}

bool PositionedFile::TakeWasTouched() {
  const std::lock_guard lock(mutex_);
  NoteTouch();
  lastModified_ = Modified();
  return std::exchange(wasTouched_, false);
}

void PositionedFile::Sync() {
  if (Uninterrupted([this] { return fsync(descriptor_); }) != 0)
    Fail(_(kCannotWrite), path_, std::strerror(errno), "PositionedFile::Sync()");
}

void PositionedFile::Truncate(uint64_t size) {
  const std::lock_guard lock(mutex_);
  NoteTouch();
  if (Uninterrupted([&] { return ftruncate(descriptor_, static_cast<off_t>(size)); }) != 0)
    Fail(_("%s: cannot be shortened: %s."), path_, std::strerror(errno),
         "PositionedFile::Truncate(uint64_t)");
  lastModified_ = Modified();
}

int64_t PositionedFile::SetModified(int64_t nanoseconds) {
  const std::lock_guard lock(mutex_);
  NoteTouch();
  int64_t seconds = nanoseconds / kSecond;
  if (nanoseconds % kSecond < 0) --seconds;  // times before 1970
  timespec times[2] = {};
  times[0].tv_nsec = UTIME_OMIT;
  times[1].tv_sec = seconds;
  times[1].tv_nsec = nanoseconds - seconds * kSecond;
  futimens(descriptor_, times);  // refused to those who do not own the file
  lastModified_ = Modified();
  return lastModified_;
}

PositionedFile::Alone PositionedFile::DoAlone(const std::function<void()>& action) {
  // Who opens the file meanwhile waits, and the system announces it by a signal: by one that is
  // ignored where nobody asked for it, not by the usual one, which ends the process.
  if (fcntl(descriptor_, F_SETSIG, SIGURG) != 0) return Alone::kCannotTell;
  if (fcntl(descriptor_, F_SETLEASE, F_WRLCK) != 0)
    return errno == EAGAIN ? Alone::kOthersHaveItOpen : Alone::kCannotTell;
  const struct Release {
    int descriptor;
    ~Release() { fcntl(descriptor, F_SETLEASE, F_UNLCK); }
  } release{descriptor_};
  action();
  return Alone::kDone;
}

void PositionedFile::Rename(const std::string& path) {
  const unsigned kNeverReplace = RENAME_NOREPLACE;
  int failed = renameat2(AT_FDCWD, path_.c_str(), AT_FDCWD, path.c_str(), kNeverReplace);
  if (failed != 0 && (errno == EINVAL || errno == ENOSYS))  // not every file system knows how
    failed = std::rename(path_.c_str(), path.c_str());
  if (failed != 0)
    Fail(_("%s: cannot be renamed: %s."), path_, std::strerror(errno),
         "PositionedFile::Rename(const std::string&)");
  path_ = path;
  SyncFolderOf(path);
}

void PositionedFile::Remove() {
  if (unlink(path_.c_str()) != 0)
    Fail(_("%s: cannot be deleted: %s."), path_, std::strerror(errno), "PositionedFile::Remove()");
  SyncFolderOf(path_);
}

}  // namespace orin::drivers
