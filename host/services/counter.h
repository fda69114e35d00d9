/// Progress of a run, and the user's wish to stop it; an application installs the sink.
// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <string>

namespace orin::tarn {

/// Receives the fraction done, from 0.0 to 1.0 whatever was reported, and a status text, null when
/// none is given. It may report and call `SetSink`; no lock is held meanwhile. What it throws
/// passes to the caller of `Update`, but for a fraction of 1.0: then all is done, and it is
/// dropped.
/// \returns false when the user asks to stop
using ProgressSink = std::function<bool(float fraction, const std::string* message)>;

class Counter {
 public:
  /// Reports progress. \returns false when the user asks to stop; true when no sink is installed
  static bool Update(float fraction);
  /// The same with a status text. `context` is kept for the host and always null.
  static bool Update(float fraction, const std::string& message, void* context);

  /// Replaces the sink; call before work starts. \returns the one replaced
  static ProgressSink SetSink(ProgressSink sink);
};

}  // namespace orin::tarn
