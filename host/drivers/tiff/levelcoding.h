/// How the pixels of a level are stored: everything that its directory and its tiles need to agree
/// on.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "host/datasources/leveloptions.h"
#include "host/drivers/tiff/appender.h"
#include "host/drivers/tiff/pixelformat.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

struct LevelCoding {
  PixelFormat format;  ///< size, grid and samples; always tiled
  ByteOrder byteOrder;
  uint16_t predictor = 1;
  uint16_t subfileType = FILETYPE_REDUCEDIMAGE;
  uint16_t subsamplingX = 2;  ///< of YCbCr
  uint16_t subsamplingY = 2;
  int jpegQuality = 90;
  std::optional<int> webpQuality;      ///< none: without loss
  int effort = 0;                      ///< of DEFLATE and ZSTD; 0: the codec's own
  uint32_t lercExtra = 0;              ///< compression on top of LERC
  bool mayBeSparse = false;            ///< tiles that hold nothing but no data need not be stored
  std::vector<NewEntry> inherited;     ///< tags that describe the samples, copied as they are
  std::optional<uint64_t> imageBytes;  ///< stored, of the image coded in this very way

  /// JPEG takes and gives RGB for stored YCbCr.
  bool IsJpegYCbCr() const;
  uint64_t TileBytes() const { return format.TileRowBytes() * format.tileHeight; }
  uint32_t Planes() const { return format.planar ? format.samplesPerPixel : 1; }
};

/// The coding of a stored image or level.
/// \param format  of that directory
LevelCoding CodingOf(const PositionedFile& file, const TiffStructure& structure,
                     const TiffDirectory& directory, const PixelFormat& format);

/// The coding of an image of no TIFF file: samples without meaning, DEFLATE.
LevelCoding PlainCoding(uint32_t width, uint32_t height, uint32_t channels,
                        const gobs::DataType& type, const std::string& noData);

/// The coding for `level` of an image of coding `image`: its size, tiles of 16 pixels or more, and
/// what `options` say; else the image's compression if that can be written here without more loss.
/// \throws orin::Exception  the level has no pixel, or too many tiles, or an option does not suit
///                          the image; the text names `file`
LevelCoding CodingOfLevel(const LevelCoding& image, unsigned level, const std::string& file,
                          const datasources::LevelOptions& options = {});

/// The same in planes of their own, one a channel.
LevelCoding InPlanes(LevelCoding coding);

/// DEFLATE, which takes whatever a block can hold.
void FallBackToDeflate(LevelCoding& coding);

/// The predictor that suits the samples in DEFLATE, LZW, ZSTD or LZMA.
uint16_t UsualPredictor(const PixelFormat& format);

/// True when tiles of one can stand in the directory of the other.
bool HaveSameForm(const LevelCoding& one, const LevelCoding& other);

/// True when `stored` is as `asked` in all that `options` name and a file tells; the effort of a
/// codec it does not tell.
bool HasFormAskedFor(const LevelCoding& stored, const LevelCoding& asked,
                     const datasources::LevelOptions& options);

/// The entries of a level's directory: all but those that locate its tiles and its metadata.
std::vector<NewEntry> EntriesOf(const LevelCoding& coding);

}  // namespace orin::drivers
