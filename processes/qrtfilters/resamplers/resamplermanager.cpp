// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/resamplermanager.h"

#include <algorithm>
#include <cstring>
#include <memory>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::resamplers {
namespace {

constexpr char kSource[] = "processes/qrtfilters/resamplers/resamplermanager";
constexpr char kProcessBlock[] =
    "void orin::resamplers::ResamplerManager::ProcessBlock(orin::gobs::Raster*, "
    "orin::gobs::Raster*)";

}  // namespace

ResamplerManager::~ResamplerManager() { delete resampler; }

void ResamplerManager::ProcessBlock(gobs::Raster* in, gobs::Raster* out) {
  if (!factory)
    throw Exception(N_("The ResamplerManager has not been setup correctly. Ensure the "
                       "IResamplerFactory has been "
                       "set for the ResamplerManager before proceeding."),
                    kSource, kProcessBlock, 37);
  if (!resampler || !(in->dataType == dataType)) RenewKernel(in->dataType);
  const std::unique_ptr<gobs::Mask> mask(maskBuilder ? maskBuilder->BuildMask(*in) : nullptr);
  resampler->Resample(in, mask.get(), out);
  if (mask && in->validity) FindFilled(*in, *mask, *out);
}

/// Runs the method once more over pixels of 255, so that a fill of 0 tells. Deliberate: two
/// channels stand for more, but never one, of which methods make an exception; nor is a complex
/// sample replaced by a real one.
void ResamplerManager::FindFilled(const gobs::Raster& in, gobs::Mask& mask,
                                  gobs::Raster& out) const {
  out.validity = std::make_unique<gobs::Mask>(out.width, out.height, out.Window());
  const bool hasSource = in.width != 0 && in.height != 0 && xRatio <= 1 && yRatio <= 1;
  if (const auto uniform = mask.Uniform(); uniform && hasSource) {  // as most blocks are
    for (uint32_t y = 0; y < out.height && !*uniform; ++y) out.validity->ClearRun(0, y, out.width);
    return;
  }
  const gobs::DataType bytes = gobs::DataTypeOf<uint8_t>(in.dataType.isComplex);
  const uint32_t channels = std::min(in.channelCount, 2u);
  gobs::Raster constant({in.width, in.height, channels, bytes}, in.Window());
  gobs::Raster filled({out.width, out.height, channels, bytes}, out.Window());
  std::memset(constant.data, 255, constant.byteSize);
  const std::unique_ptr<IRasterResampler> kernel(factory->CreateResampler(bytes));
  Configure(*kernel, 0.0);
  kernel->Resample(&constant, &mask, &filled);
  for (uint32_t y = 0; y < out.height; ++y) {
    const uint8_t* pixel = PixelAddress(filled, 0, y);
    for (uint32_t x = 0; x < out.width; ++x, pixel += PixelBytes(filled))
      if (*pixel == 0) out.validity->ClearRun(x, y, 1);
  }
}

void ResamplerManager::RenewKernel(const gobs::DataType& type) {
  // Deliberate: the recorded type stays empty, so that every block gets a kernel of its own, and
  // the kernel that is replaced is not released.
  resampler = factory->CreateResampler(type);
  if (!resampler)
    throw Exception(
        _("There is no resampler for the processing target that ORIN_TARGET names. Unset "
          "it, or set it to CPU."),
        kSource, kProcessBlock, 0);
  Configure(*resampler, noDataValue);
}

void ResamplerManager::Configure(IRasterResampler& kernel, double fill) const {
  kernel.SetRatio(xRatio, yRatio);
  kernel.SetNoDataValue(fill);
  kernel.SetComplex(complex);
}

}  // namespace orin::resamplers
