// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/pixelreader.h"

#include <algorithm>
#include <cstring>
#include <numeric>
#include <utility>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr uint64_t kLongStrip = uint64_t{16} << 20;   // bytes; a longer one is decoded in bands
constexpr uint64_t kBand = uint64_t{2} << 20;         // bytes
constexpr uint64_t kRawChunk = uint64_t{1} << 20;     // bytes of one positioned read
constexpr uint64_t kSmallCache = uint64_t{32} << 20;  // bytes that are always granted
constexpr double kStripCache = 256 << 20;             // bytes that strips may take
constexpr double kTileCache = 1 << 30;                // bytes that tiles may take

uint32_t BandRows(const TileDecoder& decoder) {
  const PixelFormat& format = decoder.Format();
  const uint64_t rowBytes = format.TileRowBytes();
  if (format.tiled || decoder.IsRaw() || rowBytes <= kLongStrip / format.tileHeight)
    return format.tileHeight;
  return static_cast<uint32_t>(std::clamp<uint64_t>(kBand / rowBytes, 1, format.tileHeight));
}

/// The block with bytes in place of bits: the addressing rule is not for the bit type.
gobs::RasterInfo ByteInfo(const gobs::Raster& block) {
  const bool bits = block.dataType == gobs::eDT_BIT;
  return {block.width, block.height, block.channelCount, bits ? gobs::eDT_8U : block.dataType};
}

/// Bytes of what is decoded together; a hostile product stands as more than can be decoded.
uint64_t UnitBytes(const PixelFormat& format, uint32_t rows) {
  constexpr uint64_t kTooMany = uint64_t{1} << 40;
  return format.TileRowBytes() > kTooMany / rows ? kTooMany : format.TileRowBytes() * rows;
}

/// Along one axis: the unit lies inside the block and no neighbouring block's margin reaches it.
bool IsInner(int64_t first, int64_t count, int64_t blockFirst, int64_t blockCount, int64_t margin,
             int64_t size) {
  const int64_t low = blockFirst == 0 ? 0 : blockFirst + margin;
  const int64_t high = blockFirst + blockCount >= size ? size : blockFirst + blockCount - margin;
  return first >= low && first + count <= high;
}

}  // namespace

PixelReader::PixelReader(const std::string& path, uint64_t directoryOffset,
                         std::vector<unsigned> channels)
    : decoder_(path, directoryOffset),
      bandRows_(BandRows(decoder_)),
      copy_(datasources::CopierOf(Format().SampleBytes())),
      cache_(UnitBytes(Format(), bandRows_)) {
  for (const unsigned channel : channels)
    if (channel < 1 || channel > Format().samplesPerPixel)
      FailToRead(path, FormatString(_("there is no channel %u, the file has %u"), channel,
                                    Format().samplesPerPixel));
  if (Format().planar) {
    for (uint32_t i = 0; i < channels.size(); ++i)
      planes_.push_back({channels[i] - 1, {0}, {i}, channels.size() == 1});
  } else {
    Plane plane{0, {}, std::vector<uint32_t>(channels.size()), false};
    for (const unsigned channel : channels) plane.samples.push_back(channel - 1);
    std::iota(plane.channels.begin(), plane.channels.end(), 0);
    plane.wholePixels =
        plane.samples == plane.channels && channels.size() == Format().samplesPerPixel;
    planes_.push_back(std::move(plane));
  }
  if (bandRows_ <
      Format().tileHeight)  // one position each: going back means decoding from the start
    for (size_t i = 1; i < planes_.size(); ++i)
      planeDecoders_.push_back(std::make_unique<TileDecoder>(path, directoryOffset));
}

TileDecoder& PixelReader::DecoderOf(size_t plane) {
  return plane == 0 || planeDecoders_.empty() ? decoder_ : *planeDecoders_[plane - 1];
}

void PixelReader::Read(gobs::Raster& block) {
  gobs::Raster target(ByteInfo(block), block.Window(), block.data);
  const datasources::InsideWindow window =
      datasources::InsideOf(target, Format().width, Format().height);
  LimitCache(window);
  const int64_t right = window.x + window.width;
  const int64_t bottom = window.y + window.height;
  for (int64_t y = window.y; y < bottom;) {
    int64_t nextY = bottom;
    for (int64_t x = window.x; x < right;) {
      const Unit unit = UnitAt(x, y);
      const int64_t nextX = std::min(unit.x + unit.width, right);
      nextY = std::min(unit.y + unit.rows, bottom);
      ReadUnit(unit, {x, y, nextX - x, nextY - y}, target);
      x = nextX;
    }
    y = nextY;
  }
  datasources::RepeatEdges(target, window);
}

PixelReader::Unit PixelReader::UnitAt(int64_t x, int64_t y) const {
  const PixelFormat& format = Format();
  const int64_t column = x / format.tileWidth;
  const int64_t gridRow = y / format.tileHeight;
  const int64_t rowInTile = y % format.tileHeight;
  Unit unit;
  unit.tile = static_cast<uint32_t>(gridRow * int64_t(format.TilesAcross()) + column);
  unit.firstRow = static_cast<uint32_t>(rowInTile - rowInTile % bandRows_);
  unit.x = column * format.tileWidth;
  unit.y = gridRow * format.tileHeight + unit.firstRow;
  unit.width = std::min<int64_t>(format.tileWidth, format.width - unit.x);
  unit.rows = static_cast<uint32_t>(
      std::min<int64_t>({bandRows_, format.tileHeight - unit.firstRow, format.height - unit.y}));
  return unit;
}

/// Enough that a row of blocks decodes no tile twice; strips: that blocks beside each other do not.
void PixelReader::LimitCache(const datasources::InsideWindow& window) {
  if (window.width <= 0 || window.height <= 0) return;
  const PixelFormat& format = Format();
  const auto touched = [](int64_t first, int64_t count, int64_t size) {
    return double((first + count - 1) / size - first / size + 1);
  };
  const double unitRowBytes = touched(window.x, window.width, format.tileWidth) *
                              double(planes_.size()) * double(UnitBytes(format, bandRows_));
  const double rows = format.tiled ? 2 : touched(window.y, window.height, bandRows_) + 1;
  const double most = format.tiled ? kTileCache : kStripCache;
  cache_.SetLimit(std::max(kSmallCache, uint64_t(std::min(rows * unitRowBytes, most))));
}

void PixelReader::ReadUnit(const Unit& unit, const Piece& piece, gobs::Raster& block) {
  const bool keep =
      !IsInner(unit.x, unit.width, block.x, block.width, block.marginX, Format().width) ||
      !IsInner(unit.y, unit.rows, block.y, block.height, block.marginY, Format().height);
  const uint64_t pixelBytes = uint64_t{Format().TileSamples()} * Format().SampleBytes();
  for (size_t i = 0; i < planes_.size(); ++i) {
    const Plane& plane = planes_[i];
    Unit own = unit;
    own.tile += static_cast<uint32_t>(plane.number * Format().TilesPerPlane());
    if (decoder_.IsSparse(own.tile)) FillSparse(plane, piece, block);
    else if (decoder_.IsRaw()) CopyRaw(own, plane, piece, block);
    else {
      Rows rows = Decoded(own, i, keep);
      rows.first += uint64_t(piece.y - own.y) * rows.bytes + uint64_t(piece.x - own.x) * pixelBytes;
      CopyRows(rows, plane, piece, block);
    }
  }
}

PixelReader::Rows PixelReader::Decoded(const Unit& unit, size_t plane, bool keep) {
  const PixelFormat& format = Format();
  const uint64_t rowBytes = format.TileRowBytes();
  const uint64_t key = uint64_t{unit.tile} << 32 | unit.firstRow;
  if (const uint8_t* found = cache_.Find(key)) return {found, rowBytes};
  decoder_.RequireDecodable(unit.tile, bandRows_);
  if (!keep && !scratch_)
    scratch_ = std::make_unique_for_overwrite<uint8_t[]>(bandRows_ * rowBytes);
  TileCache::Buffer kept = keep ? cache_.NewBuffer() : nullptr;
  uint8_t* samples = keep ? kept.get() : scratch_.get();
  if (bandRows_ == format.tileHeight) decoder_.Decode(unit.tile, samples);
  else DecoderOf(plane).DecodeRows(unit.tile, unit.firstRow, unit.rows, samples);
  return {keep ? cache_.Keep(key, std::move(kept)) : samples, rowBytes};
}

void PixelReader::CopyRaw(const Unit& unit, const Plane& plane, const Piece& piece,
                          gobs::Raster& block) {
  const uint64_t rowBytes = Format().TileRowBytes();
  const uint64_t pixelBytes = uint64_t{Format().TileSamples()} * Format().SampleBytes();
  const uint64_t skipped = uint64_t(piece.x - unit.x) * pixelBytes;
  const uint64_t start = uint64_t(piece.y - unit.y) * rowBytes;
  const bool isContiguous = piece.width == Format().tileWidth && piece.width == block.stride;
  if (plane.wholePixels && isContiguous) {
    decoder_.ReadRaw(unit.tile, start, uint64_t(piece.height) * rowBytes,
                     PixelAddress(block, piece.x - block.x, piece.y - block.y));
    return;
  }
  if (!scratch_) scratch_ = std::make_unique_for_overwrite<uint8_t[]>(kRawChunk);
  const bool wholeRows =
      rowBytes <= kRawChunk && uint64_t(piece.width) * pixelBytes * 4 >= rowBytes;
  const int64_t chunkHeight = wholeRows ? int64_t(kRawChunk / rowBytes) : 1;
  const int64_t chunkWidth = wholeRows ? piece.width : int64_t(kRawChunk / pixelBytes);
  for (int64_t y = 0; y < piece.height; y += chunkHeight)
    for (int64_t x = 0; x < piece.width; x += chunkWidth) {
      const Piece chunk{piece.x + x, piece.y + y, std::min(chunkWidth, piece.width - x),
                        std::min(chunkHeight, piece.height - y)};
      const uint64_t from =
          start + uint64_t(y) * rowBytes + (wholeRows ? 0 : skipped + uint64_t(x) * pixelBytes);
      const uint64_t count =
          wholeRows ? uint64_t(chunk.height) * rowBytes : uint64_t(chunk.width) * pixelBytes;
      decoder_.ReadRaw(unit.tile, from, count, scratch_.get());
      CopyRows({scratch_.get() + (wholeRows ? skipped : 0), rowBytes}, plane, chunk, block);
    }
}

void PixelReader::FillSparse(const Plane& plane, const Piece& piece, gobs::Raster& block) const {
  const std::vector<uint8_t>& sample = decoder_.SparseSample();
  const bool oneByte =
      std::count(sample.begin(), sample.end(), sample[0]) == int64_t(sample.size());
  const bool wholePixels = plane.channels.size() == block.channelCount;
  const auto count = uint64_t(piece.width);
  const uint8_t* first = nullptr;  // a row to copy
  for (int64_t y = piece.y; y < piece.y + piece.height; ++y) {
    uint8_t* to = PixelAddress(block, piece.x - block.x, y - block.y);
    if (oneByte && wholePixels) std::memset(to, sample[0], count * PixelBytes(block));
    else if (wholePixels && first) std::memcpy(to, first, count * PixelBytes(block));
    else
      for (const uint32_t channel : plane.channels)
        copy_(sample.data(), 0, to + channel * sample.size(), block.channelCount, count);
    if (!first) first = to;
  }
}

void PixelReader::CopyRows(const Rows& rows, const Plane& plane, const Piece& piece,
                           gobs::Raster& block) const {
  const uint64_t sampleBytes = Format().SampleBytes();
  const uint64_t blockPixel = PixelBytes(block);
  for (int64_t row = 0; row < piece.height; ++row) {
    const uint8_t* from = rows.first + uint64_t(row) * rows.bytes;
    uint8_t* to = PixelAddress(block, piece.x - block.x, piece.y + row - block.y);
    if (plane.wholePixels) std::memcpy(to, from, uint64_t(piece.width) * blockPixel);
    else
      for (size_t i = 0; i < plane.samples.size(); ++i)
        copy_(from + plane.samples[i] * sampleBytes, Format().TileSamples(),
              to + plane.channels[i] * sampleBytes, block.channelCount, uint64_t(piece.width));
  }
}

}  // namespace orin::drivers
