/// Counts the pixel buffers that are alive.
// SPDX-License-Identifier: MIT
#pragma once

namespace orin::testing {

/// Buffers of blocks alive now. Linking livebuffers.cpp replaces the aligned forms of operator new
/// and delete in the whole program and counts what is aligned to a cache line, as only blocks are.
int LiveBuffers();
/// The most that were alive at once since the last `ResetMostBuffers`.
int MostBuffers();
void ResetMostBuffers();

}  // namespace orin::testing
