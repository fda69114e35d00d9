// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/parallelio/resampleraccesspolicy.h"

namespace orin::parallelio {
namespace {

struct Span {
  uint32_t begin;
  uint32_t length;
};

/// Deliberate: quotients are truncated, never rounded.
Span SourceSpan(uint32_t begin, uint32_t length, double ratio, uint32_t limit) {
  const auto sourceBegin = static_cast<uint32_t>(begin / ratio);
  auto sourceLength = static_cast<uint32_t>(length / ratio);
  if (uint64_t{sourceBegin} + sourceLength > limit) sourceLength = limit - sourceBegin;
  return {sourceBegin, sourceLength};
}

}  // namespace

gobs::RasterInfo ResamplerAccessPolicy::InputOf(const gobs::RasterInfo& output,
                                                const ProcessWindow& window,
                                                ProcessWindow& position) const {
  const Span x = SourceSpan(window.x, output.width, xRatio, sourceWidth);
  const Span y = SourceSpan(window.y, output.height, yRatio, sourceHeight);
  position = {window.marginX, window.marginY, x.begin, y.begin};
  return {x.length, y.length, output.channelCount, output.dataType};
}

}  // namespace orin::parallelio
