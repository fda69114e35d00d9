// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/parallelio/tarnupdatestrategy.h"

#include "host/services/counter.h"

namespace orin::parallelio {

void TARNUpdateStrategy::Update(float fraction, const std::string& message) {
  Report(fraction, &message);
}

void TARNUpdateStrategy::Update(float fraction) { Report(fraction, nullptr); }

void TARNUpdateStrategy::Report(float fraction, const std::string* message) {
  if (!enabled) return;
  const float p = (end - start) * fraction + start;
  bool ok;
  if (callback) ok = callback(p, message ? message->c_str() : nullptr, userData) != 0;
  else if (message) ok = tarn::Counter::Update(p, *message, nullptr);
  else ok = tarn::Counter::Update(p);
  // Deliberate: a refusal at the very end changes nothing, all the work is done.
  if (!ok && p < 1.0f) cancelled = true;
}

}  // namespace orin::parallelio
