/// Writes blocks of one level as tiles, and reads the level that is in the file.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "host/datasources/rasterwriter.h"
#include "host/datasources/samplecopy.h"
#include "host/drivers/tiff/levelbuild.h"
#include "host/drivers/tiff/levelmask.h"
#include "host/drivers/tiff/pixelreader.h"
#include "host/drivers/tiff/tileencoder.h"

namespace orin::drivers {

class TiffLevelStore;

/// Blocks may cut tiles: a tile that is covered in part waits in memory for the rest of its pixels.
/// One thread may read while another writes.
class LevelWriter final : public datasources::ReaderState<datasources::IRasterWriter> {
 public:
  /// \param store   outlives the writer
  /// \param format  of the level
  LevelWriter(TiffLevelStore& store, std::string file, unsigned level,
              std::vector<unsigned> channels, const PixelFormat& format);
  ~LevelWriter() override;

  unsigned GetWidth() const override { return format_.width; }
  unsigned GetHeight() const override { return format_.height; }
  unsigned GetChannelCount() const override { return static_cast<unsigned>(channels_.size()); }
  const gobs::DataType& GetDataType() const override { return format_.type; }
  unsigned GetLevel() const override { return level_; }
  datasources::AuxiliaryData GetAuxiliaryData() const override;
  std::vector<unsigned> GetChannelsInfo() const override { return channels_; }

  /// The pixels in the file, which are those before this writer's until the level is stored.
  void Read(gobs::Raster& block) override;
  void Write(const gobs::Raster& block) override;

 protected:
  unsigned StoredTileWidth() const override { return format_.tileWidth; }
  unsigned StoredTileHeight() const override { return format_.tileHeight; }

 private:
  /// A tile that is being filled.
  struct OpenTile {
    std::vector<uint8_t> samples;
    std::vector<uint8_t> isCovered;  ///< one a pixel
    uint64_t missing = 0;            ///< pixels
  };
  /// The part of a block that falls into one tile; pixels, in the level.
  struct Piece {
    uint64_t tile;  ///< within the plane
    uint32_t x, y, width, height;
    uint32_t tileX, tileY;               ///< first pixel of the tile
    uint32_t insideWidth, insideHeight;  ///< of the tile, within the level
  };

  void Begin();
  void WritePiece(const gobs::Raster& block, const Piece& piece);
  void WriteInto(const gobs::Raster& block, const Piece& piece, uint32_t plane,
                 const std::vector<unsigned>& positions);
  OpenTile MakeTile(uint64_t tile, const Piece& piece);
  void CopyPixels(const gobs::Raster& block, const Piece& piece,
                  const std::vector<unsigned>& positions, OpenTile& to) const;
  static void Cover(const Piece& piece, uint32_t tileWidth, OpenTile& tile);
  void RepeatLastPixels(const Piece& piece, std::vector<uint8_t>& samples) const;
  bool IsLeftOut(const std::vector<uint8_t>& samples) const;
  void Finish(uint64_t tile, uint32_t plane, const Piece& piece, std::vector<uint8_t>& samples);

  TiffLevelStore& store_;
  std::string file_;
  unsigned level_;
  std::vector<unsigned> channels_;
  PixelFormat format_;

  void WriteMask(const gobs::Raster& block);
  void SettleAlpha(const gobs::Raster& block, const Piece& piece,
                   const std::vector<unsigned>& positions, OpenTile& tile) const;

  // opened by the first Read
  std::unique_ptr<PixelReader> reader_;
  std::unique_ptr<LevelValidity> validity_;

  // from the first Write on
  std::shared_ptr<LevelBuild> build_;
  std::unique_ptr<TileEncoder> encoder_;
  std::unique_ptr<LevelMaskWriter> mask_;  ///< null when the level gets none
  bool hasAskedForMask_ = false;
  std::unique_ptr<PixelReader>
      storedTiles_;  ///< where other channels come from; null when not needed
  datasources::CopySamples copy_ = nullptr;
  std::vector<uint8_t> sparseSample_;  ///< empty when every tile is stored
  bool isPartOfPixels_ = false;        ///< other channels share the tiles
  std::map<uint64_t, OpenTile> tiles_;
  std::vector<uint8_t> spare_;  ///< memory of a finished tile, for the next one
};

}  // namespace orin::drivers
