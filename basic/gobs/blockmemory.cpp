// SPDX-License-Identifier: MIT
#include "basic/gobs/blockmemory.h"

#include <sys/mman.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <mutex>
#include <new>

namespace orin::gobs {
namespace {

constexpr std::align_val_t kAlignment{64};  // one cache line, the widest vector load
constexpr size_t kLarge = size_t{1} << 20;  // bytes; smaller blocks are left to the heap
constexpr size_t kUnit = size_t{1} << 20;   // bytes; blocks of nearly one size share buffers

// Under a sanitizer every block comes from the heap, which is what it watches.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kKeepsBuffers = false;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr bool kKeepsBuffers = false;
#else
constexpr bool kKeepsBuffers = true;
#endif
#else
constexpr bool kKeepsBuffers = true;
#endif

size_t CapacityFor(size_t bytes) { return (bytes + kUnit - 1) / kUnit * kUnit; }

/// Released buffers, as many as one step of the block pipeline has alive.
class FreeBuffers {
 public:
  /// A buffer of exactly this capacity, or null.
  void* Take(size_t capacity) {
    const std::lock_guard lock(mutex_);
    for (Buffer& buffer : buffers_)
      if (buffer.memory && buffer.capacity == capacity) {
        void* memory = buffer.memory;
        buffer.memory = nullptr;
        return memory;
      }
    return nullptr;
  }

  /// Keeps a buffer, in place of the one that has waited longest.
  void Put(void* memory, size_t capacity) {
    const std::lock_guard lock(mutex_);
    Buffer& place = buffers_[next_];
    next_ = (next_ + 1) % buffers_.size();
    if (place.memory) munmap(place.memory, place.capacity);
    place = {memory, capacity};
  }

 private:
  struct Buffer {
    void* memory = nullptr;
    size_t capacity = 0;
  };

  std::mutex mutex_;
  std::array<Buffer, 4> buffers_;
  size_t next_ = 0;
};

FreeBuffers& Free() {
  static FreeBuffers buffers;
  return buffers;
}

std::atomic<int> live = 0;
std::atomic<int> most = 0;

void CountOneMore() {
  const int now = ++live;
  for (int seen = most; seen < now && !most.compare_exchange_weak(seen, now);) {
  }
}

void* Allocate(size_t bytes) {
  if (!kKeepsBuffers || bytes < kLarge) return ::operator new(bytes, kAlignment);
  const size_t capacity = CapacityFor(bytes);
  if (void* kept = Free().Take(capacity)) return kept;
  void* memory =
      mmap(nullptr, capacity, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) throw std::bad_alloc();
  return memory;
}

}  // namespace

void* AllocateBlock(size_t bytes) {
  void* memory = Allocate(bytes);
  CountOneMore();
  return memory;
}

void ReleaseBlock(void* memory, size_t bytes) noexcept {
  if (!memory) return;
  --live;
  if (!kKeepsBuffers || bytes < kLarge) ::operator delete(memory, kAlignment);
  else Free().Put(memory, CapacityFor(bytes));
}

int LiveBlocks() { return live; }
int MostLiveBlocks() { return most; }
void ResetMostLiveBlocks() { most = live.load(); }

}  // namespace orin::gobs
