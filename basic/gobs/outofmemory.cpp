// SPDX-License-Identifier: MIT
#include "basic/gobs/outofmemory.h"

namespace orin {
namespace {

const OutOfMemory kPrepared(
    N_("There is not enough memory for the next block of pixels. Free memory, or lift the limit on "
       "it (ulimit -v), then run the same command again to resume."),
    "basic/gobs/outofmemory", "void orin::ThrowOutOfMemory()", 0);

}  // namespace

void ThrowOutOfMemory() { throw OutOfMemory(kPrepared); }

void* ThrowsOutOfMemory::operator new(size_t bytes) {
  if (void* memory = ::operator new(bytes, std::nothrow)) return memory;
  ThrowOutOfMemory();
}

void ThrowsOutOfMemory::operator delete(void* memory) noexcept { ::operator delete(memory); }

}  // namespace orin
