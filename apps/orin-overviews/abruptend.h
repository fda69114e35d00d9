/// The end of the process by a library below, such as the OpenMP run-time without threads.
// SPDX-License-Identifier: MIT
#pragma once

#include <functional>

namespace orin::app {

/// While it lives, a library that ends the process has `report` called first, and the exit status
/// is that of a failed build. One object at a time.
class AbruptEnd {
 public:
  explicit AbruptEnd(std::function<void()> report);
  ~AbruptEnd();
  AbruptEnd(const AbruptEnd&) = delete;
  AbruptEnd& operator=(const AbruptEnd&) = delete;
};

}  // namespace orin::app
