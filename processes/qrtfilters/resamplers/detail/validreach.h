/// The validity of a computed block whose kernel does not tell where it filled.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"

namespace orin::resamplers::detail {

/// No data is each pixel that has no valid source pixel within the kernel's reach: under it, or up
/// to `reach` pixels around. So a computed value is never taken for no data.
/// \param ratioX, ratioY  destination size / source size
std::unique_ptr<gobs::Mask> ValidWithinReach(const gobs::Mask& srcMask, const gobs::Raster& dst,
                                             double ratioX, double ratioY, uint32_t reach);

}  // namespace orin::resamplers::detail
