// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/detail/createkernel.h"

#include <algorithm>
#include <iostream>
#include <string>

#include "host/services/environment.h"

namespace orin::resamplers::detail {
namespace {

/// The processing target that the environment asks for, in upper case; empty when it asks for none.
std::string RequestedTarget() {
  std::string target = core::QRTGetEnvironmentVariable("ORIN_TARGET");
  std::transform(target.begin(), target.end(), target.begin(),
                 [](char c) { return c >= 'a' && c <= 'z' ? char(c - 'a' + 'A') : c; });
  return target;
}

}  // namespace

bool RunsOnCpu() {
  const std::string target = RequestedTarget();
  if (target == "GPU") std::cout << "Using the GPU!" << std::endl;
  return target.empty() || target == "CPU";
}

}  // namespace orin::resamplers::detail
