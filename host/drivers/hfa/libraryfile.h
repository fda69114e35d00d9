/// A file of ours that the library sees as one of its own.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>

namespace orin::drivers {

/// What the library may do with a file that is shown to it.
class ILibraryFile {
 public:
  virtual ~ILibraryFile() = default;

  virtual uint64_t Size() const = 0;
  /// \returns how many bytes there were before the end
  virtual size_t Read(uint64_t position, void* bytes, size_t count) = 0;
  /// \returns how many bytes were written; fewer than `count` when it failed
  virtual size_t Write(uint64_t position, const void* bytes, size_t count) = 0;
};

}  // namespace orin::drivers
