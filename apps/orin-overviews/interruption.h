/// The user's wish to stop: Ctrl-C, or a request to end or a lost terminal.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <csignal>

namespace orin::app {

/// While it lives, SIGINT, SIGTERM and SIGHUP are noted instead of ending the process, however
/// often they come. A signal that was ignored before stays ignored. One object at a time.
class Interruption {
 public:
  Interruption();
  ~Interruption();
  Interruption(const Interruption&) = delete;
  Interruption& operator=(const Interruption&) = delete;

  bool Requested() const;

 private:
  std::array<struct sigaction, 3> previous_;
};

}  // namespace orin::app
