/// Makes a method's kernels, on the processing target that is asked for, and its factory.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "basic/core/typedispatch/dispatchtype.h"
#include "host/model/methods.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "processes/qrtfilters/resamplers/resamplerpolicy.h"

namespace orin::resamplers::detail {

/// True when kernels run here. Deliberate: no other target exists, and asking for one gives no
/// resampler. Says so on standard output when `ORIN_TARGET` asks for the GPU.
bool RunsOnCpu();

/// A new factory of the method `kType`; defined in the source of the method's kernel.
template <QRTOverviewResampleType kType>
std::unique_ptr<IResamplerFactory> NewFactory();

}  // namespace orin::resamplers::detail

namespace orin::resamplers {

template <template <class> class Kernel>
IRasterResampler* KernelFactory<Kernel>::CreateResampler(const gobs::DataType& type) {
  if (!detail::RunsOnCpu()) return nullptr;
  return typedispatch::DispatchType<typedispatch::PixelTypes,
                                    ResamplerPolicy<Kernel>::template Factory>::Dispatch(type);
}

template <template <class> class Kernel>
uint32_t KernelFactory<Kernel>::GetMargin() {
  return Kernel<uint8_t>().GetMargin();
}

}  // namespace orin::resamplers
