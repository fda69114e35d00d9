/// What a fuzz target demands of the code under test beside not crashing.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdio>
#include <cstdlib>

namespace orin::fuzz {

/// Ends the program when `holds` is false, so that the input is reported.
inline void Demand(bool holds, const char* what) {
  if (holds) return;
  std::fprintf(stderr, "The input breaks a promise: %s.\n", what);
  std::abort();
}

}  // namespace orin::fuzz
