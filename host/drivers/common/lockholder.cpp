// SPDX-License-Identifier: MIT
#include "host/drivers/common/lockholder.h"

#include <cstdio>
#include <fstream>
#include <sstream>

#include <sys/sysmacros.h>

#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// The line's process when it tells of a lock of that file in force; else 0. Such a line reads
/// "3: FLOCK  ADVISORY  WRITE 1234 fe:00:10952745 0 EOF"; one that waits has "->" behind the
/// number.
long HolderIn(const std::string& line, const struct stat& file) {
  std::istringstream words(line);
  std::string number, kind, mode, access, place;
  long process = 0;
  if (!(words >> number >> kind >> mode >> access >> process >> place) || kind != "FLOCK") return 0;
  unsigned major = 0, minor = 0;
  unsigned long long inode = 0;
  if (std::sscanf(place.c_str(), "%x:%x:%llu", &major, &minor, &inode) != 3) return 0;
  const bool isFile =
      inode == file.st_ino && major == ::major(file.st_dev) && minor == ::minor(file.st_dev);
  return isFile && process > 0 ? process : 0;
}

std::string NameOf(long process) {
  std::ifstream stream("/proc/" + std::to_string(process) + "/comm");
  std::string name;
  std::getline(stream, name);
  return name;
}

}  // namespace

std::string LockHolderOf(const struct stat& file) {
  std::ifstream locks("/proc/locks");
  for (std::string line; std::getline(locks, line);)
    if (const long process = HolderIn(line, file)) {
      const std::string name = NameOf(process);
      return FormatString(_("%s (process %ld)"), name.empty() ? "?" : name.c_str(), process);
    }
  return "";
}

std::string LockedText(const std::string& path, int descriptor) {
  struct stat own {};
  const std::string holder = fstat(descriptor, &own) == 0 ? LockHolderOf(own) : std::string();
  return holder.empty()
             ? FormatString(_("%s: another build is writing levels into it. Wait until it is "
                              "finished, then run again."),
                            path.c_str())
             : FormatString(_("%s: another build is writing levels into it: %s. Wait until it is "
                              "finished, then run again."),
                            path.c_str(), holder.c_str());
}

}  // namespace orin::drivers
