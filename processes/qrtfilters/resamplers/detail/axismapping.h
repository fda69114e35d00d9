/// Maps destination pixels to source coordinates along one axis.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>

#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

namespace orin::resamplers::detail {

/// `v` truncated toward zero; the nearest limit where no 32-bit integer holds it, 0 for NaN.
inline int32_t ToInt32(double v) {
  using Limits = std::numeric_limits<int32_t>;
  if (v >= 2147483647.0) return Limits::max();
  if (v <= -2147483648.0) return Limits::min();
  return v == v ? static_cast<int32_t>(v) : 0;
}

/// Source pixels under one destination pixel: start .. end - 1; all in pixels of the useful area.
struct Footprint {
  int64_t start;
  int64_t centre;
  int64_t end;
};

/// The coordinates of one axis that a buffer holds: first .. last.
struct BufferRange {
  int64_t first;
  int64_t last;

  int64_t Clamp(int64_t at) const { return std::clamp(at, first, last); }
};

/// \param size    of the useful area; 0 only with a margin
/// \param margin  on either side of it
inline BufferRange RangeOf(uint32_t size, uint32_t margin) {
  return {-int64_t{margin}, int64_t{size} + int64_t{margin} - 1};
}

/// Source coordinates are in pixels; 0 is the left or top edge of the useful area's first pixel.
struct AxisMapping {
  bool georeferenced;
  double ratio;   ///< destination size / source size
  double offset;  ///< destination origin - source origin; ground units, as the two that follow
  double dstPixelSize;
  double srcPixelSize;

  /// Centre of the destination pixel `i`.
  double Centre(uint32_t i) const {
    if (georeferenced) return ((i + 0.5) * dstPixelSize + offset) / srcPixelSize;
    return (i + 0.5) / ratio;
  }

  /// Where the methods that copy a pixel look for it. Deliberate: by ground coordinates that is the
  /// centre of the destination pixel, by ratio its left or top edge.
  double Anchor(uint32_t i) const { return georeferenced ? Centre(i) : i / ratio; }

  /// What the destination pixel `i` covers, not limited to any buffer.
  Footprint Cover(uint32_t i) const {
    if (georeferenced) return {GroundPixel(i), GroundPixel(i + 0.5), GroundPixel(i + 1.0)};
    const int32_t start = ToInt32(std::floor(i / ratio));
    return {start, start, ToInt32(std::floor((i + 1.0) / ratio))};
  }

 private:
  /// Deliberate: the ground distance is cut to a whole number before it is divided.
  int32_t GroundPixel(double i) const {
    return ToInt32(ToInt32(i * dstPixelSize + offset) / srcPixelSize);
  }
};

/// The two axes of one call.
struct SourceMapping {
  AxisMapping x;
  AxisMapping y;
};

/// Ground coordinates when the state has them, else the given ratio, else that of the blocks'
/// sizes.
inline SourceMapping MappingOf(const ResamplerState& state, const gobs::RasterInfo& src,
                               const gobs::RasterInfo& dst) {
  SourceMapping mapping{
      {state.georeferenced, state.ratioX, 0, state.dstPixelSizeX, state.srcPixelSizeX},
      {state.georeferenced, state.ratioY, 0, state.dstPixelSizeY, state.srcPixelSizeY}};
  if (state.georeferenced) {
    mapping.x.ratio = state.dstPixelSizeX / state.srcPixelSizeX;
    mapping.y.ratio = state.dstPixelSizeY / state.srcPixelSizeY;
    mapping.x.offset = state.dstOriginX - state.srcOriginX;
    mapping.y.offset = state.dstOriginY - state.srcOriginY;
  } else if (!state.ratioGiven) {
    mapping.x.ratio = static_cast<double>(dst.width) / static_cast<double>(src.width);
    mapping.y.ratio = static_cast<double>(dst.height) / static_cast<double>(src.height);
  }
  return mapping;
}

}  // namespace orin::resamplers::detail
