/// Rasters of memory drawn as pictures, and seeded noise.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstring>
#include <random>
#include <vector>

#include "host/drivers/memory/memorydriver.h"

namespace orin::testing {

/// One channel whose rows are given; the rows are of one length.
template <class T>
drivers::MemoryChannel ChannelOf(const std::vector<std::vector<T>>& rows) {
  drivers::MemoryChannel channel{gobs::DataTypeOf<T>(), {}, {}};
  for (const std::vector<T>& row : rows) {
    const size_t before = channel.samples.size();
    channel.samples.resize(before + row.size() * sizeof(T));
    std::memcpy(channel.samples.data() + before, row.data(), row.size() * sizeof(T));
  }
  return channel;
}

/// A one-channel raster whose rows are given.
template <class T>
drivers::MemoryRaster PictureOf(const std::vector<std::vector<T>>& rows) {
  drivers::MemoryRaster raster;
  raster.width = static_cast<unsigned>(rows.front().size());
  raster.height = static_cast<unsigned>(rows.size());
  raster.channels.push_back(ChannelOf(rows));
  return raster;
}

/// A raster of random bytes; the same for the same arguments.
inline drivers::MemoryRaster NoiseOf(unsigned width, unsigned height, unsigned channels,
                                     const gobs::DataType& type = gobs::eDT_8U, unsigned seed = 1) {
  std::mt19937 random(seed);
  drivers::MemoryRaster raster;
  raster.width = width;
  raster.height = height;
  for (unsigned c = 0; c < channels; ++c) {
    drivers::MemoryChannel channel{type, {}, {}};
    channel.samples.resize(size_t{width} * height * BytesPerComponent(type) *
                           ComponentsPerSample(type));
    for (unsigned char& byte : channel.samples) byte = static_cast<unsigned char>(random());
    raster.channels.push_back(std::move(channel));
  }
  return raster;
}

}  // namespace orin::testing
