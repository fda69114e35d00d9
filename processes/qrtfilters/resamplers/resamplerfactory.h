/// Makes the resampler of one method for a pixel type that is known at run time.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

#include "basic/gobs/datatype.h"
#include "processes/qrtfilters/resamplers/rasterresampler.h"

namespace orin::resamplers {

class IResamplerFactory {
 public:
  /// A new resampler for blocks of `type`, owned by the caller; null when `ORIN_TARGET` names
  /// anything but the CPU.
  /// \throws orin::Exception  the method serves no such type
  virtual IRasterResampler* CreateResampler(const gobs::DataType& type) = 0;
  /// The margin of the method, as its resamplers report it.
  virtual uint32_t GetMargin() = 0;
  virtual ~IResamplerFactory() = default;
};

/// Makes `Kernel<T>` for blocks of any of the pixel types, real or complex. Defined where the
/// kernel is compiled.
template <template <class> class Kernel>
class KernelFactory : public IResamplerFactory {
 public:
  IRasterResampler* CreateResampler(const gobs::DataType& type) override;
  uint32_t GetMargin() override;
};

}  // namespace orin::resamplers
