/// Memory of raster blocks, and the buffers that a running level hands from block to block.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>

namespace orin::gobs {

/// At least `bytes` bytes, aligned to a cache line, not initialised. Thread-safe.
/// \throws orin::OutOfMemory
void* AllocateBlock(size_t bytes);

/// Gives back what `AllocateBlock` returned for the same `bytes`: to the buffers that the thread
/// uses, else to the system. Thread-safe; null is ignored.
void ReleaseBlock(void* memory, size_t bytes) noexcept;

/// Keeps the buffers of large blocks that are destroyed for those that are made next, which spares
/// the system their pages. Lives as long as a level runs; returns all that it keeps.
class BlockBuffers {
 public:
  static constexpr size_t kMaxBytes = size_t{64} << 20;  ///< kept at any time

  BlockBuffers() = default;
  ~BlockBuffers();
  BlockBuffers(const BlockBuffers&) = delete;
  BlockBuffers& operator=(const BlockBuffers&) = delete;

  /// While it lives, blocks that its thread makes and destroys use the buffers. Several threads may
  /// use the same ones; none waits for another.
  class Use {
   public:
    explicit Use(BlockBuffers& buffers);
    ~Use();
    Use(const Use&) = delete;
    Use& operator=(const Use&) = delete;

   private:
    BlockBuffers* former_;
  };

  /// A buffer of exactly this capacity, or null.
  void* Take(size_t capacity);
  /// \returns false when the buffer is not kept and stays the caller's
  bool Keep(void* memory, size_t capacity);

 private:
  /// Twice as many as one step of the block pipeline has alive: blocks at the edges are smaller.
  std::array<std::atomic<void*>, 8> free_{};
  std::atomic<size_t> keptBytes_ = 0;
};

/// Blocks allocated and not yet released, in the whole process.
int LiveBlocks();
/// The most that were live at once since the last `ResetMostLiveBlocks`.
int MostLiveBlocks();
void ResetMostLiveBlocks();

/// Memory that large blocks have of the system, and how often they asked for some.
struct BlockMappings {
  uint64_t bytes;  ///< now, kept buffers included
  uint64_t count;  ///< since the process began
};
BlockMappings MappingsOfBlocks();

}  // namespace orin::gobs
