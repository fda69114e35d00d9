/// Events that the library records; an application installs the sink.
// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <string>

namespace orin::tarn {

/// One event or warning as the library reported it.
struct Report {
  std::string message;
  std::string
      sourceFile;  ///< path without extension, such as `processes/overviews/createoverviews`
  unsigned int line;
};

/// Receives reports; what it throws is dropped. It may report and call `SetSink`; no lock is held
/// meanwhile. Empty: reports are dropped.
using ReportSink = std::function<void(const Report&)>;

class Logger {
 public:
  /// Hands an event to the sink. Never fails.
  static void LogEvent(const std::string& message, const std::string& sourceFile,
                       unsigned int line);

  /// Replaces the sink; call before work starts. \returns the one replaced
  static ReportSink SetSink(ReportSink sink);
};

}  // namespace orin::tarn
