// SPDX-License-Identifier: MIT
#include "host/drivers/common/descriptor.h"

#include <fcntl.h>
#include <unistd.h>

namespace orin::drivers {

int OpenDescriptor(const std::string& path, int flags, unsigned mode) {
  return Uninterrupted([&] { return open(path.c_str(), flags | O_CLOEXEC, mode_t(mode)); });
}

Transfer ReadAt(int descriptor, uint64_t position, void* bytes, size_t count) noexcept {
  Transfer done;
  auto* to = static_cast<uint8_t*>(bytes);
  while (done.bytes < count) {
    const ssize_t got = Uninterrupted([&] {
      return pread(descriptor, to + done.bytes, count - done.bytes,
                   static_cast<off_t>(position + done.bytes));
    });
    if (got < 0) done.error = errno;
    if (got <= 0) break;
    done.bytes += static_cast<size_t>(got);
  }
  return done;
}

Transfer WriteAt(int descriptor, uint64_t position, const void* bytes, size_t count) noexcept {
  Transfer done;
  const auto* from = static_cast<const uint8_t*>(bytes);
  while (done.bytes < count) {
    const ssize_t put = Uninterrupted([&] {
      return pwrite(descriptor, from + done.bytes, count - done.bytes,
                    static_cast<off_t>(position + done.bytes));
    });
    if (put <= 0) done.error = put < 0 ? errno : ENOSPC;
    if (put <= 0) break;
    done.bytes += static_cast<size_t>(put);
  }
  return done;
}

}  // namespace orin::drivers
