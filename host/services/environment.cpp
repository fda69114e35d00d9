// SPDX-License-Identifier: MIT
#include "host/services/environment.h"

#include <cstdlib>

std::string orin::core::QRTGetEnvironmentVariable(const std::string& name) {
  const char* value = std::getenv(name.c_str());
  return value ? value : "";
}
