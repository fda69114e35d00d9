/// One output block and the source block that it is computed from.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/processwindow.h"
#include "basic/gobs/raster.h"

namespace orin::parallelio {

struct BlockJob {
  gobs::RasterInfo inputInfo;
  gobs::RasterInfo outputInfo;
  ProcessWindow inputWindow;   ///< in the source raster
  ProcessWindow outputWindow;  ///< in the output raster
  gobs::Raster* raster =
      nullptr;  ///< owned by the driver: the input block once read, then the output block
};

}  // namespace orin::parallelio
