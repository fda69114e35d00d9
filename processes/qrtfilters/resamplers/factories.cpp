// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/factories.h"

#include <algorithm>
#include <iostream>
#include <string>

#include "host/services/environment.h"
#include "processes/qrtfilters/resamplers/average.h"
#include "processes/qrtfilters/resamplers/bicubic.h"
#include "processes/qrtfilters/resamplers/bilinear.h"
#include "processes/qrtfilters/resamplers/detail/createkernel.h"
#include "processes/qrtfilters/resamplers/mode.h"
#include "processes/qrtfilters/resamplers/nearestneighbour.h"

namespace orin::resamplers {
namespace {

/// The processing target that the environment asks for, in upper case; empty when it asks for none.
std::string RequestedTarget() {
  std::string target = core::QRTGetEnvironmentVariable("ORIN_TARGET");
  std::transform(target.begin(), target.end(), target.begin(),
                 [](char c) { return c >= 'a' && c <= 'z' ? char(c - 'a' + 'A') : c; });
  return target;
}

}  // namespace

bool detail::RunsOnCpu() {
  const std::string target = RequestedTarget();
  if (target == "GPU") std::cout << "Using the GPU!" << std::endl;
  return target.empty() || target == "CPU";
}

IRasterResampler* NearestNeighbourResamplerFactory::CreateResampler(const gobs::DataType& type) {
  return detail::CreateKernel<NearestNeighbour>(type);
}
IRasterResampler* AverageResamplerFactory::CreateResampler(const gobs::DataType& type) {
  return detail::CreateKernel<Average>(type);
}
IRasterResampler* ModeResamplerFactory::CreateResampler(const gobs::DataType& type) {
  return detail::CreateKernel<Mode>(type);
}
IRasterResampler* BilinearResamplerFactory::CreateResampler(const gobs::DataType& type) {
  return detail::CreateKernel<Bilinear>(type);
}
IRasterResampler* BicubicResamplerFactory::CreateResampler(const gobs::DataType& type) {
  return detail::CreateKernel<Bicubic>(type);
}

}  // namespace orin::resamplers
