/// What kernels refuse, with the texts that callers see.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "basic/core/typedispatch/pixeltypes.h"
#include "basic/gobs/raster.h"
#include "host/services/exception.h"

namespace orin::resamplers::detail {

/// \throws orin::Exception  a margin of `src` is below `margin` pixels
inline void RequireMargin(const gobs::Raster& src, uint32_t margin, const char* message) {
  if (src.marginX < margin || src.marginY < margin) throw Exception(message, "", "", 0);
}

/// \throws orin::Exception  the channel counts differ
inline void RequireSameChannels(const gobs::Raster& src, const gobs::Raster& dst) {
  if (src.channelCount != dst.channelCount)
    throw Exception(N_("Input and output rasters must have an equal number of channels. Aborting."),
                    "", "", 0);
}

/// Signature text of a member of `Kernel<T>` that returns nothing.
/// \param member  name and parameter types, such as "SetComplex(bool)"
template <class T>
std::string SignatureOf(const char* kernel, const char* member) {
  return std::string("void orin::resamplers::") + kernel + "<" + typedispatch::PixelTypeName<T>() +
         ">::" + member;
}

}  // namespace orin::resamplers::detail
