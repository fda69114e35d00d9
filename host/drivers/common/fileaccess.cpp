// SPDX-License-Identifier: MIT
#include "host/drivers/common/fileaccess.h"

#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

namespace orin::drivers {
namespace {

constexpr char kAccessList[] = "system.posix_acl_access";
constexpr mode_t kOwner = S_IRUSR | S_IWUSR;
constexpr mode_t kAnybody = kOwner | S_IRGRP | S_IWGRP | S_IROTH | S_IWOTH;

std::vector<char> AccessListOf(const std::string& path) {
  const ssize_t size = getxattr(path.c_str(), kAccessList, nullptr, 0);
  if (size <= 0) return {};
  std::vector<char> list(static_cast<size_t>(size));
  const ssize_t got = getxattr(path.c_str(), kAccessList, list.data(), list.size());
  list.resize(got < 0 ? 0 : static_cast<size_t>(got));
  return list;
}

}  // namespace

FileAccess FileAccess::Of(const std::string& path) {
  FileAccess access;
  struct stat status {};
  access.isKnown_ = stat(path.c_str(), &status) == 0;
  access.mode_ = status.st_mode & kAnybody;
  access.owner_ = status.st_uid;
  access.group_ = status.st_gid;
  if (access.isKnown_) access.list_ = AccessListOf(path);
  return access;
}

mode_t FileAccess::ModeToBeginWith() const { return isKnown_ ? kOwner : kAnybody; }

bool FileAccess::LetsRead(uid_t user, gid_t group) const {
  if (!isKnown_ || user == owner_ || user == geteuid() || user == 0) return true;
  return (mode_ & S_IROTH) != 0 || (group == group_ && (mode_ & S_IRGRP) != 0);
}

void FileAccess::ApplyTo(int descriptor) const {
  if (!isKnown_) return;
  struct stat made {};
  bool isGroupSet = fstat(descriptor, &made) == 0 && made.st_gid == group_;
  if (!isGroupSet) isGroupSet = fchown(descriptor, uid_t(-1), group_) == 0;
  // The folder may give its files a list of its own, which a wider mode would put into force.
  if (list_.empty()) fremovexattr(descriptor, kAccessList);
  else
    isGroupSet =
        isGroupSet && fsetxattr(descriptor, kAccessList, list_.data(), list_.size(), 0) == 0;
  fchmod(descriptor, (isGroupSet ? mode_ : mode_ & ~mode_t(S_IRWXG)) | kOwner);
}

}  // namespace orin::drivers
