/// What it takes to make levels, and what becomes of them, known before the first byte is written.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

namespace orin::datasources {

struct LevelRoom {
  std::string file;         ///< that grows, or is made; empty: the levels take no room in a file
  uint64_t bytes = 0;       ///< that they take at most; exact without compression
  std::string obstacle;     ///< why the file's format may not hold them, naming it; empty: it does
  std::string advice;       ///< what to do about the obstacle
  bool blursAlpha = false;  ///< opacity is stored with loss; masks say exactly what holds data
};

/// Why the file system cannot take the levels, naming what is needed and what is free; empty when
/// it can, or does not tell how much is free.
std::string SpaceProblem(const LevelRoom& room);

/// \throws orin::Exception  there is an obstacle or a problem of space
void RequireRoom(const LevelRoom& room);

}  // namespace orin::datasources
