/// Memory of raster blocks: large buffers are kept for the next block instead of going back to the
/// system.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>

namespace orin::gobs {

/// At least `bytes` bytes, aligned to a cache line, not initialised. Thread-safe.
/// \throws std::bad_alloc  out of memory
void* AllocateBlock(size_t bytes);

/// Gives back what `AllocateBlock` returned for the same `bytes`. Thread-safe; null is ignored.
void ReleaseBlock(void* memory, size_t bytes) noexcept;

/// Blocks allocated and not yet released, in the whole process.
int LiveBlocks();
/// The most that were live at once since the last `ResetMostLiveBlocks`.
int MostLiveBlocks();
void ResetMostLiveBlocks();

}  // namespace orin::gobs
