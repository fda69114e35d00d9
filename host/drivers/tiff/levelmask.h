/// The mask that is stored with a level: one bit a pixel, in a directory right behind the level's.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"
#include "host/datasources/levelstore.h"
#include "host/datasources/validity.h"
#include "host/drivers/tiff/levelbuild.h"
#include "host/drivers/tiff/levelcoding.h"
#include "host/drivers/tiff/leveldirectories.h"
#include "host/drivers/tiff/pixelreader.h"
#include "host/drivers/tiff/tileencoder.h"

namespace orin::drivers {

/// What a level store knows of its image's validity.
struct ImageValidity {
  bool hasMask = false;       ///< levels get masks
  unsigned alphaChannel = 0;  ///< 1-based, 0: none
  /// Opens mask and alpha channel together at full resolution; empty or null without either.
  std::function<std::unique_ptr<datasources::IValidityReader>()> open;
};

/// The validity of `image`, which must outlive what the answer opens.
ImageValidity ValidityOf(datasources::IRasterSource& image);

/// What says which pixels of a stored level hold data.
struct LevelValidity {
  std::optional<uint32_t> alphaPosition;                 ///< 0-based within a block's channels
  std::unique_ptr<datasources::IValidityReader> reader;  ///< of all but that; null for none
};

/// How the mask of a level is stored: its size and grid, one bit a pixel, DEFLATE.
LevelCoding MaskCodingOf(const LevelCoding& level);

/// The entries of a mask's directory.
/// \param isFirst  it stands behind the first directory of a side-car
std::vector<NewEntry> MaskEntriesOf(const LevelBuild& mask, bool isBig, bool isFirst);

/// A change of one directory's SUBFILETYPE.
struct TypeChange {
  uint64_t position;  ///< in the file
  std::string bytes;
};
/// What makes all masks of a side-car known to other programs: they take its first directory for
/// an image, and want that one's mask not to be called reduced.
std::vector<TypeChange> MaskTypeChanges(const PositionedFile& file, const TiffStructure& structure);

/// A mask of which the file holds the tiles.
struct StoredMask {
  /// Writes a byte a pixel, 0 or 1, of the whole tile; empty: there is no mask.
  /// \throws orin::Exception  the tile cannot be read
  std::function<void(uint32_t tile, uint8_t* bits)> readTile;
  PixelFormat format;
  std::vector<TilePlace> places;  ///< of its tiles
};
/// \param index  of its directory. \throws orin::Exception  it cannot be read
StoredMask OpenStoredMask(const PositionedFile& file, const TiffStructure& structure, size_t index);
/// One that no directory names yet. \pre it is complete
/// \param file  named in error texts
/// \param read  the bytes of a tile
StoredMask OpenAppendedMask(const LevelBuild& mask, const std::string& file,
                            std::function<std::vector<uint8_t>(const TilePlace&)> read);

/// Gathers the validity of blocks into the mask's tiles.
class LevelMaskWriter {
 public:
  using Append = std::function<TilePlace(const std::vector<uint8_t>&)>;

  /// \param build   receives the places of the tiles
  /// \param before  the mask that the level has in the file, if any: tiles that do not change stay
  /// \param joins   a pixel that `before` calls valid stays valid
  LevelMaskWriter(LevelBuild& build, std::string file, StoredMask before, bool joins,
                  Append append);

  /// Takes the block's validity, of its useful area. \pre it has one
  /// \throws orin::Exception  a complete tile cannot be stored
  void Write(const gobs::Raster& block);

 private:
  struct OpenTile {
    std::vector<uint8_t> bits;  ///< one byte a pixel: 0, 1, or not known yet
    uint64_t missing;           ///< pixels
  };

  static void Take(const gobs::Mask& mask, std::pair<int64_t, int64_t> from, uint32_t count,
                   uint64_t to, OpenTile& tile);
  OpenTile MakeTile(uint32_t tileX, uint32_t tileY) const;
  void Finish(uint64_t tile, std::vector<uint8_t>& bits);

  LevelBuild& build_;
  TileEncoder encoder_;
  StoredMask before_;
  bool joins_;
  Append append_;
  std::map<uint64_t, OpenTile> tiles_;
};

}  // namespace orin::drivers
