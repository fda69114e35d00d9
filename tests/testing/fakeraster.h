/// A reader and writer that is all geometry: for what asks sizes and never moves a pixel.
// SPDX-License-Identifier: MIT
#pragma once

#include <utility>
#include <vector>

#include "host/datasources/rasterwriter.h"

namespace orin::testing {

/// Reads as pixels of value 0 and forgets what is written.
class FakeRaster final : public datasources::ReaderState<datasources::IRasterWriter> {
 public:
  unsigned width = 1;
  unsigned height = 1;
  unsigned channels = 1;
  gobs::DataType type = gobs::eDT_8U;
  unsigned level = 1;
  unsigned storedTileWidth = 256;
  unsigned storedTileHeight = 256;
  datasources::AuxiliaryData metadata;

  unsigned GetWidth() const override { return width; }
  unsigned GetHeight() const override { return height; }
  unsigned GetChannelCount() const override { return channels; }
  const gobs::DataType& GetDataType() const override { return type; }
  unsigned GetLevel() const override { return level; }
  datasources::AuxiliaryData GetAuxiliaryData() const override { return metadata; }
  std::vector<unsigned> GetChannelsInfo() const override {
    std::vector<unsigned> numbers;
    for (unsigned c = 1; c <= channels; ++c) numbers.push_back(c);
    return numbers;
  }
  void Read(gobs::Raster& block) override { std::fill_n(block.data, block.byteSize, uint8_t{0}); }
  void Write(const gobs::Raster&) override {}

 protected:
  unsigned StoredTileWidth() const override { return storedTileWidth; }
  unsigned StoredTileHeight() const override { return storedTileHeight; }
};

/// A raster of one level of an image of width x height pixels.
inline FakeRaster LevelOf(unsigned width, unsigned height, unsigned level) {
  FakeRaster raster;
  raster.width = width / level;
  raster.height = height / level;
  raster.level = level;
  return raster;
}

}  // namespace orin::testing
