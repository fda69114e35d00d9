// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelcoding.h"

#include <algorithm>
#include <array>
#include <cstdlib>

#include "host/drivers/tiff/jpegquality.h"
#include "host/drivers/tiff/tileencoder.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr uint32_t kTileEdge = 256;
constexpr uint64_t kMostTileBytes = 64 << 20;
constexpr uint64_t kMostTiles = 1 << 26;
constexpr uint64_t kMostTagBytes = 1 << 20;

constexpr std::array<uint16_t, 9> kInheritedTags = {TIFFTAG_COLORMAP,
                                                    TIFFTAG_INKSET,
                                                    TIFFTAG_EXTRASAMPLES,
                                                    TIFFTAG_YCBCRCOEFFICIENTS,
                                                    TIFFTAG_YCBCRSUBSAMPLING,
                                                    TIFFTAG_YCBCRPOSITIONING,
                                                    TIFFTAG_REFERENCEBLACKWHITE,
                                                    TIFFTAG_GDAL_NODATA,
                                                    TIFFTAG_LERC_PARAMETERS};
constexpr std::array<uint16_t, 4> kYCbCrTags = {TIFFTAG_YCBCRCOEFFICIENTS, TIFFTAG_YCBCRSUBSAMPLING,
                                                TIFFTAG_YCBCRPOSITIONING,
                                                TIFFTAG_REFERENCEBLACKWHITE};

void DropInherited(LevelCoding& coding, const auto& isDropped) {
  std::erase_if(coding.inherited, [&](const NewEntry& entry) { return isDropped(entry.tag); });
}

void DropYCbCr(LevelCoding& coding) {
  DropInherited(coding, [](uint16_t tag) {
    return std::find(kYCbCrTags.begin(), kYCbCrTags.end(), tag) != kYCbCrTags.end();
  });
}

/// DEFLATE without a predictor takes whatever a block can hold.
void FallBackToDeflate(LevelCoding& coding) {
  if (coding.format.photometric == PHOTOMETRIC_YCBCR &&
      (coding.IsJpegYCbCr() || coding.format.compression == COMPRESSION_OJPEG)) {
    coding.format.photometric = PHOTOMETRIC_RGB;  // as it is delivered
    DropYCbCr(coding);
  }
  coding.format.compression = COMPRESSION_ADOBE_DEFLATE;
  coding.predictor = PREDICTOR_NONE;
  DropInherited(coding, [](uint16_t tag) { return tag == TIFFTAG_LERC_PARAMETERS; });
}

/// True when some tile or strip of the directory is not stored.
bool HasSparseTiles(const PositionedFile& file, const TiffStructure& structure,
                    const TiffDirectory& directory) {
  const TiffEntry* counts = directory.Find(TIFFTAG_TILEBYTECOUNTS);
  if (!counts) counts = directory.Find(TIFFTAG_STRIPBYTECOUNTS);
  return counts && HoldsNumber(file, structure, *counts, 0);
}

void Inherit(const PositionedFile& file, const TiffStructure& structure,
             const TiffDirectory& directory, LevelCoding& coding) {
  for (const uint16_t tag : kInheritedTags) {
    const TiffEntry* entry = directory.Find(tag);
    if (entry && entry->bytes <= kMostTagBytes)
      coding.inherited.push_back(
          {tag, entry->type, entry->count, ReadBytes(file, structure, *entry)});
  }
}

std::vector<uint64_t> NumbersIn(const PositionedFile& file, const TiffStructure& structure,
                                const TiffDirectory& directory, uint16_t tag) {
  const TiffEntry* entry = directory.Find(tag);
  return entry && entry->bytes <= kMostTagBytes ? ReadNumbers(file, structure, *entry)
                                                : std::vector<uint64_t>();
}

}  // namespace

bool LevelCoding::IsJpegYCbCr() const {
  return format.compression == COMPRESSION_JPEG && format.photometric == PHOTOMETRIC_YCBCR &&
         !format.planar;
}

LevelCoding CodingOf(const PositionedFile& file, const TiffStructure& structure,
                     const TiffDirectory& directory, const PixelFormat& format) {
  LevelCoding coding;
  coding.format = format;
  coding.byteOrder = structure.byteOrder;
  coding.predictor = static_cast<uint16_t>(
      NumberOf(file, structure, directory, TIFFTAG_PREDICTOR, PREDICTOR_NONE));
  const auto subsampling = NumbersIn(file, structure, directory, TIFFTAG_YCBCRSUBSAMPLING);
  if (subsampling.size() == 2) {
    coding.subsamplingX = static_cast<uint16_t>(subsampling[0]);
    coding.subsamplingY = static_cast<uint16_t>(subsampling[1]);
  }
  const auto lerc = NumbersIn(file, structure, directory, TIFFTAG_LERC_PARAMETERS);
  if (lerc.size() == 2) coding.lercExtra = static_cast<uint32_t>(lerc[1]);
  const TiffEntry* tables = directory.Find(TIFFTAG_JPEGTABLES);
  if (tables && tables->bytes <= kMostTagBytes)
    coding.jpegQuality =
        JpegQualityOf(ReadBytes(file, structure, *tables)).value_or(coding.jpegQuality);
  coding.mayBeSparse = HasSparseTiles(file, structure, directory);
  Inherit(file, structure, directory, coding);
  return coding;
}

LevelCoding PlainCoding(uint32_t width, uint32_t height, uint32_t channels,
                        const gobs::DataType& type, const std::string& noData) {
  LevelCoding coding;
  PixelFormat& format = coding.format;
  format.width = width;
  format.height = height;
  format.samplesPerPixel = channels;
  format.type = type;
  format.bitsPerSample = type.bits * ComponentsPerSample(type);
  format.sampleFormat = type.isComplex
                            ? (type.isFloat ? SAMPLEFORMAT_COMPLEXIEEEFP : SAMPLEFORMAT_COMPLEXINT)
                        : type.isFloat  ? SAMPLEFORMAT_IEEEFP
                        : type.isSigned ? SAMPLEFORMAT_INT
                                        : SAMPLEFORMAT_UINT;
  format.compression = COMPRESSION_ADOBE_DEFLATE;
  format.photometric = PHOTOMETRIC_MINISBLACK;
  format.noData = noData;
  const bool isPlainInteger = !type.isFloat && !type.isComplex && type.bits >= 8;
  coding.predictor = isPlainInteger ? PREDICTOR_HORIZONTAL : PREDICTOR_NONE;
  if (channels > 1)
    coding.inherited.push_back(
        NumbersEntry(TIFFTAG_EXTRASAMPLES, TIFF_SHORT,
                     std::vector<uint64_t>(channels - 1, EXTRASAMPLE_UNSPECIFIED)));
  if (!noData.empty()) coding.inherited.push_back(TextEntry(TIFFTAG_GDAL_NODATA, noData));
  return coding;
}

LevelCoding CodingOfLevel(const LevelCoding& image, unsigned level, const std::string& file) {
  const auto refuse = [&](const char* format) {
    throw Exception(FormatString(format, file.c_str(), level), "host/drivers/tiff/levelcoding",
                    "CodingOfLevel(const LevelCoding&, unsigned int, const std::string&)", 0);
  };
  LevelCoding coding = image;
  PixelFormat& format = coding.format;
  if (level == 0 || image.format.width / level == 0 || image.format.height / level == 0)
    refuse(_("%s: level %u would have no pixel."));
  format.width = image.format.width / level;
  format.height = image.format.height / level;
  const bool keepsTiles = image.format.tiled && format.tileWidth % 16 == 0 &&
                          format.tileHeight % 16 == 0 && coding.TileBytes() <= kMostTileBytes;
  if (!keepsTiles) format.tileWidth = format.tileHeight = kTileEdge;
  while (!keepsTiles && format.tileWidth > 16 && coding.TileBytes() > kMostTileBytes)
    format.tileWidth = format.tileHeight = format.tileWidth / 2;
  format.tiled = true;
  format.fillOrder = FILLORDER_MSB2LSB;
  if (format.TilesPerPlane() > kMostTiles / coding.Planes())
    refuse(_("%s: level %u would have too many tiles."));
  if (!TileEncoder::CanEncode(coding)) FallBackToDeflate(coding);
  return coding;
}

LevelCoding InPlanes(LevelCoding coding) {
  if (coding.format.samplesPerPixel < 2) return coding;
  const bool needsChunks = coding.IsJpegYCbCr() || coding.format.compression == COMPRESSION_WEBP;
  if (needsChunks) {
    FallBackToDeflate(coding);
    coding.predictor = PREDICTOR_HORIZONTAL;
  }
  coding.format.planar = true;
  return coding;
}

std::vector<NewEntry> EntriesOf(const LevelCoding& coding) {
  const PixelFormat& format = coding.format;
  const auto forEachSample = [&](uint64_t number) {
    return std::vector<uint64_t>(format.samplesPerPixel, number);
  };
  std::vector<NewEntry> entries = coding.inherited;
  const auto add = [&](uint16_t tag, uint16_t type, std::vector<uint64_t> numbers) {
    entries.push_back(NumbersEntry(tag, type, numbers));
  };
  add(TIFFTAG_SUBFILETYPE, TIFF_LONG, {FILETYPE_REDUCEDIMAGE});
  add(TIFFTAG_IMAGEWIDTH, TIFF_LONG, {format.width});
  add(TIFFTAG_IMAGELENGTH, TIFF_LONG, {format.height});
  add(TIFFTAG_BITSPERSAMPLE, TIFF_SHORT, forEachSample(format.bitsPerSample));
  add(TIFFTAG_COMPRESSION, TIFF_SHORT, {format.compression});
  add(TIFFTAG_PHOTOMETRIC, TIFF_SHORT, {format.photometric});
  add(TIFFTAG_SAMPLESPERPIXEL, TIFF_SHORT, {format.samplesPerPixel});
  add(TIFFTAG_PLANARCONFIG, TIFF_SHORT,
      {format.planar ? uint64_t{PLANARCONFIG_SEPARATE} : PLANARCONFIG_CONTIG});
  add(TIFFTAG_TILEWIDTH, TIFF_LONG, {format.tileWidth});
  add(TIFFTAG_TILELENGTH, TIFF_LONG, {format.tileHeight});
  add(TIFFTAG_SAMPLEFORMAT, TIFF_SHORT, forEachSample(format.sampleFormat));
  if (coding.predictor != PREDICTOR_NONE) add(TIFFTAG_PREDICTOR, TIFF_SHORT, {coding.predictor});
  return entries;
}

}  // namespace orin::drivers
