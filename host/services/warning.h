/// Warnings to the user; an application installs the sink.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/services/logger.h"

namespace orin::tarn {

class Warning {
 public:
  /// Hands a warning to the sink; the run goes on.
  static void Warn(const std::string& message, const std::string& sourceFile, unsigned int line);

  /// Replaces the sink; call before work starts. \returns the one replaced
  static ReportSink SetSink(ReportSink sink);
};

}  // namespace orin::tarn
