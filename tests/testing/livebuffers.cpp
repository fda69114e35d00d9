// SPDX-License-Identifier: MIT
#include "tests/testing/livebuffers.h"

#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <new>

namespace {

std::atomic<int> live = 0;
std::atomic<int> most = 0;

constexpr std::size_t kCacheLine = 64;

void Raise(int value) {
  int seen = most.load();
  while (seen < value && !most.compare_exchange_weak(seen, value)) {
  }
}

void Release(void* memory, std::align_val_t alignment) noexcept {
  if (memory && static_cast<std::size_t>(alignment) == kCacheLine) --live;
  std::free(memory);
}

}  // namespace

void* operator new(std::size_t size, std::align_val_t alignment) {
  const auto step = static_cast<std::size_t>(alignment);
  void* memory = std::aligned_alloc(step, (size + step - 1) / step * step + (size == 0 ? step : 0));
  if (!memory) throw std::bad_alloc();
  if (step == kCacheLine) Raise(++live);
  return memory;
}
void operator delete(void* memory, std::align_val_t alignment) noexcept {
  Release(memory, alignment);
}
void operator delete(void* memory, std::size_t, std::align_val_t alignment) noexcept {
  Release(memory, alignment);
}

namespace orin::testing {

int LiveBuffers() { return live; }
int MostBuffers() { return most; }
void ResetMostBuffers() { most = live.load(); }

}  // namespace orin::testing
