/// Makes a method's kernel for a block's data type, on the processing target that is asked for.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/core/typedispatch/dispatchtype.h"
#include "processes/qrtfilters/resamplers/resamplerpolicy.h"

namespace orin::resamplers::detail {

/// True when kernels run here. Deliberate: no other target exists, and asking for one gives no
/// resampler. Says so on standard output when `ORIN_TARGET` asks for the GPU.
bool RunsOnCpu();

/// All that a factory's `CreateResampler` does; the result is the caller's.
template <template <class> class Method>
IRasterResampler* CreateKernel(const gobs::DataType& type) {
  if (!RunsOnCpu()) return nullptr;
  return typedispatch::DispatchType<typedispatch::PixelTypes,
                                    ResamplerPolicy<Method>::template Factory>::Dispatch(type);
}

}  // namespace orin::resamplers::detail
