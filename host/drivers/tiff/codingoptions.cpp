// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/codingoptions.h"

#include <algorithm>

#include "host/drivers/tiff/tileencoder.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::LevelCompression;
using datasources::LevelOptions;
using datasources::LevelPredictor;

constexpr int kMostDeflateEffort = 12;

[[noreturn]] void Refuse(const std::string& file, const std::string& option,
                         const std::string& reason) {
  throw datasources::OptionException(
      FormatString(_("%s: %s cannot be used: %s."), file.c_str(), option.c_str(), reason.c_str()),
      "host/drivers/tiff/codingoptions",
      "ApplyOptions(const datasources::LevelOptions&, const std::string&, uint64_t, LevelCoding&)",
      0);
}

uint16_t CodecOf(LevelCompression compression) {
  switch (compression) {
    case LevelCompression::kNone:
      return COMPRESSION_NONE;
    case LevelCompression::kDeflate:
      return COMPRESSION_ADOBE_DEFLATE;
    case LevelCompression::kLzw:
      return COMPRESSION_LZW;
    case LevelCompression::kZstd:
      return COMPRESSION_ZSTD;
    case LevelCompression::kPackBits:
      return COMPRESSION_PACKBITS;
    case LevelCompression::kLzma:
      return COMPRESSION_LZMA;
    case LevelCompression::kLerc:
      return COMPRESSION_LERC;
    case LevelCompression::kJpeg:
      return COMPRESSION_JPEG;
    case LevelCompression::kWebp:
      break;
  }
  return COMPRESSION_WEBP;
}

bool IsDeflate(uint16_t codec) {
  return codec == COMPRESSION_ADOBE_DEFLATE || codec == COMPRESSION_DEFLATE;
}

bool TakesPredictor(uint16_t codec) {
  return IsDeflate(codec) || codec == COMPRESSION_LZW || codec == COMPRESSION_ZSTD ||
         codec == COMPRESSION_LZMA;
}

bool HasAlpha(const LevelCoding& coding) {
  const auto entry = std::find_if(coding.inherited.begin(), coding.inherited.end(),
                                  [](const NewEntry& e) { return e.tag == TIFFTAG_EXTRASAMPLES; });
  // Each is a number of two bytes; any meaning but 0 is one of alpha.
  return entry != coding.inherited.end() &&
         std::any_of(entry->bytes.begin(), entry->bytes.end(), [](uint8_t b) { return b != 0; });
}

/// Lossy WebP keeps opacity as it is; JPEG takes it for one more colour.
bool BlursAlpha(const LevelCoding& coding) {
  return coding.format.compression == COMPRESSION_JPEG && HasAlpha(coding);
}

/// What the codec would change of such samples although it is to keep them; empty: nothing.
std::string UnfaithfulnessOf(const LevelCoding& coding) {
  const PixelFormat& format = coding.format;
  const bool isInterleaved = format.samplesPerPixel > 1 && !format.planar;
  if (format.compression == COMPRESSION_WEBP && format.samplesPerPixel == 4 && !coding.webpQuality)
    return _(
        "WebP without loss changes the colours of transparent pixels; give a QUALITY to "
        "accept loss");
  // libtiff 4.5 turns numbers round before it hands them to LERC, which takes some for NaN then.
  if (format.compression == COMPRESSION_LERC && coding.byteOrder.IsSwapped() &&
      format.bitsPerSample > 8)
    return _("LERC loses values in a file of this byte order");
  if (format.compression == COMPRESSION_LERC && isInterleaved) {
    if (format.type.isFloat) return _("LERC loses the NaN of interleaved channels");
    if (HasAlpha(coding)) return _("LERC loses the colours of transparent pixels");
  }
  return "";
}

/// Why the codec does not take such samples; empty: it does.
std::string ObstacleIn(const LevelCoding& coding) {
  const PixelFormat& format = coding.format;
  const bool isByte = format.bitsPerSample == 8 && format.sampleFormat == SAMPLEFORMAT_UINT;
  if (!TIFFIsCODECConfigured(format.compression)) return _("it is not in this libtiff");
  if (format.compression == COMPRESSION_JPEG) {
    if (!isByte) return _("JPEG stores unsigned samples of 8 bits only");
    if (format.photometric == PHOTOMETRIC_PALETTE) return _("JPEG would mix the palette's entries");
  }
  if (format.compression == COMPRESSION_WEBP) {
    const bool isColour = format.samplesPerPixel == 3 || format.samplesPerPixel == 4;
    if (!isByte || !isColour || format.planar)
      return _(
          "WebP stores 3 or 4 interleaved channels of 8 bits only, and a file beside the image "
          "keeps channels apart");
  }
  if (std::string change = UnfaithfulnessOf(coding); !change.empty()) return change;
  if (TileEncoder::CanEncode(coding)) return "";
  return FormatString(_("it does not take %u channels of %u bits in this form"),
                      format.samplesPerPixel, format.bitsPerSample);
}

/// RGB pixels go into a JPEG as luminance and halved chrominance.
void ChooseJpegColours(LevelCoding& coding) {
  PixelFormat& format = coding.format;
  if (format.planar || format.samplesPerPixel != 3 || format.photometric != PHOTOMETRIC_RGB) return;
  format.photometric = PHOTOMETRIC_YCBCR;
  coding.subsamplingX = coding.subsamplingY = 2;
  coding.inherited.push_back(NumbersEntry(TIFFTAG_YCBCRSUBSAMPLING, TIFF_SHORT, {2, 2}));
}

void Recompress(LevelCompression compression, LevelCoding& coding) {
  const uint16_t codec = CodecOf(compression);
  const uint16_t before = coding.format.compression;
  if (codec == before || (IsDeflate(codec) && IsDeflate(before))) return;
  FallBackToDeflate(coding);
  coding.format.compression = codec;
  if (!TakesPredictor(codec)) coding.predictor = PREDICTOR_NONE;
  if (codec == COMPRESSION_JPEG) ChooseJpegColours(coding);
  if (codec == COMPRESSION_LERC)
    coding.inherited.push_back(
        NumbersEntry(TIFFTAG_LERC_PARAMETERS, TIFF_LONG,
                     {uint64_t{LERC_VERSION_2_4}, uint64_t{LERC_ADD_COMPRESSION_NONE}}));
}

void ApplyTile(const LevelOptions& options, const std::string& file, uint64_t mostTileBytes,
               LevelCoding& coding) {
  if (!options.tileWidth || !options.tileHeight) return;
  coding.format.tileWidth = *options.tileWidth;
  coding.format.tileHeight = *options.tileHeight;
  if (coding.TileBytes() > mostTileBytes)
    Refuse(file, FormatString("TILE=%ux%u", *options.tileWidth, *options.tileHeight),
           FormatString(_("a tile would have more than %u MiB"),
                        static_cast<unsigned>(mostTileBytes >> 20)));
}

void ApplyPredictor(LevelPredictor predictor, const std::string& file, LevelCoding& coding) {
  const auto number =
      static_cast<uint16_t>(predictor == LevelPredictor::kNone         ? PREDICTOR_NONE
                            : predictor == LevelPredictor::kHorizontal ? PREDICTOR_HORIZONTAL
                                                                       : PREDICTOR_FLOATINGPOINT);
  const std::string option = FormatString("PREDICTOR=%u", number);
  if (number != PREDICTOR_NONE && !TakesPredictor(coding.format.compression))
    Refuse(file, option,
           _("the levels' compression takes none; add COMPRESS=DEFLATE, LZW, ZSTD or LZMA"));
  if (number == PREDICTOR_FLOATINGPOINT && !coding.format.type.isFloat)
    Refuse(file, option, _("the samples are no floating point numbers"));
  const uint16_t before = coding.predictor;
  coding.predictor = number;
  if (number != before) coding.imageBytes.reset();
  if (number != PREDICTOR_NONE && number != before && !TileEncoder::CanEncode(coding))
    Refuse(file, option,
           FormatString(_("it does not take samples of %u bits"), coding.format.bitsPerSample));
}

void ApplyNumbers(const LevelOptions& options, const std::string& file, LevelCoding& coding) {
  const uint16_t codec = coding.format.compression;
  if (options.effort) {
    const std::string option = FormatString("LEVEL=%d", *options.effort);
    if (!IsDeflate(codec) && codec != COMPRESSION_ZSTD)
      Refuse(file, option,
             _("the levels' compression has no levels; add COMPRESS=DEFLATE or ZSTD"));
    if (IsDeflate(codec) && *options.effort > kMostDeflateEffort)
      Refuse(file, option, FormatString(_("DEFLATE goes from 1 to %d"), kMostDeflateEffort));
    coding.effort = *options.effort;
    coding.imageBytes.reset();  // the image may have been coded with more
  }
  if (!options.quality) return;
  if (codec != COMPRESSION_JPEG && codec != COMPRESSION_WEBP)
    Refuse(file, FormatString("QUALITY=%d", *options.quality),
           _("the levels' compression is without loss; add COMPRESS=JPEG or WEBP"));
  if (*options.quality > coding.jpegQuality) coding.imageBytes.reset();
  coding.jpegQuality = *options.quality;
}

}  // namespace

void ApplyOptions(const LevelOptions& options, const std::string& file, uint64_t mostTileBytes,
                  LevelCoding& coding) {
  ApplyTile(options, file, mostTileBytes, coding);
  if (options.compression) Recompress(*options.compression, coding);
  if (options.quality && coding.format.compression == COMPRESSION_WEBP)
    coding.webpQuality = options.quality;
  if (options.compression) {
    if (const std::string obstacle = ObstacleIn(coding); !obstacle.empty())
      Refuse(file, TextOf(*options.compression), obstacle);
  } else if (!UnfaithfulnessOf(coding).empty() || BlursAlpha(coding) ||
             !TileEncoder::CanEncode(coding)) {
    FallBackToDeflate(coding);
  }
  if (options.predictor) ApplyPredictor(*options.predictor, file, coding);
  ApplyNumbers(options, file, coding);
}

}  // namespace orin::drivers
