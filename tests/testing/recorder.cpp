// SPDX-License-Identifier: MIT
#include "tests/testing/recorder.h"

#include <optional>
#include <stdexcept>

#include "host/services/exception.h"

namespace orin::testing {
namespace {

[[noreturn]] void Throw(Fault fault, const std::string& operation) {
  const std::string message = "injected fault: " + operation;
  switch (fault) {
    case Fault::kException:
      throw Exception(message, "tests/testing/recorder", operation, 1);
    case Fault::kDataException:
      throw DataException(message, "tests/testing/recorder", operation, 2);
    case Fault::kStdRuntimeError:
      break;
  }
  throw std::runtime_error(message);
}

}  // namespace

void Recorder::Call(const std::string& operation, const std::string& text) {
  std::optional<Fault> due;
  {
    const std::lock_guard lock(mutex_);
    log_.push_back(text);
    ++calls_[operation];
    for (ArmedFault& armed : armed_)
      if ((armed.operation.empty() || armed.operation == operation) && armed.callsLeft > 0 &&
          --armed.callsLeft == 0)
        due = armed.fault;
  }
  if (due) Throw(*due, operation);
}

void Recorder::Note(const std::string& text) {
  const std::lock_guard lock(mutex_);
  log_.push_back(text);
}

void Recorder::Arm(const std::string& operation, size_t n, Fault fault) {
  const std::lock_guard lock(mutex_);
  armed_.push_back({operation, n, fault});
}

void Recorder::DisarmAll() {
  const std::lock_guard lock(mutex_);
  armed_.clear();
}

size_t Recorder::CallCount(const std::string& operation) const {
  const std::lock_guard lock(mutex_);
  size_t count = 0;
  for (const auto& [name, calls] : calls_)
    if (operation.empty() || operation == name) count += calls;
  return count;
}

void Recorder::Clear() {
  const std::lock_guard lock(mutex_);
  log_.clear();
  calls_.clear();
  armed_.clear();
}

std::vector<std::string> Recorder::Log() const {
  const std::lock_guard lock(mutex_);
  return log_;
}

void Recorder::Count(int LiveObjects::*kind, int change) {
  const std::lock_guard lock(mutex_);
  live_.*kind += change;
}

LiveObjects Recorder::Live() const {
  const std::lock_guard lock(mutex_);
  return live_;
}

}  // namespace orin::testing
