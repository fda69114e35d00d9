// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/abruptend.h"

#include <unistd.h>

#include <cstdlib>
#include <utility>

#include "apps/orin-overviews/exitcode.h"

namespace orin::app {
namespace {

std::function<void()>& Pending() {
  static std::function<void()> report;
  return report;
}

void EndNow() {
  const std::function<void()> report = std::exchange(Pending(), nullptr);
  if (!report) return;
  report();
  _exit(kCannotBuild);  // other threads still run; nothing may be destroyed under them
}

}  // namespace

AbruptEnd::AbruptEnd(std::function<void()> report) {
  Pending() = std::move(report);  // constructed first, so that it outlives the handler
  static const int registered = std::atexit(EndNow);
  static_cast<void>(registered);
}

AbruptEnd::~AbruptEnd() { Pending() = nullptr; }

}  // namespace orin::app
