// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/resamplermanager.h"

#include <memory>

#include "host/services/exception.h"
#include "host/services/text.h"
#include "processes/qrtfilters/resamplers/detail/validreach.h"

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
  const bool keepsValidity = mask && in->validity;
  if (keepsValidity) out->validity.reset();
  resampler->Resample(in, mask.get(), out);
  if (keepsValidity && !out->validity)  // a kernel that does not tell where it filled
    out->validity = detail::ValidWithinReach(*mask, *out, xRatio, yRatio, resampler->GetMargin());
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
  resampler->SetRatio(xRatio, yRatio);
  resampler->SetNoDataValue(noDataValue);
  resampler->SetComplex(complex);
}

}  // namespace orin::resamplers
