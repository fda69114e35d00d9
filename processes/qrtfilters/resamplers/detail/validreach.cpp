// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/detail/validreach.h"

#include <algorithm>

#include "basic/gobs/outofmemory.h"
#include "processes/qrtfilters/resamplers/detail/axismapping.h"

namespace orin::resamplers::detail {
namespace {

/// Source pixels first .. last along one axis; none when last is below first.
struct Reach {
  int64_t first;
  int64_t last;
};

Reach ReachOf(uint32_t i, double ratio, uint32_t reach, const BufferRange& range) {
  const int64_t start = ToInt32(std::floor(i / ratio));
  const int64_t end = ToInt32(std::ceil((i + 1.0) / ratio));
  return {std::max(start - reach, range.first),
          std::min(std::max(start, end - 1) + reach, range.last)};
}

}  // namespace

std::unique_ptr<gobs::Mask> ValidWithinReach(const gobs::Mask& srcMask, const gobs::Raster& dst,
                                             double ratioX, double ratioY, uint32_t reach) {
  auto validity = std::make_unique<gobs::Mask>(dst.width, dst.height, dst.Window());
  const BufferRange columns = RangeOf(srcMask.width, srcMask.marginX);
  const BufferRange rows = RangeOf(srcMask.height, srcMask.marginY);
  Scratch<uint8_t> isValid(srcMask.stride);  // of a source column, in the rows within reach
  for (uint32_t y = 0; y < dst.height; ++y) {
    std::fill(isValid.begin(), isValid.end(), uint8_t{0});
    const Reach down = ReachOf(y, ratioY, reach, rows);
    for (int64_t row = down.first; row <= down.last; ++row)
      for (int64_t column = columns.first; column <= columns.last; ++column)
        isValid[column - columns.first] |= srcMask.IsValid(column, row) ? 1 : 0;
    for (uint32_t x = 0; x < dst.width; ++x) {
      const Reach across = ReachOf(x, ratioX, reach, columns);
      const auto begin = isValid.begin() - columns.first;
      if (across.first > across.last ||
          std::find(begin + across.first, begin + across.last + 1, 1) == begin + across.last + 1)
        validity->ClearRun(x, y, 1);
    }
  }
  return validity;
}

}  // namespace orin::resamplers::detail
