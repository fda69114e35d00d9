/// Blocks drawn as pictures, for the tests of the resamplers.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <vector>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/rasterresampler.h"

namespace orin::resamplers::testing {

/// Lines of samples; the channels of a pixel, and the components of a sample, follow each other.
template <class T>
using Picture = std::vector<std::vector<T>>;

struct Shape {
  uint32_t channels = 1;
  uint32_t marginX = 0;
  uint32_t marginY = 0;
  bool isComplex = false;
};

/// Values of T that a pixel of this shape takes.
inline uint32_t Components(const Shape& shape) {
  return shape.channels * (shape.isComplex ? 2 : 1);
}

template <class T>
std::unique_ptr<gobs::Raster> EmptyBlock(uint32_t width, uint32_t height, const Shape& shape,
                                         T fill) {
  const gobs::RasterInfo info(width, height, shape.channels, gobs::DataTypeOf<T>(shape.isComplex));
  auto block = std::make_unique<gobs::Raster>(
      info, parallelio::ProcessWindow{shape.marginX, shape.marginY, 0, 0});
  std::fill_n(reinterpret_cast<T*>(block->data), block->byteSize / sizeof(T), fill);
  return block;
}

/// A block with this useful area; its margin repeats the nearest pixel.
template <class T>
std::unique_ptr<gobs::Raster> BlockOf(const Picture<T>& picture, const Shape& shape = {}) {
  const int64_t n = Components(shape);
  const auto height = static_cast<int64_t>(picture.size());
  const auto width = static_cast<int64_t>(picture.front().size()) / n;
  auto block =
      EmptyBlock<T>(static_cast<uint32_t>(width), static_cast<uint32_t>(height), shape, T{});
  const auto view = gobs::ViewOf<T>(*block, shape.isComplex ? 2 : 1);
  for (int64_t y = -int64_t{shape.marginY}; y < height + shape.marginY; ++y)
    for (int64_t x = -int64_t{shape.marginX}; x < width + shape.marginX; ++x)
      for (int64_t k = 0; k < n; ++k) {
        const auto& line = picture[static_cast<size_t>(std::clamp<int64_t>(y, 0, height - 1))];
        view.At(x, y)[k] = line[static_cast<size_t>(std::clamp<int64_t>(x, 0, width - 1) * n + k)];
      }
  return block;
}

/// The useful area of a block.
template <class T>
Picture<T> PictureOf(const gobs::Raster& block) {
  const uint32_t perSample = gobs::ComponentsPerSample(block.dataType);
  const auto view = gobs::ViewOf<T>(block, perSample);
  Picture<T> picture;
  for (uint32_t y = 0; y < block.height; ++y) {
    const T* line = view.At(0, y);
    picture.emplace_back(line, line + uint64_t{block.width} * view.components);
  }
  return picture;
}

/// A mask of the geometry of `block`, drawn over the useful area: 'x' is no data, all else is
/// valid. The margin is valid.
inline std::unique_ptr<gobs::Mask> MaskOf(const gobs::Raster& block,
                                          const std::vector<const char*>& picture) {
  auto mask = std::make_unique<gobs::Mask>(block.width, block.height, block.Window());
  for (uint32_t y = 0; y < block.height; ++y)
    for (uint32_t x = 0; x < block.width; ++x) mask->SetValid(x, y, picture[y][x] != 'x');
  return mask;
}

/// A mask of the geometry of `block` with every bit, margins included, clear.
inline std::unique_ptr<gobs::Mask> ClearMaskOf(const gobs::Raster& block) {
  auto mask = std::make_unique<gobs::Mask>(block.width, block.height, block.Window());
  std::fill(mask->begin, mask->end, uint8_t{0});
  return mask;
}

/// What `kernel` makes of `src`, in a new block of `width` by `height` pixels with other margins.
template <class T>
Picture<T> Resampled(IRasterResampler& kernel, gobs::Raster& src, gobs::Mask* mask, uint32_t width,
                     uint32_t height) {
  const Shape shape{src.channelCount, 2, 1, src.dataType.isComplex};
  const auto dst = EmptyBlock<T>(width, height, shape, T{77});
  kernel.Resample(&src, mask, dst.get());
  return PictureOf<T>(*dst);
}

}  // namespace orin::resamplers::testing
