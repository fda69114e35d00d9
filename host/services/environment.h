/// The environment of the host process.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace orin::core {

/// Value of the environment variable `name`, or the empty text when it is not set.
std::string QRTGetEnvironmentVariable(const std::string& name);

}  // namespace orin::core
