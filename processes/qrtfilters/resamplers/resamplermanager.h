/// Turns one input block into one output block with the kernel of the chosen method.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/datatype.h"
#include "basic/gobs/mask/maskdecision.h"
#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/rasterresampler.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"

namespace orin::resamplers {

/// The processing policy of the block driver. Filled by its owner before the first block.
class ResamplerManager {
 public:
  ResamplerManager() = default;
  ResamplerManager(const ResamplerManager&) = delete;
  ResamplerManager& operator=(const ResamplerManager&) = delete;
  /// Destroys the current kernel; the factory and the mask builder are their owner's.
  virtual ~ResamplerManager();

  /// Resamples `in`, which carries the margin that the kernel needs, into `out`; both stay the
  /// caller's. Where `in` carries a validity and there is a mask builder, `out` gets one, too: no
  /// data exactly where the kernel wrote the no-data value for want of valid pixels. Of a kernel
  /// that leaves `out` without a validity that is not known; then no data is what has no valid
  /// source pixel under it nor within the kernel's margin around that.
  /// \throws orin::Exception  there is no factory, or it gives no kernel; what the factory,
  ///                          the kernel and the mask builder throw passes through
  void ProcessBlock(gobs::Raster* in, gobs::Raster* out);

  IResamplerFactory* factory = nullptr;   ///< not owned
  IRasterResampler* resampler = nullptr;  ///< the current kernel; owned
  gobs::DataType dataType;                ///< recorded for kernel reuse; never set by the library
  double xRatio = 1.0;                    ///< output size / input size
  double yRatio = 1.0;
  gobs::MaskDecisionBuilder* maskBuilder = nullptr;  ///< not owned; null: no mask
  double noDataValue = 0.0;
  bool complex = false;  ///< every sample holds two components

 private:
  void RenewKernel(const gobs::DataType& type);
};

}  // namespace orin::resamplers
