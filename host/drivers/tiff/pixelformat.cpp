// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/pixelformat.h"

#include <algorithm>
#include <limits>
#include <optional>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

[[noreturn]] void RefuseLayout(const TiffHandle& tiff, const std::string& layout) {
  throw Exception(
      FormatString(_("%s: cannot be read: %s are not supported. Convert the file first."),
                   tiff.Path().c_str(), layout.c_str()),
      "host/drivers/tiff/pixelformat", "FormatOf(const TiffHandle&)", 0);
}

template <class T>
T Field(const TiffHandle& tiff, uint32_t tag, T otherwise) {
  T value = otherwise;
  return TIFFGetFieldDefaulted(tiff.Get(), tag, &value) == 1 ? value : otherwise;
}

/// The narrowest width that a block can hold and that `bits` fit in; 0 when there is none.
uint32_t DeliveredBits(uint32_t bits, bool isFloat) {
  if (isFloat) return bits == 32 || bits == 64 ? bits : 0;
  if (bits > 32) return bits == 64 ? bits : 0;
  return bits <= 8 ? 8 : bits <= 16 ? 16 : 32;
}

std::optional<gobs::DataType> TypeOf(uint32_t bitsPerSample, uint16_t sampleFormat) {
  const bool isComplex =
      sampleFormat == SAMPLEFORMAT_COMPLEXINT || sampleFormat == SAMPLEFORMAT_COMPLEXIEEEFP;
  const bool isFloat =
      sampleFormat == SAMPLEFORMAT_IEEEFP || sampleFormat == SAMPLEFORMAT_COMPLEXIEEEFP;
  const bool isSigned = isFloat || sampleFormat == SAMPLEFORMAT_INT || isComplex;
  if (bitsPerSample == 1 && !isSigned) return gobs::eDT_BIT;
  const uint32_t stored = isComplex ? bitsPerSample / 2 : bitsPerSample;
  const uint32_t bits = stored == 0 ? 0 : DeliveredBits(stored, isFloat);
  if (bits == 0 || (isComplex && bits * 2 != bitsPerSample)) return std::nullopt;
  if (!isFloat) return gobs::DataType{bits, isSigned, false, bits, 0, isComplex};
  return bits == 32 ? gobs::DataTypeOf<float>(isComplex) : gobs::DataTypeOf<double>(isComplex);
}

void ReadSampleLayout(const TiffHandle& tiff, PixelFormat& format) {
  format.samplesPerPixel = Field<uint16_t>(tiff, TIFFTAG_SAMPLESPERPIXEL, 1);
  format.bitsPerSample = Field<uint16_t>(tiff, TIFFTAG_BITSPERSAMPLE, 1);
  format.sampleFormat = Field<uint16_t>(tiff, TIFFTAG_SAMPLEFORMAT, SAMPLEFORMAT_UINT);
  format.fillOrder = Field<uint16_t>(tiff, TIFFTAG_FILLORDER, FILLORDER_MSB2LSB);
  format.compression = Field<uint16_t>(tiff, TIFFTAG_COMPRESSION, COMPRESSION_NONE);
  format.photometric = Field<uint16_t>(tiff, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_MINISBLACK);
  format.planar = format.samplesPerPixel > 1 &&
                  Field<uint16_t>(tiff, TIFFTAG_PLANARCONFIG, 1) == PLANARCONFIG_SEPARATE;
  format.swapped = TIFFIsByteSwapped(tiff.Get()) != 0;
  const auto type = TypeOf(format.bitsPerSample, format.sampleFormat);
  if (!type || format.samplesPerPixel == 0)
    RefuseLayout(tiff,
                 FormatString(_("%u samples a pixel of %u bits with sample format %u"),
                              format.samplesPerPixel, format.bitsPerSample, format.sampleFormat));
  format.type = *type;
}

void ReadGrid(const TiffHandle& tiff, PixelFormat& format) {
  format.width = Field<uint32_t>(tiff, TIFFTAG_IMAGEWIDTH, 0);
  format.height = Field<uint32_t>(tiff, TIFFTAG_IMAGELENGTH, 0);
  if (format.width == 0 || format.height == 0) RefuseLayout(tiff, _("images without pixels"));
  if (Field<uint32_t>(tiff, TIFFTAG_IMAGEDEPTH, 1) > 1)
    RefuseLayout(tiff, _("images of several layers"));
  format.tiled = TIFFIsTiled(tiff.Get()) != 0;
  if (format.tiled) {
    format.tileWidth = Field<uint32_t>(tiff, TIFFTAG_TILEWIDTH, 0);
    format.tileHeight = Field<uint32_t>(tiff, TIFFTAG_TILELENGTH, 0);
  } else {
    format.tileWidth = format.width;
    format.tileHeight =
        std::min(Field<uint32_t>(tiff, TIFFTAG_ROWSPERSTRIP, format.height), format.height);
  }
  if (format.tileWidth == 0 || format.tileHeight == 0)
    RefuseLayout(tiff, _("tiles without pixels"));
  if (format.TilesPerPlane() >
      std::numeric_limits<uint32_t>::max() / (format.planar ? format.samplesPerPixel : 1))
    RefuseLayout(tiff, _("images of more than 4294967295 tiles"));
}

/// Lets libtiff turn YCbCr into RGB where its codec does that; refuses what is left.
void SetUpColours(const TiffHandle& tiff, const PixelFormat& format) {
  if (format.photometric == PHOTOMETRIC_LOGL || format.photometric == PHOTOMETRIC_LOGLUV)
    RefuseLayout(tiff, _("logarithmic luminances (LogL, LogLuv)"));
  if (format.photometric != PHOTOMETRIC_YCBCR) return;
  if (format.compression == COMPRESSION_JPEG && !format.planar) {
    TIFFSetField(tiff.Get(), TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
    return;
  }
  uint16_t across = 1, down = 1;
  TIFFGetFieldDefaulted(tiff.Get(), TIFFTAG_YCBCRSUBSAMPLING, &across, &down);
  if (across != 1 || down != 1)
    RefuseLayout(tiff,
                 FormatString(_("subsampled YCbCr pixels in compression %u"), format.compression));
}

std::string Trim(const std::string& text) {
  const size_t first = text.find_first_not_of(" \t\r\n");
  return first == text.npos ? "" : text.substr(first, text.find_last_not_of(" \t\r\n") - first + 1);
}

}  // namespace

PixelFormat FormatOf(const TiffHandle& tiff) {
  PixelFormat format;
  ReadSampleLayout(tiff, format);
  ReadGrid(tiff, format);
  SetUpColours(tiff, format);
  if (!TIFFIsCODECConfigured(format.compression))
    RefuseLayout(tiff, FormatString(_("pixels of compression %u"), format.compression));
  format.noData = Trim(tiff.TextOf(TIFFTAG_GDAL_NODATA));
  return format;
}

}  // namespace orin::drivers
