// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tiledecoder.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "host/drivers/common/descriptor.h"
#include "host/drivers/tiff/samplebits.h"
#include "host/drivers/tiff/sparsesample.h"
#include "host/drivers/tiff/structure.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr uint64_t kLargestTile = uint64_t{1} << 30;  // bytes; libtiff is held to the same

uint64_t StoredRowBytes(const TiffHandle& tiff, const PixelFormat& format) {
  return format.tiled ? TIFFTileRowSize64(tiff.Get()) : TIFFScanlineSize64(tiff.Get());
}

/// libtiff swaps 16-bit words, so a complex sample of two bytes comes out with its parts exchanged.
bool PartsAreExchanged(const PixelFormat& format) {
  return format.swapped && format.type.isComplex && format.bitsPerSample == 16;
}

/// Codecs that may leave pixels of a damaged tile as they were, and say nothing.
bool MayLeaveGaps(uint16_t compression) {
  switch (compression) {
    case COMPRESSION_NONE:
    case COMPRESSION_LZW:
    case COMPRESSION_ADOBE_DEFLATE:
    case COMPRESSION_DEFLATE:
    case COMPRESSION_PACKBITS:
    case COMPRESSION_LZMA:
    case COMPRESSION_ZSTD:
      return false;
    default:
      return true;
  }
}

bool IsRawLayout(const PixelFormat& format) {
  return format.compression == COMPRESSION_NONE && format.fillOrder == FILLORDER_MSB2LSB &&
         format.WholeBytes() && (!format.swapped || format.bitsPerSample == 8);
}

/// What the directory at which `tiff` stands claims to tell; libtiff fills a short table up with
/// tiles that are not stored.
uint64_t TableLength(const TiffHandle& tiff) {
  TiffStructure structure;
  structure.isBig = TIFFIsBigTIFF(tiff.Get()) != 0;
  structure.byteOrder.order = TIFFIsBigEndian(tiff.Get()) ? std::endian::big : std::endian::little;
  const PositionedFile file(tiff.Path(), PositionedFile::Mode::kRead);
  const auto directory = ReadDirectoryAt(file, structure, TIFFCurrentDirOffset(tiff.Get()));
  const TiffEntry* table = directory ? directory->Find(TIFFTAG_TILEOFFSETS) : nullptr;
  if (directory && !table) table = directory->Find(TIFFTAG_STRIPOFFSETS);
  return table ? table->count : 0;
}

}  // namespace

TileDecoder::TileDecoder(const std::string& path, uint64_t directoryOffset)
    : tiff_(TiffHandle::OpenAt(path, directoryOffset)),
      format_(FormatOf(tiff_)),
      storedRowBytes_(StoredRowBytes(tiff_, format_)),
      raw_(IsRawLayout(format_)),
      sparseSample_(orin::drivers::SparseSample(format_.noData, format_.type)),
      tableLength_(TableLength(tiff_)) {
  const uint64_t samples = uint64_t{format_.tileWidth} * format_.TileSamples();
  if (storedRowBytes_ != PackedBytes(samples, format_.bitsPerSample))
    FailToRead(path, _("its rows have a length that its layout does not explain"));
}

void TileDecoder::Fail(uint32_t tile, const std::string& reason) const {
  FailToRead(tiff_.Path(),
             FormatString(format_.tiled ? _("tile %u: %s") : _("strip %u: %s"), tile,
                          reason.empty() ? _("its data are damaged") : reason.c_str()));
}

bool TileDecoder::IsSparse(uint32_t tile) const {
  if (tile >= tableLength_) Fail(tile, _("the file's table of tiles ends before it"));
  return TIFFGetStrileByteCount(tiff_.Get(), tile) == 0 ||
         TIFFGetStrileOffset(tiff_.Get(), tile) == 0;
}

uint32_t TileDecoder::RowsOf(uint32_t tile) const {
  const uint64_t gridRow = tile % format_.TilesPerPlane() / format_.TilesAcross();
  const uint64_t first = gridRow * format_.tileHeight;
  return static_cast<uint32_t>(std::min<uint64_t>(format_.tileHeight, format_.height - first));
}

void TileDecoder::RequireDecodable(uint32_t tile, uint32_t rows) const {
  const uint64_t offset = TIFFGetStrileOffset(tiff_.Get(), tile);
  const uint64_t bytes = TIFFGetStrileByteCount(tiff_.Get(), tile);
  if (offset > tiff_.FileSize() || bytes > tiff_.FileSize() - offset)
    Fail(tile, _("the file ends before it does"));
  const uint64_t rowBytes = std::max(storedRowBytes_, format_.TileRowBytes());
  if (rowBytes > kLargestTile / rows)
    Fail(tile,
         FormatString(_("it takes %u times %llu bytes, more than the %llu that are supported"),
                      rows, static_cast<unsigned long long>(rowBytes),
                      static_cast<unsigned long long>(kLargestTile)));
}

void TileDecoder::ReadRaw(uint32_t tile, uint64_t from, uint64_t count, uint8_t* bytes) const {
  const uint64_t start = TIFFGetStrileOffset(tiff_.Get(), tile);
  const uint64_t held = TIFFGetStrileByteCount(tiff_.Get(), tile);
  if (from > held || count > held - from)
    Fail(tile, _("it holds fewer bytes than its pixels take"));
  if (start > tiff_.FileSize() || from + count > tiff_.FileSize() - start)
    Fail(tile, _("the file ends before it does"));
  const Transfer done = ReadAt(tiff_.Descriptor(), start + from, bytes, count);
  if (done.error != 0) Fail(tile, std::strerror(done.error));
  if (done.bytes < count) Fail(tile, _("the file ends before it does"));
}

void TileDecoder::Decode(uint32_t tile, uint8_t* samples) {
  const uint32_t rows = format_.tiled ? format_.tileHeight : RowsOf(tile);
  const uint64_t rowBytes = format_.TileRowBytes();
  if (IsSparse(tile)) {
    const uint64_t sampleBytes = sparseSample_.size();
    for (uint64_t at = 0; at < rows * rowBytes; at += sampleBytes)
      std::memcpy(samples + at, sparseSample_.data(), sampleBytes);
  } else if (raw_) {
    ReadRaw(tile, 0, rows * rowBytes, samples);
  } else {
    DecodeStored(tile, rows, samples);
  }
  const uint32_t inside = RowsOf(tile);
  std::memset(samples + inside * rowBytes, 0, (format_.tileHeight - inside) * rowBytes);
}

/// Where libtiff shall put its rows: straight into `samples` where they are delivered rows.
uint8_t* TileDecoder::StoredRows(uint64_t bytes, uint8_t* samples) {
  if (format_.WholeBytes()) return samples;
  if (storedCapacity_ < bytes) {
    stored_ = std::make_unique_for_overwrite<uint8_t[]>(bytes);
    storedCapacity_ = bytes;
  }
  return stored_.get();
}

void TileDecoder::DecodeStored(uint32_t tile, uint32_t rows, uint8_t* samples) {
  RequireDecodable(tile, rows);
  const uint64_t bytes = rows * storedRowBytes_;
  uint8_t* target = StoredRows(bytes, samples);
  if (MayLeaveGaps(format_.compression)) std::memset(target, 0, bytes);
  tiff_.ClearErrors();
  const auto size = static_cast<tmsize_t>(bytes);
  const tmsize_t got = format_.tiled ? TIFFReadEncodedTile(tiff_.Get(), tile, target, size)
                                     : TIFFReadEncodedStrip(tiff_.Get(), tile, target, size);
  if (got != size || !tiff_.FirstError().empty()) Fail(tile, tiff_.FirstError());
  Deliver(target, rows, samples);
}

void TileDecoder::DecodeRows(uint32_t strip, uint32_t firstRow, uint32_t count, uint8_t* samples) {
  RequireDecodable(strip, count);
  if (strip != openStrip_ || firstRow < nextRow_) nextRow_ = 0;
  openStrip_ = strip;
  while (nextRow_ < firstRow) DecodeRow(samples);  // no codec skips rows; this one is overwritten
  for (uint32_t row = 0; row < count; ++row, samples += format_.TileRowBytes()) {
    const uint8_t* stored = DecodeRow(samples);
    Deliver(stored, 1, samples);
  }
}

/// Decodes the open strip's next row. \returns where libtiff put it, which is `samples` if it can
/// be
const uint8_t* TileDecoder::DecodeRow(uint8_t* samples) {
  const auto plane = static_cast<uint16_t>(openStrip_ / format_.TilesPerPlane());
  const uint64_t stripRow = openStrip_ % format_.TilesPerPlane() * format_.tileHeight;
  uint8_t* target = StoredRows(storedRowBytes_, samples);
  if (MayLeaveGaps(format_.compression)) std::memset(target, 0, storedRowBytes_);
  const auto row = static_cast<uint32_t>(stripRow + nextRow_++);
  tiff_.ClearErrors();
  const bool decoded = TIFFReadScanline(tiff_.Get(), target, row, plane) == 1;
  if (decoded && tiff_.FirstError().empty()) return target;
  nextRow_ = UINT32_MAX;  // start afresh
  Fail(openStrip_, tiff_.FirstError());
}

void TileDecoder::Deliver(const uint8_t* stored, uint64_t rows, uint8_t* samples) const {
  const uint64_t count = uint64_t{format_.tileWidth} * format_.TileSamples();
  if (!format_.WholeBytes())
    for (uint64_t row = 0; row < rows; ++row)
      UnpackSamples(stored + row * storedRowBytes_, format_.bitsPerSample, count,
                    format_.type.isSigned, samples + row * format_.TileRowBytes(),
                    format_.SampleBytes());
  else if (PartsAreExchanged(format_))
    for (uint64_t i = 0; i < rows * count; ++i) std::swap(samples[2 * i], samples[2 * i + 1]);
}

}  // namespace orin::drivers
