/// Reads blocks of pixels of one raster, full resolution or one overview level.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <vector>

#include "basic/gobs/raster.h"
#include "host/datasources/auxiliarydata.h"

namespace orin::datasources {

/// The margin mode that a run sets: real neighbours inside the image, the edge pixels repeated
/// outside. It is the only mode.
inline constexpr int kMarginRepeatEdge = 2;

class IRasterReader {
 public:
  virtual ~IRasterReader() = default;

  /// Sets how many pixels around each block its reads shall supply, in x and in y.
  virtual void SetMargin(unsigned x, unsigned y, int mode) = 0;
  virtual unsigned GetMarginX() const = 0;
  virtual unsigned GetMarginY() const = 0;

  virtual unsigned GetWidth() const = 0;
  virtual unsigned GetHeight() const = 0;
  virtual unsigned GetChannelCount() const = 0;
  /// Of the pixels that `Read` delivers.
  virtual const gobs::DataType& GetDataType() const = 0;
  /// Decimation factor of what is read; 1 is full resolution.
  virtual unsigned GetLevel() const = 0;

  /// The block grid: the stored tiles at first; a strip image's tiles are as wide as the image.
  virtual unsigned GetTileWidth() const = 0;
  virtual unsigned GetTileHeight() const = 0;
  virtual void SetTileSize(unsigned width, unsigned height) = 0;
  /// Back to the stored tiles.
  virtual void SetOptimalTileSize() = 0;

  /// Fills the whole buffer of `block`: the useful area at (block.x, block.y), and its margins.
  /// \pre the block has this reader's channel count and data type, and its useful area lies inside
  /// \throws orin::Exception  the pixels cannot be read; the text names the file
  virtual void Read(gobs::Raster& block) = 0;

  virtual AuxiliaryData GetAuxiliaryData() const = 0;
  /// The channels that this reader delivers, by their 1-based number in the file.
  virtual std::vector<unsigned> GetChannelsInfo() const = 0;

  // The grid's tiles one by one, row by row.
  unsigned GetTileCount() const;
  /// A new block of tile `index` with the margins set. \throws orin::DataException  no such tile
  std::unique_ptr<gobs::Raster> GetRaster(unsigned index);
  /// Index of the tile that holds the pixel (x, y). \throws orin::DataException  outside the raster
  unsigned FindRaster(unsigned x, unsigned y) const;
  unsigned Begin() const { return 0; }
  unsigned End() const { return GetTileCount(); }

 private:
  unsigned TilesAcross() const;
  unsigned TilesDown() const;
};

/// Margins and block grid of a reader whose driver supplies the stored tile size and `Read`.
/// \tparam Interface  IRasterReader, or IRasterWriter whose reading side this is
template <class Interface>
class ReaderState : public Interface {
 public:
  void SetMargin(unsigned x, unsigned y, int /*mode*/) override {
    marginX_ = x;
    marginY_ = y;
  }
  unsigned GetMarginX() const override { return marginX_; }
  unsigned GetMarginY() const override { return marginY_; }
  unsigned GetTileWidth() const override { return tileWidth_ ? tileWidth_ : StoredTileWidth(); }
  unsigned GetTileHeight() const override { return tileHeight_ ? tileHeight_ : StoredTileHeight(); }
  void SetTileSize(unsigned width, unsigned height) override {
    tileWidth_ = width;
    tileHeight_ = height;
  }
  void SetOptimalTileSize() override { tileWidth_ = tileHeight_ = 0; }

 protected:
  virtual unsigned StoredTileWidth() const = 0;
  virtual unsigned StoredTileHeight() const = 0;

 private:
  unsigned marginX_ = 0;
  unsigned marginY_ = 0;
  unsigned tileWidth_ = 0;
  unsigned tileHeight_ = 0;
};

/// Pixels of a block's buffer that lie inside the raster: what a driver has to fetch.
struct InsideWindow {
  int64_t x;      ///< first column, in the raster
  int64_t y;      ///< first row, in the raster
  int64_t width;  ///< columns; 0 or less when the block lies outside
  int64_t height;
};

/// The part of `block`, margins included, that lies inside a raster of this size.
InsideWindow InsideOf(const gobs::Raster& block, unsigned rasterWidth, unsigned rasterHeight);

/// Repeats the edge pixels of `inside` into the rest of the block's buffer.
void RepeatEdges(gobs::Raster& block, const InsideWindow& inside);

/// Checks what `Read` and `Write` demand of a block.
/// \throws orin::DataException  other channel count or data type, or the useful area is not inside;
///                              the text names `file`
void RequireFittingBlock(const gobs::Raster& block, const IRasterReader& raster,
                         const std::string& file);

}  // namespace orin::datasources
