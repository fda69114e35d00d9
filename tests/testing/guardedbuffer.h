/// A buffer between two guards that show a write outside it.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <vector>

#if defined(__SANITIZE_ADDRESS__)
#define ORIN_TESTING_POISONS_GUARDS 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define ORIN_TESTING_POISONS_GUARDS 1
#endif
#endif
#ifdef ORIN_TESTING_POISONS_GUARDS
#include <sanitizer/asan_interface.h>
#else
#define ASAN_POISON_MEMORY_REGION(address, size) ((void)(address), (void)(size))
#define ASAN_UNPOISON_MEMORY_REGION(address, size) ((void)(address), (void)(size))
#endif

namespace orin::testing {

/// Under the address sanitizer even a read of a guard is reported, where it happens.
class GuardedBuffer {
 public:
  explicit GuardedBuffer(size_t bytes) : size_(bytes), store_(WordsFor(bytes), kGuardWord) {
    Poison();
  }
  GuardedBuffer(const GuardedBuffer&) = delete;
  GuardedBuffer& operator=(const GuardedBuffer&) = delete;
  ~GuardedBuffer() { Unpoison(); }

  uint8_t* Data() { return reinterpret_cast<uint8_t*>(store_.data() + kGuardWords); }
  const uint8_t* Data() const {
    return reinterpret_cast<const uint8_t*>(store_.data() + kGuardWords);
  }
  size_t Size() const { return size_; }

  /// Whether both guards hold what they were made with.
  bool GuardsIntact() {
    Unpoison();
    const auto* bytes = reinterpret_cast<const uint8_t*>(store_.data());
    const auto isGuard = [](uint8_t byte) { return byte == kGuardByte; };
    const bool intact =
        std::all_of(bytes, bytes + kGuardBytes, isGuard) &&
        std::all_of(bytes + kGuardBytes + size_, bytes + store_.size() * 8, isGuard);
    Poison();
    return intact;
  }

 private:
  static constexpr uint8_t kGuardByte = 0xC9;
  static constexpr uint64_t kGuardWord = 0xC9C9C9C9C9C9C9C9u;
  static constexpr size_t kGuardWords = 64;
  static constexpr size_t kGuardBytes = kGuardWords * 8;

  static size_t WordsFor(size_t bytes) { return kGuardWords + (bytes + 7) / 8 + kGuardWords; }
  void Poison() {
    ASAN_POISON_MEMORY_REGION(store_.data(), kGuardBytes);
    ASAN_POISON_MEMORY_REGION(Data() + size_, store_.size() * 8 - kGuardBytes - size_);
  }
  void Unpoison() { ASAN_UNPOISON_MEMORY_REGION(store_.data(), store_.size() * 8); }

  size_t size_;
  std::vector<uint64_t> store_;  // words, so that the buffer is aligned for every pixel type
};

}  // namespace orin::testing
