/// Makes the kernel of a method for the type dispatch.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/rasterresampler.h"

namespace orin::resamplers {

/// `DispatchType<PixelTypes, ResamplerPolicy<Method>::Factory>::Dispatch(type)` is a new
/// `Method<T>` for blocks of `type`, owned by the caller.
template <template <class> class Method>
struct ResamplerPolicy {
  template <class T>
  struct Factory {
    static IRasterResampler* Create() { return new Method<T>; }
  };
};

}  // namespace orin::resamplers
