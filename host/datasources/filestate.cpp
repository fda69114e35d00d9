// SPDX-License-Identifier: MIT
#include "host/datasources/filestate.h"

#include <chrono>
#include <ctime>
#include <thread>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace orin::datasources {
namespace {

constexpr int64_t kSecond = 1000000000;  // nanoseconds

int64_t NanosecondsOf(const timespec& time) { return time.tv_sec * kSecond + time.tv_nsec; }

/// Works on a descriptor that is open for reading only, too.
void SyncFile(const std::string& path) {
  const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (descriptor < 0) return;
  fsync(descriptor);
  close(descriptor);
}

/// The time that a write gets now.
int64_t TimeOfWrites() {
  timespec now{};
  clock_gettime(CLOCK_REALTIME_COARSE, &now);
  return NanosecondsOf(now);
}

/// True as long as a write could get the time `changed`.
bool IsSameTick(int64_t changed) {
  const bool countsSeconds = changed % kSecond == 0;
  constexpr int64_t kLongestTick = 2 * kSecond;  // of file systems that count in seconds
  const int64_t age = TimeOfWrites() - changed;
  if (age < -kLongestTick) return false;  // another machine's clock: waiting does not help
  return age <= (countsSeconds ? kLongestTick : 0);
}

}  // namespace

std::optional<FileState> StateOf(const std::string& path) {
  struct stat status;
  if (stat(path.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) return std::nullopt;
  return FileState{static_cast<uint64_t>(status.st_size), NanosecondsOf(status.st_mtim),
                   NanosecondsOf(status.st_ctim), status.st_ino};
}

std::optional<FileState> SettledStateOf(const std::string& path) {
  if (!StateOf(path)) return std::nullopt;
  SyncFile(path);
  std::optional<FileState> state = StateOf(path);
  constexpr int kMostWaits = 3000;  // somebody writes all the time: that shows by itself
  for (int waits = 0; state && IsSameTick(state->changed) && waits < kMostWaits; ++waits) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
    state = StateOf(path);
  }
  return state;
}

}  // namespace orin::datasources
