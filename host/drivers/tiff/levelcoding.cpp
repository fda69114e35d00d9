// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelcoding.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <tuple>
#include <utility>

#include "host/drivers/tiff/codingoptions.h"
#include "host/drivers/tiff/jpegquality.h"
#include "host/model/levelsize.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr uint32_t kTileEdge = 256;
constexpr uint64_t kMostTileBytes = 64 << 20;
constexpr uint64_t kMostTiles = 1 << 26;
constexpr uint64_t kMostTagBytes = 1 << 20;
constexpr uint64_t kMostHeadBytes = 1 << 16;  // of a JPEG stream: its tables stand in front

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

/// Learns from the stored sizes of all tiles or strips: whether some are left out, and how much
/// they take together.
void LookAtStoredSizes(const PositionedFile& file, const TiffStructure& structure,
                       const TiffDirectory& directory, LevelCoding& coding) {
  const TiffEntry* counts = directory.Find(TIFFTAG_TILEBYTECOUNTS);
  if (!counts) counts = directory.Find(TIFFTAG_STRIPBYTECOUNTS);
  if (!counts) return;
  double stored = 0;
  VisitNumbers(file, structure, *counts, [&](uint64_t bytes) {
    stored += double(bytes);
    coding.mayBeSparse = coding.mayBeSparse || bytes == 0;
  });
  coding.imageBytes = static_cast<uint64_t>(std::min(double(file.Size()), stored));
}

/// The quality of a JPEG image: by its common tables, else by those of its first tile.
int JpegQualityIn(const PositionedFile& file, const TiffStructure& structure,
                  const TiffDirectory& directory, int otherwise) {
  const TiffEntry* tables = directory.Find(TIFFTAG_JPEGTABLES);
  if (tables && tables->bytes <= kMostTagBytes)
    if (const auto quality = JpegQualityOf(ReadBytes(file, structure, *tables))) return *quality;
  for (const auto& [offsets, counts] : {std::pair{TIFFTAG_TILEOFFSETS, TIFFTAG_TILEBYTECOUNTS},
                                        std::pair{TIFFTAG_STRIPOFFSETS, TIFFTAG_STRIPBYTECOUNTS}}) {
    const uint64_t offset = NumberOf(file, structure, directory, uint16_t(offsets), 0);
    const uint64_t count = NumberOf(file, structure, directory, uint16_t(counts), 0);
    const uint64_t size = file.Size();
    if (offset == 0 || offset >= size) continue;
    std::vector<uint8_t> stream(std::min({count, size - offset, kMostHeadBytes}));
    file.Read(offset, stream.data(), stream.size());
    if (const auto quality = JpegQualityOf(stream)) return *quality;
  }
  return otherwise;
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

/// Levels declare the value in their tag, wherever the image does.
void DeclareNoData(LevelCoding& coding) {
  if (!coding.format.noDataIsBeside) return;
  DropInherited(coding, [](uint16_t tag) { return tag == TIFFTAG_GDAL_NODATA; });
  if (!coding.format.noData.empty())
    coding.inherited.push_back(TextEntry(TIFFTAG_GDAL_NODATA, coding.format.noData));
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
  if (format.compression == COMPRESSION_JPEG)
    coding.jpegQuality = JpegQualityIn(file, structure, directory, coding.jpegQuality);
  LookAtStoredSizes(file, structure, directory, coding);
  Inherit(file, structure, directory, coding);
  DeclareNoData(coding);
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
  coding.predictor = UsualPredictor(format);
  if (channels > 1)
    coding.inherited.push_back(
        NumbersEntry(TIFFTAG_EXTRASAMPLES, TIFF_SHORT,
                     std::vector<uint64_t>(channels - 1, EXTRASAMPLE_UNSPECIFIED)));
  if (!noData.empty()) coding.inherited.push_back(TextEntry(TIFFTAG_GDAL_NODATA, noData));
  return coding;
}

uint16_t UsualPredictor(const PixelFormat& format) {
  if (!format.WholeBytes() || format.type.isComplex || format.photometric == PHOTOMETRIC_PALETTE)
    return PREDICTOR_NONE;
  return format.type.isFloat ? PREDICTOR_FLOATINGPOINT : PREDICTOR_HORIZONTAL;
}

void FallBackToDeflate(LevelCoding& coding) {
  if (coding.format.photometric == PHOTOMETRIC_YCBCR &&
      (coding.IsJpegYCbCr() || coding.format.compression == COMPRESSION_OJPEG)) {
    coding.format.photometric = PHOTOMETRIC_RGB;  // as it is delivered
    DropYCbCr(coding);
  }
  coding.format.compression = COMPRESSION_ADOBE_DEFLATE;
  coding.predictor = UsualPredictor(coding.format);
  coding.imageBytes.reset();
  DropInherited(coding, [](uint16_t tag) { return tag == TIFFTAG_LERC_PARAMETERS; });
}

LevelCoding CodingOfLevel(const LevelCoding& image, unsigned level, const std::string& file,
                          const datasources::LevelOptions& options) {
  const auto refuse = [&](const char* format) {
    throw Exception(FormatString(format, file.c_str(), level), "host/drivers/tiff/levelcoding",
                    "CodingOfLevel(const LevelCoding&, unsigned int, const std::string&, const "
                    "datasources::LevelOptions&)",
                    0);
  };
  LevelCoding coding = image;
  PixelFormat& format = coding.format;
  const auto size = model::LevelSizeOf(format.width, format.height, level);
  if (size.IsEmpty()) refuse(_("%s: level %u would have no pixel."));
  format.width = size.width;
  format.height = size.height;
  const bool keepsTiles = image.format.tiled && format.tileWidth % 16 == 0 &&
                          format.tileHeight % 16 == 0 && coding.TileBytes() <= kMostTileBytes;
  if (!keepsTiles) format.tileWidth = format.tileHeight = kTileEdge;
  while (!keepsTiles && format.tileWidth > 16 && coding.TileBytes() > kMostTileBytes)
    format.tileWidth = format.tileHeight = format.tileWidth / 2;
  format.tiled = true;
  format.fillOrder = FILLORDER_MSB2LSB;
  ApplyOptions(options, file, kMostTileBytes, coding);
  if (format.TilesPerPlane() > kMostTiles / coding.Planes())
    refuse(_("%s: level %u would have too many tiles."));
  return coding;
}

LevelCoding InPlanes(LevelCoding coding) {
  // Both need several channels in a tile, or lose more than they have to.
  const uint16_t codec = coding.format.compression;
  if (codec == COMPRESSION_JPEG || codec == COMPRESSION_WEBP) FallBackToDeflate(coding);
  const bool getsPlanes = coding.format.samplesPerPixel > 1;
  if (getsPlanes != coding.format.planar) coding.imageBytes.reset();
  coding.format.planar = getsPlanes;
  return coding;
}

bool HaveSameForm(const LevelCoding& one, const LevelCoding& other) {
  const auto formOf = [](const LevelCoding& coding) {
    const PixelFormat& format = coding.format;
    return std::tuple(format.width, format.height, format.tileWidth, format.tileHeight,
                      format.planar, format.compression, format.photometric, format.bitsPerSample,
                      coding.predictor, coding.lercExtra);
  };
  const bool sameChroma = !one.IsJpegYCbCr() || (one.subsamplingX == other.subsamplingX &&
                                                 one.subsamplingY == other.subsamplingY);
  return formOf(one) == formOf(other) && sameChroma;
}

bool HasFormAskedFor(const LevelCoding& stored, const LevelCoding& asked,
                     const datasources::LevelOptions& options) {
  const PixelFormat& one = stored.format;
  const PixelFormat& other = asked.format;
  const bool isJpeg = other.compression == COMPRESSION_JPEG;
  const bool sameQuality = !options.quality || !isJpeg || stored.jpegQuality == asked.jpegQuality;
  const bool namesTiles = options.tileWidth || options.tileHeight;
  const bool sameTiles =
      one.tiled && one.tileWidth == other.tileWidth && one.tileHeight == other.tileHeight;
  return (!options.compression || one.compression == other.compression) &&
         (!options.predictor || stored.predictor == asked.predictor) &&
         (!namesTiles || sameTiles) && sameQuality;
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
  add(TIFFTAG_SUBFILETYPE, TIFF_LONG, {coding.subfileType});
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
