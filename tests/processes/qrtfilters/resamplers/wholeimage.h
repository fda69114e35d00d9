/// An image from which blocks are cut as a pyramid is built: neighbours in the margins, edges
/// repeated.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <utility>
#include <vector>

#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "tests/testing/randomvalues.h"
#include "tests/testing/rasterbuilder.h"

namespace orin::testing {

/// Pixels and their validity.
template <class T>
struct Image {
  uint32_t width, height, channels;
  std::vector<T> values;
  std::vector<bool> valid;

  size_t Nearest(int64_t x, int64_t y) const {
    x = std::clamp<int64_t>(x, 0, width - 1);
    y = std::clamp<int64_t>(y, 0, height - 1);
    return static_cast<size_t>(y * width + x);
  }
};

template <class T>
Image<T> RandomImage(uint32_t width, uint32_t height, uint32_t channels, Values kind,
                     uint64_t seed) {
  Random random(seed);
  Image<T> image{width, height, channels, {}, {}};
  image.values.resize(size_t{width} * height * channels);
  FillRandomly(random, kind, image.values.data(), image.values.size());
  for (size_t i = 0; i < size_t{width} * height; ++i) image.valid.push_back(!random.OneIn(4));
  return image;
}

/// A part of a level, in pixels of that level.
struct Window {
  uint32_t x, y, width, height;
};

template <class T>
TestRaster<T> Cut(const Image<T>& image, const Window& w, uint32_t margin) {
  TestRaster<T> block({w.width, w.height, margin, margin}, image.channels);
  const auto m = static_cast<int64_t>(margin);
  for (int64_t y = -m; y < w.height + m; ++y)
    for (int64_t x = -m; x < w.width + m; ++x)
      std::copy_n(&image.values[image.Nearest(w.x + x, w.y + y) * image.channels], image.channels,
                  &block.At(x, y));
  return block;
}

template <class T>
TestMask CutMask(const Image<T>& image, const Window& w, uint32_t margin) {
  Rows<int> rows;
  const auto m = static_cast<int64_t>(margin);
  for (int64_t y = -m; y < w.height + m; ++y) {
    rows.emplace_back();
    for (int64_t x = -m; x < w.width + m; ++x)
      rows.back().push_back(image.valid[image.Nearest(w.x + x, w.y + y)] ? 1 : 0);
  }
  return MaskOf(rows, margin, margin);
}

/// One level is made of another: the levels' factors.
struct Step {
  uint32_t source, target;

  double Ratio() const { return static_cast<double>(source) / target; }
};

/// The pixels of `out`, a window of the target level, made of the image, which is the source level.
/// \pre  out.x and out.y lie on whole source pixels
template <class T>
TestRaster<T> MakeBlock(resamplers::IResamplerFactory& factory, const Image<T>& image, bool masked,
                        const Step& step, const Window& out) {
  const auto upwards = [&](uint32_t size) {
    return (size * step.target + step.source - 1) / step.source;
  };
  const Window in{out.x * step.target / step.source, out.y * step.target / step.source,
                  upwards(out.width), upwards(out.height)};
  const uint32_t margin = factory.GetMargin();
  TestRaster<T> src = Cut(image, in, margin);
  TestRaster<T> dst({out.width, out.height, 0, 0}, image.channels);
  const std::unique_ptr<IRasterResampler> resampler(
      factory.CreateResampler(gobs::DataTypeOf<T>(false)));
  resampler->SetRatio(step.Ratio(), step.Ratio());
  resampler->SetNoDataValue(7);
  if (masked) {
    TestMask mask = CutMask(image, in, margin);
    resampler->Resample(src.Get(), mask.Get(), dst.Get());
  } else {
    resampler->Resample(src.Get(), nullptr, dst.Get());
  }
  return dst;
}

/// The whole target level, made in blocks of at most `blockWidth` by `blockHeight` pixels.
template <class T>
std::vector<T> MakeLevel(resamplers::IResamplerFactory& factory, const Image<T>& image, bool masked,
                         const Step& step, uint32_t blockWidth, uint32_t blockHeight) {
  const uint32_t width = image.width * step.source / step.target;
  const uint32_t height = image.height * step.source / step.target;
  std::vector<T> level(size_t{width} * height * image.channels);
  for (uint32_t y = 0; y < height; y += blockHeight)
    for (uint32_t x = 0; x < width; x += blockWidth) {
      const Window out{x, y, std::min(blockWidth, width - x), std::min(blockHeight, height - y)};
      TestRaster<T> block = MakeBlock(factory, image, masked, step, out);
      for (uint32_t row = 0; row < out.height; ++row)
        std::copy_n(&block.At(0, row), out.width * image.channels,
                    &level[(size_t{y + row} * width + x) * image.channels]);
    }
  return level;
}

}  // namespace orin::testing
