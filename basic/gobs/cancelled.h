/// What is thrown when the user asks to stop while something other than a block driver works.
// SPDX-License-Identifier: MIT
#pragma once

#include "host/services/exception.h"

namespace orin {

/// A run that meets it ends as if a report of its own progress had been refused.
class Cancelled : public Exception {
 public:
  using Exception::Exception;
};

}  // namespace orin
