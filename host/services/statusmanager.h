/// The interface through which an algorithm reports progress and learns of a cancellation.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace orin::logging {

class IAlgorithmStatusManager {
 public:
  /// True once a report was refused below the end of the whole run.
  virtual bool IsCancelled() const = 0;
  /// Reports `fraction` (0.0 to 1.0 of this algorithm's range) with a status text.
  virtual void Update(float fraction, const std::string& message) = 0;
  /// Reports `fraction` (0.0 to 1.0 of this algorithm's range).
  virtual void Update(float fraction) = 0;
  /// Sets the part of the whole run, 0.0 to 1.0, that this algorithm's fractions map into.
  virtual void SetRange(float start, float end) = 0;
  /// Switches reporting on or off; off also means that nothing can cancel.
  virtual void SetEnabled(bool enabled) = 0;
  virtual float GetStart() const = 0;
  virtual float GetEnd() const = 0;
  virtual ~IAlgorithmStatusManager() = default;
};

}  // namespace orin::logging
