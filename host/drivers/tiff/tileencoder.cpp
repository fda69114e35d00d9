// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tileencoder.h"

#include <utility>

#include "host/drivers/tiff/memorytiff.h"
#include "host/drivers/tiff/samplebits.h"
#include "host/services/exception.h"

namespace orin::drivers {
namespace {

/// Fields by which a codec goes, in the order that libtiff wants.
bool SetLayout(TIFF* tiff, const LevelCoding& coding) {
  const PixelFormat& format = coding.format;
  const int planar = format.planar ? PLANARCONFIG_SEPARATE : PLANARCONFIG_CONTIG;
  return TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, format.tileWidth) &&
         TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, format.tileHeight) &&
         TIFFSetField(tiff, TIFFTAG_TILEWIDTH, format.tileWidth) &&
         TIFFSetField(tiff, TIFFTAG_TILELENGTH, format.tileHeight) &&
         TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, format.bitsPerSample) &&
         TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, format.samplesPerPixel) &&
         TIFFSetField(tiff, TIFFTAG_SAMPLEFORMAT, format.sampleFormat) &&
         TIFFSetField(tiff, TIFFTAG_PLANARCONFIG, planar) &&
         TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, format.photometric) &&
         TIFFSetField(tiff, TIFFTAG_COMPRESSION, format.compression);
}

bool SetCodec(TIFF* tiff, const LevelCoding& coding) {
  if (coding.predictor != PREDICTOR_NONE &&
      !TIFFSetField(tiff, TIFFTAG_PREDICTOR, coding.predictor))
    return false;
  if (coding.format.photometric == PHOTOMETRIC_YCBCR &&
      !TIFFSetField(tiff, TIFFTAG_YCBCRSUBSAMPLING, coding.subsamplingX, coding.subsamplingY))
    return false;
  switch (coding.format.compression) {
    case COMPRESSION_JPEG:
      if (coding.IsJpegYCbCr() && !TIFFSetField(tiff, TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB))
        return false;
      return TIFFSetField(tiff, TIFFTAG_JPEGQUALITY, coding.jpegQuality) &&
             TIFFSetField(tiff, TIFFTAG_JPEGTABLESMODE, 0);  // every tile stands alone
    case COMPRESSION_WEBP:
      if (coding.webpQuality) return TIFFSetField(tiff, TIFFTAG_WEBP_LEVEL, *coding.webpQuality);
      return TIFFSetField(tiff, TIFFTAG_WEBP_LOSSLESS, 1);
    case COMPRESSION_DEFLATE:
    case COMPRESSION_ADOBE_DEFLATE:
      return coding.effort == 0 || TIFFSetField(tiff, TIFFTAG_ZIPQUALITY, coding.effort);
    case COMPRESSION_ZSTD:
      return coding.effort == 0 || TIFFSetField(tiff, TIFFTAG_ZSTD_LEVEL, coding.effort);
    case COMPRESSION_LERC:
      return TIFFSetField(tiff, TIFFTAG_LERC_ADD_COMPRESSION, coding.lercExtra) &&
             TIFFSetField(tiff, TIFFTAG_LERC_MAXZERROR, 0.0);
    default:
      return true;
  }
}

/// Codecs of which libtiff has the reading side only, or that take no plain samples.
bool IsReadOnlyCodec(uint16_t compression) {
  switch (compression) {
    case COMPRESSION_OJPEG:
    case COMPRESSION_NEXT:
    case COMPRESSION_THUNDERSCAN:
    case COMPRESSION_CCITTRLE:
    case COMPRESSION_CCITTRLEW:
    case COMPRESSION_CCITTFAX3:
    case COMPRESSION_CCITTFAX4:
    case COMPRESSION_JBIG:
    case COMPRESSION_SGILOG:
    case COMPRESSION_SGILOG24:
    case COMPRESSION_PIXARLOG:
      return true;
    default:
      return !TIFFIsCODECConfigured(compression);
  }
}

/// Bytes that a file's byte order turns round together; 1 for strings of bits.
unsigned StoredUnit(const PixelFormat& format) {
  if (format.WholeBytes()) return BytesPerComponent(format.type);
  return format.bitsPerSample == 24 ? 3 : 1;  // libtiff takes 24 bits for a number
}

/// libtiff turns 16-bit words round, and so the two bytes of a complex sample, which have no order.
bool ExchangesParts(const LevelCoding& coding) {
  return coding.byteOrder.IsSwapped() && coding.format.type.isComplex &&
         coding.format.bitsPerSample == 16;
}

void ExchangeParts(std::vector<uint8_t>& samples) {
  for (size_t i = 0; i + 1 < samples.size(); i += 2) std::swap(samples[i], samples[i + 1]);
}

}  // namespace

TileEncoder::TileEncoder(const LevelCoding& coding, std::string file)
    : coding_(coding), file_(std::move(file)) {}

std::vector<uint8_t> TileEncoder::Pack(const std::vector<uint8_t>& samples) const {
  const PixelFormat& format = coding_.format;
  if (format.WholeBytes()) return samples;
  const uint64_t count = uint64_t{format.tileWidth} * format.TileSamples();
  const uint64_t packedRow = PackedBytes(count, format.bitsPerSample);
  std::vector<uint8_t> packed(packedRow * format.tileHeight);
  for (uint32_t row = 0; row < format.tileHeight; ++row)
    PackSamples(&samples[row * format.TileRowBytes()], format.SampleBytes(), count,
                format.bitsPerSample, format.type.isSigned, &packed[row * packedRow]);
  return packed;
}

std::vector<uint8_t> TileEncoder::Unpack(const std::vector<uint8_t>& packed) const {
  const PixelFormat& format = coding_.format;
  if (format.WholeBytes()) return packed;
  const uint64_t count = uint64_t{format.tileWidth} * format.TileSamples();
  const uint64_t packedRow = PackedBytes(count, format.bitsPerSample);
  std::vector<uint8_t> samples(coding_.TileBytes());
  for (uint32_t row = 0; row < format.tileHeight; ++row)
    UnpackSamples(&packed[row * packedRow], format.bitsPerSample, count, format.type.isSigned,
                  &samples[row * format.TileRowBytes()], format.SampleBytes());
  return samples;
}

std::vector<uint8_t> TileEncoder::Encode(const std::vector<uint8_t>& samples,
                                         uint32_t plane) const {
  std::vector<uint8_t> packed = Pack(samples);  // a copy: bytes are turned round in place
  if (coding_.format.compression == COMPRESSION_NONE) {
    coding_.byteOrder.Swap(packed, StoredUnit(coding_.format));
    return packed;
  }
  if (ExchangesParts(coding_)) ExchangeParts(packed);
  const MemoryTiff memory(CodecOrder(), file_);
  if (!SetLayout(memory.Get(), coding_) || !SetCodec(memory.Get(), coding_)) memory.Fail();
  const auto size = static_cast<tmsize_t>(packed.size());
  if (TIFFTileSize(memory.Get()) != size) memory.Fail();
  if (TIFFWriteEncodedTile(memory.Get(), plane, packed.data(), size) != size) memory.Fail();
  return memory.StoredTile(plane);
}

std::vector<uint8_t> TileEncoder::Decode(const std::vector<uint8_t>& stored, uint32_t plane) const {
  const PixelFormat& format = coding_.format;
  if (format.compression == COMPRESSION_NONE) {
    std::vector<uint8_t> packed = stored;
    coding_.byteOrder.Swap(packed, StoredUnit(format));
    return Unpack(packed);
  }
  const MemoryTiff memory(CodecOrder(), file_);
  if (!SetLayout(memory.Get(), coding_) || !SetCodec(memory.Get(), coding_)) memory.Fail();
  std::vector<uint8_t> bytes = stored;  // a copy: libtiff takes no constant
  const auto storedSize = static_cast<tmsize_t>(bytes.size());
  if (TIFFWriteRawTile(memory.Get(), plane, bytes.data(), storedSize) != storedSize) memory.Fail();
  // A handle that has written only has no buffer to read into.
  if (!TIFFReadBufferSetup(memory.Get(), nullptr, storedSize)) memory.Fail();
  std::vector<uint8_t> packed(static_cast<size_t>(TIFFTileSize(memory.Get())));
  const auto size = static_cast<tmsize_t>(packed.size());
  if (TIFFReadEncodedTile(memory.Get(), plane, packed.data(), size) != size) memory.Fail();
  if (ExchangesParts(coding_)) ExchangeParts(packed);
  return Unpack(packed);
}

/// The floating point predictor has one order in every file, which libtiff 4.5 gets wrong in files
/// of the other byte order.
std::endian TileEncoder::CodecOrder() const {
  const bool hasOwnOrder = coding_.predictor == PREDICTOR_FLOATINGPOINT;
  return hasOwnOrder ? std::endian::native : coding_.byteOrder.order;
}

bool TileEncoder::CanEncode(const LevelCoding& coding) {
  if (IsReadOnlyCodec(coding.format.compression)) return false;
  LevelCoding trial = coding;
  trial.format.tileWidth = trial.format.tileHeight = 16;
  try {
    TileEncoder(trial, "").Encode(std::vector<uint8_t>(trial.TileBytes()), 0);
    return true;
  } catch (const Exception&) {
    return false;
  }
}

}  // namespace orin::drivers
