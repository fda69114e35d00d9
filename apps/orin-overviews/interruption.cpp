// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/interruption.h"

#include <atomic>

namespace orin::app {
namespace {

constexpr int kSignals[] = {SIGINT, SIGTERM, SIGHUP};

std::atomic<bool> requested = false;
static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler may take no lock");

void Note(int /*signal*/) { requested = true; }

}  // namespace

Interruption::Interruption() : previous_{} {
  requested = false;
  for (size_t i = 0; i < previous_.size(); ++i) {
    struct sigaction action = {};
    action.sa_handler = Note;
    action.sa_flags = SA_RESTART;  // reads and writes go on; the run stops between blocks
    sigemptyset(&action.sa_mask);
    sigaction(kSignals[i], nullptr, &previous_[i]);
    if (previous_[i].sa_handler != SIG_IGN) sigaction(kSignals[i], &action, nullptr);
  }
}

Interruption::~Interruption() {
  for (size_t i = 0; i < previous_.size(); ++i) sigaction(kSignals[i], &previous_[i], nullptr);
}

bool Interruption::Requested() const { return requested; }

}  // namespace orin::app
