// SPDX-License-Identifier: MIT
#include "basic/gobs/raster.h"

#include <limits>

#include "basic/gobs/blockmemory.h"
#include "basic/gobs/mask/mask.h"
#include "host/services/exception.h"

namespace orin::gobs {
namespace {

RasterContext ContextOf(const RasterInfo& info, const parallelio::ProcessWindow& window) {
  const uint64_t stride = uint64_t{info.width} + 2 * uint64_t{window.marginX};
  const uint64_t lines = uint64_t{info.height} + 2 * uint64_t{window.marginY};
  constexpr uint64_t kLimit = std::numeric_limits<uint32_t>::max();
  const uint64_t pixelBytes = PixelBytes(info);
  const bool fits = stride <= kLimit && lines <= kLimit &&
                    (stride == 0 || lines == 0 || pixelBytes <= kLimit / stride / lines);
  if (!fits)
    throw DataException(
        N_("A block of 4 GiB or more would be needed to compute this level at once. Request a "
           "level between it and the one that it is computed from."),
        "basic/gobs/raster",
        "orin::gobs::Raster::Raster(const orin::gobs::RasterInfo&, "
        "const orin::parallelio::ProcessWindow&)",
        0);
  RasterContext context;
  context.marginX = window.marginX;
  context.marginY = window.marginY;
  context.x = window.x;
  context.y = window.y;
  context.stride = static_cast<uint32_t>(stride);
  context.bufferLines = static_cast<uint32_t>(lines);
  context.byteSize = static_cast<uint32_t>(pixelBytes * stride * lines);
  return context;
}

}  // namespace

Raster::Raster(const RasterInfo& info, const parallelio::ProcessWindow& window)
    : RasterInfo(info), RasterContext(ContextOf(info, window)) {
  data = static_cast<uint8_t*>(AllocateBlock(byteSize));
  ownsData = true;
}

Raster::Raster(const RasterInfo& info, const parallelio::ProcessWindow& window, uint8_t* buffer)
    : RasterInfo(info), RasterContext(ContextOf(info, window)) {
  data = buffer;
}

Raster::~Raster() {
  if (ownsData) ReleaseBlock(data, byteSize);
}

}  // namespace orin::gobs
