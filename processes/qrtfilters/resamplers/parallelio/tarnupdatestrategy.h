/// Turns the driver's block fractions into progress calls to the host.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/services/statusmanager.h"

namespace orin::parallelio {

class TARNUpdateStrategy : public logging::IAlgorithmStatusManager {
 public:
  /// Takes the fraction of the whole run, a message or null, and the user pointer; 0 means stop.
  using Callback = int (*)(double fraction, const char* message, void* userData);

  bool IsCancelled() const override { return cancelled; }
  void Update(float fraction, const std::string& message) override;
  void Update(float fraction) override;
  void SetRange(float rangeStart, float rangeEnd) override {
    start = rangeStart;
    end = rangeEnd;
  }
  void SetEnabled(bool on) override { enabled = on; }
  float GetStart() const override { return start; }
  float GetEnd() const override { return end; }

  float start = 0.0f;  ///< of the whole run, where this level begins
  float end = 1.0f;
  bool enabled = true;
  bool cancelled = false;       ///< never reset
  Callback callback = nullptr;  ///< null: the host's counter
  void* userData = nullptr;

 private:
  void Report(float fraction, const std::string* message);
};

}  // namespace orin::parallelio
