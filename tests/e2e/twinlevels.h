/// The levels of a picture as the slow twins make them, each from the level that a run would take.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <map>
#include <numeric>
#include <optional>
#include <vector>

#include "processes/overviews/resampletype.h"
#include "tests/e2e/tiffpicture.h"
#include "tests/reference/average.h"
#include "tests/reference/bicubic.h"
#include "tests/reference/bilinear.h"
#include "tests/reference/mode.h"
#include "tests/reference/nearest.h"

namespace orin::testing {

/// What a pass is told.
struct Pass {
  QRTOverviewResampleType method;
  std::optional<double> noData;
};

/// One level made from another; 1 is the image.
struct LevelStep {
  unsigned source, target;

  double Ratio() const { return double(source) / target; }
  /// A step between levels that do not divide is computed in blocks of one size, because a position
  /// such as 1 / 0.75 is rounded; every other step is computed at a stretch here.
  uint32_t BlockEdge() const {
    if (target % source == 0) return UINT32_MAX;
    const uint32_t unit = source / std::gcd(source, target);
    return (256 + unit - 1) / unit * unit;
  }
};

/// A part of a picture.
struct Area {
  uint32_t x, y, width, height;
};

constexpr int64_t kTwinMargin = 3;  ///< pixels; enough for every method

/// The area and its margin: neighbours inside the picture, the edge repeated outside.
template <class T>
std::vector<T> CutWithMargin(const Picture<T>& picture, const Area& area) {
  std::vector<T> values;
  for (int64_t y = -kTwinMargin; y < area.height + kTwinMargin; ++y)
    for (int64_t x = -kTwinMargin; x < area.width + kTwinMargin; ++x) {
      const T* from = picture.At(std::clamp<int64_t>(area.x + x, 0, picture.width - 1),
                                 std::clamp<int64_t>(area.y + y, 0, picture.height - 1));
      values.insert(values.end(), from, from + picture.PerPixel());
    }
  return values;
}

/// One bit a pixel, clear where all channels equal the no-data value.
template <class T>
std::vector<uint8_t> ValidBits(const std::vector<T>& values, size_t perPixel, double noData) {
  std::vector<uint8_t> bits(values.size() / perPixel / 8 + 1, 0xFF);
  for (size_t pixel = 0; pixel < values.size() / perPixel; ++pixel) {
    const auto first = values.begin() + static_cast<int64_t>(pixel * perPixel);
    const bool isNoData =
        std::all_of(first, first + static_cast<int64_t>(perPixel),
                    [noData](T value) { return static_cast<double>(value) == noData; });
    if (isNoData) bits[pixel / 8] &= static_cast<uint8_t>(~(128 >> pixel % 8));
  }
  return bits;
}

template <class T>
void RunTwin(QRTOverviewResampleType method, const reference::Block<T>& src,
             const reference::Bits* mask, const reference::Block<T>& dst,
             const reference::Settings& settings) {
  switch (method) {
    case ResampleNearest:
      return reference::Nearest(src, mask, dst, settings);
    case ResampleAverage:
      return reference::Average(src, mask, dst, settings);
    case ResampleMode:
      return reference::Mode(src, mask, dst, settings);
    case ResampleBilinear:
      return reference::Bilinear(src, mask, dst, settings);
    case ResampleBicubic:
      return reference::Bicubic(src, mask, dst, settings);
    default:
      FAIL() << "no such method";
  }
}

/// Makes one area of a level.
template <class T>
void MakeArea(const Picture<T>& source, const LevelStep& step, const Pass& pass, const Area& area,
              Picture<T>& level) {
  const auto atSource = [&](uint32_t length) { return length * step.target / step.source; };
  const Area from{atSource(area.x), atSource(area.y), atSource(area.width), atSource(area.height)};
  std::vector<T> in = CutWithMargin(source, from);
  std::vector<T> out(size_t{area.width} * area.height * level.PerPixel());
  const reference::Block<T> src{from.width,      from.height,       kTwinMargin, kTwinMargin,
                                source.channels, source.components, in.data()};
  const reference::Block<T> dst{area.width,     area.height,      0,         0,
                                level.channels, level.components, out.data()};
  reference::Settings settings;
  settings.ratioGiven = true;
  settings.ratioX = settings.ratioY = step.Ratio();
  settings.noDataValue = pass.noData.value_or(0);
  settings.isComplex = source.components == 2;
  const std::vector<uint8_t> bits = ValidBits(in, source.PerPixel(), pass.noData.value_or(0));
  const reference::Bits mask{from.width, from.height, kTwinMargin, kTwinMargin, bits.data()};
  RunTwin(pass.method, src, pass.noData ? &mask : nullptr, dst, settings);
  for (uint32_t y = 0; y < area.height; ++y)
    std::copy_n(&out[size_t{y} * area.width * level.PerPixel()], area.width * level.PerPixel(),
                level.At(area.x, area.y + y));
}

template <class T>
void MakeLevel(const Picture<T>& source, const LevelStep& step, const Pass& pass,
               Picture<T>& level) {
  const uint32_t edge = step.BlockEdge();
  for (uint64_t y = 0; y < level.height; y += edge)
    for (uint64_t x = 0; x < level.width; x += edge)
      MakeArea(source, step, pass,
               {uint32_t(x), uint32_t(y), std::min(edge, level.width - uint32_t(x)),
                std::min(edge, level.height - uint32_t(y))},
               level);
}

/// One channel of a picture as a picture.
template <class T>
Picture<T> ChannelOf(const Picture<T>& picture, uint32_t channel) {
  Picture<T> one(picture.width, picture.height, 1, picture.components);
  for (uint32_t y = 0; y < picture.height; ++y)
    for (uint32_t x = 0; x < picture.width; ++x)
      std::copy_n(picture.At(x, y, channel), picture.components, one.At(x, y));
  return one;
}

template <class T>
void PutChannel(const Picture<T>& one, uint32_t channel, Picture<T>& picture) {
  for (uint32_t y = 0; y < picture.height; ++y)
    for (uint32_t x = 0; x < picture.width; ++x)
      std::copy_n(one.At(x, y), picture.components, picture.At(x, y, channel));
}

/// The level that `target` is made from: the largest smaller one; for average, of those that
/// divide it.
inline unsigned SourceLevel(unsigned target, const std::vector<unsigned>& levels,
                            QRTOverviewResampleType method) {
  unsigned source = 1;
  for (const unsigned level : levels)
    if (level < target && level > source && (method != ResampleAverage || target % level == 0))
      source = level;
  return source;
}

/// All levels of an image. \param levels  ascending
/// \param channelByChannel  one pass a channel, as into a side-car; else one pass for all of them
template <class T>
std::map<unsigned, Picture<T>> TwinLevels(const Picture<T>& image,
                                          const std::vector<unsigned>& levels, const Pass& pass,
                                          bool channelByChannel) {
  std::map<unsigned, Picture<T>> made{{1, image}};
  for (const unsigned target : levels) {
    const LevelStep step{SourceLevel(target, levels, pass.method), target};
    const Picture<T>& source = made.at(step.source);
    Picture<T> level(image.width / target, image.height / target, image.channels, image.components);
    if (channelByChannel) {
      for (uint32_t channel = 0; channel < image.channels; ++channel) {
        Picture<T> one(level.width, level.height, 1, level.components);
        MakeLevel(ChannelOf(source, channel), step, pass, one);
        PutChannel(one, channel, level);
      }
    } else {
      MakeLevel(source, step, pass, level);
    }
    made.emplace(target, std::move(level));
  }
  return made;
}

}  // namespace orin::testing
