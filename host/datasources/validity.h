/// Which pixels of a raster hold data, read by window from masks and alpha channels.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "basic/gobs/raster.h"
#include "host/datasources/rasterreader.h"

namespace orin::datasources {

/// The validity of every pixel of one raster, full resolution or one level. Has handles of its
/// own; not for two threads at once.
class IValidityReader {
 public:
  virtual ~IValidityReader() = default;
  virtual uint32_t Width() const = 0;   ///< pixels
  virtual uint32_t Height() const = 0;  ///< pixels
  /// \param bytes  receives width x height bytes, row by row: 0 for no data, anything else valid
  /// \pre the window lies in the raster. \throws orin::Exception  it cannot be read
  virtual void Read(uint32_t x, uint32_t y, uint32_t width, uint32_t height, uint8_t* bytes) = 0;
};

using ValidityReaders = std::vector<std::unique_ptr<IValidityReader>>;

/// Valid where all of `readers`, which have one size, say so; null without any. Null entries are
/// passed over.
std::unique_ptr<IValidityReader> AllOf(ValidityReaders readers);
/// Valid where the one channel of `alpha` is not 0.
std::unique_ptr<IValidityReader> OpaquePixelsOf(std::unique_ptr<IRasterReader> alpha);
/// A level without a validity of its own: valid where the image is valid at the level pixel's
/// centre.
/// \param image  full resolution
std::unique_ptr<IValidityReader> CentresOf(std::unique_ptr<IValidityReader> image, uint32_t factor,
                                           uint32_t width, uint32_t height);

/// Marks what `reader` says is no data in the block's validity, which is made when it has none;
/// margins beyond the raster repeat its edge.
void AddValidity(IValidityReader& reader, gobs::Raster& block);
/// The same of a channel of the block that holds alpha.
/// \param position  0-based within the block
void AddOpacity(uint32_t position, gobs::Raster& block);

}  // namespace orin::datasources
