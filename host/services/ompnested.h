/// Nested OpenMP parallelism for the length of a scope.
// SPDX-License-Identifier: MIT
#pragma once

/// While it lives, nested parallel regions of the constructing thread fork teams (`enable` true) or
/// run on one thread (`enable` false). Destruction restores the state found at construction.
class OMPNested {
 public:
  explicit OMPNested(bool enable);
  ~OMPNested();
  OMPNested(const OMPNested&) = delete;
  OMPNested& operator=(const OMPNested&) = delete;

 private:
  int previousLevels_;
};
