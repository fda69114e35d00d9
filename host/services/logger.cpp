/// Reports and progress on their way to the application's sinks.
// SPDX-License-Identifier: MIT
#include "host/services/logger.h"

#include <utility>

#include "host/services/counter.h"
#include "host/services/warning.h"

namespace orin::tarn {
namespace {

ReportSink& EventSink() {
  static ReportSink sink;
  return sink;
}

ReportSink& WarningSink() {
  static ReportSink sink;
  return sink;
}

ProgressSink& CounterSink() {
  static ProgressSink sink;
  return sink;
}

void Deliver(const ReportSink& sink, const std::string& message, const std::string& sourceFile,
             unsigned int line) {
  if (!sink) return;
  try {
    sink({message, sourceFile, line});
  } catch (...) {
    // A report that cannot be shown must not stop the work it reports on.
  }
}

}  // namespace

void Logger::LogEvent(const std::string& message, const std::string& sourceFile,
                      unsigned int line) {
  Deliver(EventSink(), message, sourceFile, line);
}

ReportSink Logger::SetSink(ReportSink sink) { return std::exchange(EventSink(), std::move(sink)); }

void Warning::Warn(const std::string& message, const std::string& sourceFile, unsigned int line) {
  Deliver(WarningSink(), message, sourceFile, line);
}

ReportSink Warning::SetSink(ReportSink sink) {
  return std::exchange(WarningSink(), std::move(sink));
}

bool Counter::Update(float fraction) { return !CounterSink() || CounterSink()(fraction, nullptr); }

bool Counter::Update(float fraction, const std::string& message, void* /*context*/) {
  return !CounterSink() || CounterSink()(fraction, &message);
}

ProgressSink Counter::SetSink(ProgressSink sink) {
  return std::exchange(CounterSink(), std::move(sink));
}

}  // namespace orin::tarn
