/// Reads windows and compares every sample of the buffer with the pattern that was written.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <functional>
#include <numeric>
#include <string>
#include <vector>

#include "host/drivers/tiff/pixelreader.h"
#include "tests/host/drivers/tiff/testimage.h"

namespace orin::tests {

using ExpectedSample =
    std::function<std::vector<uint8_t>(uint32_t x, uint32_t y, uint32_t channel)>;

/// First sample of the block's buffer that differs from `expected`, told in words; empty when none
/// does.
inline std::string FirstDifference(const gobs::Raster& block, const drivers::PixelFormat& format,
                                   const std::vector<unsigned>& channels,
                                   const ExpectedSample& expected) {
  const uint64_t bytes = format.SampleBytes();
  for (uint32_t row = 0; row < block.bufferLines; ++row)
    for (uint32_t column = 0; column < block.stride; ++column)
      for (uint64_t c = 0; c < channels.size(); ++c) {
        const int64_t x =
            std::clamp<int64_t>(int64_t{block.x} + column - block.marginX, 0, format.width - 1);
        const int64_t y =
            std::clamp<int64_t>(int64_t{block.y} + row - block.marginY, 0, format.height - 1);
        const auto sample = expected(uint32_t(x), uint32_t(y), channels[c] - 1);
        const uint64_t at = ((uint64_t{row} * block.stride + column) * channels.size() + c) * bytes;
        if (std::memcmp(sample.data(), block.data + at, bytes) != 0)
          return "pixel (" + std::to_string(x) + ", " + std::to_string(y) + ") of channel " +
                 std::to_string(channels[c]);
      }
  return "";
}

inline std::vector<unsigned> AllChannels(unsigned count) {
  std::vector<unsigned> channels(count);
  std::iota(channels.begin(), channels.end(), 1);
  return channels;
}

/// Reads one window and names the first wrong sample.
inline std::string WrongSample(drivers::PixelReader& reader, const std::vector<unsigned>& channels,
                               const parallelio::ProcessWindow& window, uint32_t width,
                               uint32_t height, const ExpectedSample& expected) {
  gobs::Raster block({width, height, uint32_t(channels.size()), reader.Format().type}, window);
  std::memset(block.data, 0xA5, block.byteSize);
  reader.Read(block);
  return FirstDifference(block, reader.Format(), channels, expected);
}

/// The whole image in rows of blocks with a margin, then its middle by itself.
inline std::string WrongSample(const std::string& file, const Layout& layout,
                               const std::vector<unsigned>& channels, uint32_t edge = 13) {
  drivers::PixelReader reader(file, 0, channels);
  const ExpectedSample expected = [&](uint32_t x, uint32_t y, uint32_t channel) {
    return SampleAt(layout, x, y, channel);
  };
  for (uint32_t y = 0; y < layout.height; y += edge)
    for (uint32_t x = 0; x < layout.width; x += edge) {
      const uint32_t width = std::min(edge, layout.width - x);
      const uint32_t height = std::min(edge, layout.height - y);
      std::string wrong = WrongSample(reader, channels, {3, 2, x, y}, width, height, expected);
      if (!wrong.empty()) return wrong;
    }
  return WrongSample(reader, channels, {0, 0, 0, 0}, layout.width, layout.height, expected);
}

}  // namespace orin::tests
