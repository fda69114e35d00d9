// SPDX-License-Identifier: MIT
#include "basic/gobs/blockmemory.h"

#include <sys/mman.h>

#include <algorithm>
#include <atomic>
#include <new>

#include "basic/gobs/outofmemory.h"

namespace orin::gobs {
namespace {

constexpr std::align_val_t kAlignment{64};  // one cache line, the widest vector load
constexpr size_t kLarge = size_t{1} << 20;  // bytes; smaller blocks are left to the heap
constexpr size_t kUnit = size_t{1} << 20;   // bytes; blocks of nearly one size share buffers

// Under a sanitizer every block comes from the heap, which is what it watches.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kMapsBlocks = false;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr bool kMapsBlocks = false;
#else
constexpr bool kMapsBlocks = true;
#endif
#else
constexpr bool kMapsBlocks = true;
#endif

size_t CapacityFor(size_t bytes) { return (bytes + kUnit - 1) / kUnit * kUnit; }

thread_local BlockBuffers* used = nullptr;

std::atomic<uint64_t> mappedBytes = 0;
std::atomic<uint64_t> mappings = 0;

/// A buffer that is kept holds its own capacity.
size_t& CapacityIn(void* memory) { return *static_cast<size_t*>(memory); }

void Unmap(void* memory, size_t capacity) {
  munmap(memory, capacity);
  mappedBytes -= capacity;
}

std::atomic<int> live = 0;
std::atomic<int> most = 0;

void CountOneMore() {
  const int now = ++live;
  for (int seen = most; seen < now && !most.compare_exchange_weak(seen, now);) {
  }
}

void* AllocateSmall(size_t bytes) {
  if (void* memory = ::operator new(bytes, kAlignment, std::nothrow)) return memory;
  ThrowOutOfMemory();
}

void* AllocateLarge(size_t capacity) {
  if (void* kept = used ? used->Take(capacity) : nullptr) return kept;
  void* memory =
      mmap(nullptr, capacity, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) ThrowOutOfMemory();
  mappedBytes += capacity;
  ++mappings;
  return memory;
}

bool IsSmall(size_t bytes) { return !kMapsBlocks || bytes < kLarge; }

}  // namespace

void* AllocateBlock(size_t bytes) {
  void* memory = IsSmall(bytes) ? AllocateSmall(bytes) : AllocateLarge(CapacityFor(bytes));
  CountOneMore();
  return memory;
}

void ReleaseBlock(void* memory, size_t bytes) noexcept {
  if (!memory) return;
  --live;
  if (IsSmall(bytes)) return ::operator delete(memory, kAlignment);
  const size_t capacity = CapacityFor(bytes);
  if (!used || !used->Keep(memory, capacity)) Unmap(memory, capacity);
}

BlockBuffers::Use::Use(BlockBuffers& buffers) : former_(used) { used = &buffers; }
BlockBuffers::Use::~Use() { used = former_; }

BlockBuffers::~BlockBuffers() {
  for (std::atomic<void*>& place : free_)
    if (void* memory = place.exchange(nullptr)) Unmap(memory, CapacityIn(memory));
}

void* BlockBuffers::Take(size_t capacity) {
  for (std::atomic<void*>& place : free_) {
    void* memory = place.exchange(nullptr);
    if (!memory) continue;
    const size_t found = CapacityIn(memory);
    keptBytes_ -= found;
    if (found == capacity) return memory;
    if (!Keep(memory, found)) Unmap(memory, found);
  }
  return nullptr;
}

bool BlockBuffers::Keep(void* memory, size_t capacity) {
  if (keptBytes_.fetch_add(capacity) + capacity <= kMaxBytes) {
    CapacityIn(memory) = capacity;
    for (std::atomic<void*>& place : free_)
      if (void* none = nullptr; place.compare_exchange_strong(none, memory)) return true;
  }
  keptBytes_ -= capacity;
  return false;
}

int LiveBlocks() { return live; }
int MostLiveBlocks() { return most; }
void ResetMostLiveBlocks() { most = live.load(); }

BlockMappings MappingsOfBlocks() { return {mappedBytes, mappings}; }

}  // namespace orin::gobs
