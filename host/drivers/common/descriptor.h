/// Opens, reads and writes files of the system, as often as signals interrupt that.
// SPDX-License-Identifier: MIT
#pragma once

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <string>

namespace orin::drivers {

/// The answer of a system call that returns a negative number when it fails, once no signal
/// interrupts it.
template <class Call>
auto Uninterrupted(const Call& call) {
  auto answer = call();
  while (answer < 0 && errno == EINTR) answer = call();
  return answer;
}

/// A descriptor that programs started from this one do not inherit; -1, and `errno` says why.
/// \param flags  of `open`
/// \param mode   of a file that is made
int OpenDescriptor(const std::string& path, int flags, unsigned mode = 0);

struct Transfer {
  size_t bytes = 0;  ///< that were read or written
  int error = 0;     ///< `errno` of what ended it early; 0 for the end of the file
};

/// Reads until the file ends.
Transfer ReadAt(int descriptor, uint64_t position, void* bytes, size_t count) noexcept;
/// A device that takes no more is full.
Transfer WriteAt(int descriptor, uint64_t position, const void* bytes, size_t count) noexcept;

}  // namespace orin::drivers
