/// What is thrown when there is no memory for pixels, masks and the scratch of kernels.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <limits>
#include <new>
#include <vector>

#include "host/services/exception.h"

namespace orin {

/// A failure like any other to who handles the host's exceptions, and `std::bad_alloc` to who
/// handles those. Catch one of these two, or everything: as `std::exception`, which it is twice, it
/// is not caught.
class OutOfMemory : public Exception, public std::bad_alloc {
 public:
  using Exception::Exception;
  const char* what() const noexcept override { return Exception::what(); }
};

/// Throws one that was made beforehand; that takes no memory. Its text is English.
[[noreturn]] void ThrowOutOfMemory();

/// Base of classes whose objects are made where only the host's exceptions may be thrown.
struct ThrowsOutOfMemory {
  static void* operator new(size_t bytes);
  static void operator delete(void* memory) noexcept;
};

template <class T>
struct ScratchAllocator {
  using value_type = T;

  ScratchAllocator() = default;
  template <class Other>
  ScratchAllocator(const ScratchAllocator<Other>&) {}  // NOLINT: containers convert it

  T* allocate(size_t count) {
    if (count > std::numeric_limits<size_t>::max() / sizeof(T)) ThrowOutOfMemory();
    return static_cast<T*>(ThrowsOutOfMemory::operator new(count * sizeof(T)));
  }
  void deallocate(T* memory, size_t) noexcept { ThrowsOutOfMemory::operator delete(memory); }
  template <class Other>
  bool operator==(const ScratchAllocator<Other>&) const {
    return true;
  }
};

/// A vector that throws `OutOfMemory`; not for types of more than the usual alignment.
template <class T>
using Scratch = std::vector<T, ScratchAllocator<T>>;

/// Marks a text that is thrown in English and translated where it is shown.
constexpr const char* N_(const char* text) { return text; }

}  // namespace orin
