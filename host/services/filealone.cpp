// SPDX-License-Identifier: MIT
#include "host/services/filealone.h"

#include <cerrno>
#include <csignal>

#include <fcntl.h>

namespace orin {

Alone DoAlone(int descriptor, const std::function<void()>& action) {
  // Who opens the file meanwhile waits, and the system announces it by a signal: by one that is
  // ignored where nobody asked for it, not by the usual one, which ends the process.
  if (fcntl(descriptor, F_SETSIG, SIGURG) != 0) return Alone::kCannotTell;
  if (fcntl(descriptor, F_SETLEASE, F_WRLCK) != 0)
    return errno == EAGAIN ? Alone::kOthersHaveItOpen : Alone::kCannotTell;
  const struct Release {
    int descriptor;
    ~Release() { fcntl(descriptor, F_SETLEASE, F_UNLCK); }
  } release{descriptor};
  action();
  return Alone::kDone;
}

}  // namespace orin
