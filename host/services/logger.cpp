/// Reports and progress on their way to the application's sinks.
// SPDX-License-Identifier: MIT
#include "host/services/logger.h"

#include <algorithm>
#include <memory>
#include <mutex>
#include <utility>

#include "host/services/counter.h"
#include "host/services/warning.h"

namespace orin::tarn {
namespace {

/// One installed sink. A call works on a sink of its own, without a lock: a sink may report, and
/// may replace itself.
template <class Sink>
class Installed {
 public:
  std::shared_ptr<const Sink> Get() const {
    const std::lock_guard lock(mutex_);
    return sink_;
  }
  /// Empty when nothing is installed. \returns the one replaced
  Sink Replace(Sink sink) {
    auto next = sink ? std::make_shared<const Sink>(std::move(sink)) : nullptr;
    const std::lock_guard lock(mutex_);
    sink_.swap(next);
    return next ? *next : Sink();
  }

 private:
  mutable std::mutex mutex_;
  std::shared_ptr<const Sink> sink_;
};

Installed<ReportSink>& EventSink() {
  static Installed<ReportSink> sink;
  return sink;
}

Installed<ReportSink>& WarningSink() {
  static Installed<ReportSink> sink;
  return sink;
}

Installed<ProgressSink>& CounterSink() {
  static Installed<ProgressSink> sink;
  return sink;
}

void Deliver(const Installed<ReportSink>& installed, const std::string& message,
             const std::string& sourceFile, unsigned int line) {
  const auto sink = installed.Get();
  if (!sink) return;
  try {
    (*sink)({message, sourceFile, line});
  } catch (...) {
    // A report that cannot be shown must not stop the work it reports on.
  }
}

bool Ask(float fraction, const std::string* message) {
  const auto sink = CounterSink().Get();
  if (!sink) return true;
  try {
    return (*sink)(std::clamp(fraction, 0.0f, 1.0f), message);
  } catch (...) {
    if (fraction < 1.0f) throw;
    return true;  // deliberate: all the work is done, as for a refusal
  }
}

}  // namespace

void Logger::LogEvent(const std::string& message, const std::string& sourceFile,
                      unsigned int line) {
  Deliver(EventSink(), message, sourceFile, line);
}

ReportSink Logger::SetSink(ReportSink sink) { return EventSink().Replace(std::move(sink)); }

void Warning::Warn(const std::string& message, const std::string& sourceFile, unsigned int line) {
  Deliver(WarningSink(), message, sourceFile, line);
}

ReportSink Warning::SetSink(ReportSink sink) { return WarningSink().Replace(std::move(sink)); }

bool Counter::Update(float fraction) { return Ask(fraction, nullptr); }

bool Counter::Update(float fraction, const std::string& message, void* /*context*/) {
  return Ask(fraction, &message);
}

ProgressSink Counter::SetSink(ProgressSink sink) { return CounterSink().Replace(std::move(sink)); }

}  // namespace orin::tarn
