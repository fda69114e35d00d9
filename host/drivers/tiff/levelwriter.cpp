// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelwriter.h"

#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstring>
#include <functional>
#include <numeric>
#include <utility>

#include "basic/gobs/mask/mask.h"
#include "host/drivers/tiff/sparsesample.h"
#include "host/drivers/tiff/tiffhandle.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/services/text.h"

namespace orin::drivers {

using gobs::Raster;

LevelWriter::LevelWriter(TiffLevelStore& store, std::string file, unsigned level,
                         std::vector<unsigned> channels, const PixelFormat& format)
    : store_(store),
      file_(std::move(file)),
      level_(level),
      channels_(std::move(channels)),
      format_(format) {}

LevelWriter::~LevelWriter() {
  if (build_) store_.EndWriting(level_, *build_);
}

datasources::AuxiliaryData LevelWriter::GetAuxiliaryData() const {
  datasources::AuxiliaryData::Items items;
  if (!format_.noData.empty()) items[datasources::kNoDataKey] = format_.noData;
  return {std::move(items), std::vector<datasources::AuxiliaryData::Items>(channels_.size())};
}

void LevelWriter::Read(Raster& block) {
  RequireFittingBlock(block, *this, file_);
  if (!reader_) reader_ = store_.OpenPixels(level_, channels_);
  if (!validity_)
    validity_ = std::make_unique<LevelValidity>(store_.OpenValidity(level_, channels_));
  reader_->Read(block);
  if (validity_->alphaPosition) datasources::AddOpacity(*validity_->alphaPosition, block);
  if (validity_->reader) datasources::AddValidity(*validity_->reader, block);
}

void LevelWriter::Begin() {
  if (build_) store_.EndWriting(level_, *build_);
  build_.reset();
  tiles_.clear();
  mask_.reset();
  hasAskedForMask_ = false;
  build_ = store_.BeginWriting(level_, channels_);
  const LevelCoding& coding = build_->Coding();
  encoder_ = std::make_unique<TileEncoder>(coding, file_);
  copy_ = datasources::CopierOf(format_.SampleBytes());
  isPartOfPixels_ = !format_.planar && channels_.size() < format_.samplesPerPixel;
  storedTiles_ = isPartOfPixels_ ? store_.OpenStoredTiles(level_) : nullptr;
  if (coding.mayBeSparse) sparseSample_ = SparseSample(format_.noData, format_.type);
}

void LevelWriter::Write(const Raster& block) {
  RequireFittingBlock(block, *this, file_);
  if (!build_ || build_->isClosed) Begin();
  if (block.validity) WriteMask(block);
  const uint32_t tileWidth = format_.tileWidth;
  const uint32_t tileHeight = format_.tileHeight;
  for (uint32_t y = block.y; y < block.y + block.height;) {
    const uint32_t tileY = y - y % tileHeight;
    const uint32_t insideHeight = std::min(tileHeight, format_.height - tileY);
    const uint32_t height = std::min(tileY + insideHeight, block.y + block.height) - y;
    for (uint32_t x = block.x; x < block.x + block.width;) {
      const uint32_t tileX = x - x % tileWidth;
      const uint32_t insideWidth = std::min(tileWidth, format_.width - tileX);
      const uint32_t width = std::min(tileX + insideWidth, block.x + block.width) - x;
      const uint64_t tile = tileY / tileHeight * format_.TilesAcross() + tileX / tileWidth;
      WritePiece(block, {tile, x, y, width, height, tileX, tileY, insideWidth, insideHeight});
      x += width;
    }
    y += height;
  }
}

void LevelWriter::WriteMask(const Raster& block) {
  if (!hasAskedForMask_) mask_ = store_.BeginMask(level_, channels_, *build_);
  hasAskedForMask_ = true;
  if (mask_) mask_->Write(block);
}

/// Opacity tells what holds data: it is 0 in pixels without, whatever value their channels were
/// filled with, and 1 at least in the others, where bicubic may have gone below.
void LevelWriter::SettleAlpha(const Raster& block, const Piece& piece,
                              const std::vector<unsigned>& positions, OpenTile& to) const {
  const auto isAlpha = [this](unsigned position) {
    return channels_[position] == store_.AlphaChannel();
  };
  const auto alpha = std::find_if(positions.begin(), positions.end(), isAlpha);
  if (!block.validity || alpha == positions.end()) return;
  const uint64_t sample = format_.SampleBytes();
  const uint64_t inTile = format_.planar ? 0 : channels_[*alpha] - 1;
  const bool isCounted = !format_.type.isFloat && !format_.type.isComplex;
  for (uint32_t y = piece.y; y < piece.y + piece.height; ++y)
    for (uint32_t x = piece.x; x < piece.x + piece.width; ++x) {
      const uint64_t pixel = uint64_t{y - piece.tileY} * format_.tileWidth + (x - piece.tileX);
      uint8_t* opacity = &to.samples[(pixel * format_.TileSamples() + inTile) * sample];
      if (!block.validity->IsValid(int64_t{x} - block.x, int64_t{y} - block.y))
        std::memset(opacity, 0, sample);
      else if (isCounted && std::count(opacity, opacity + sample, 0) == std::ptrdiff_t(sample))
        opacity[std::endian::native == std::endian::little ? 0 : sample - 1] = 1;
    }
}

void LevelWriter::WritePiece(const Raster& block, const Piece& piece) {
  if (!format_.planar) {
    std::vector<unsigned> positions(channels_.size());
    std::iota(positions.begin(), positions.end(), 0u);
    WriteInto(block, piece, 0, positions);
    return;
  }
  for (unsigned i = 0; i < channels_.size(); ++i) WriteInto(block, piece, channels_[i] - 1, {i});
}

/// \param positions  of the channels in the block that belong into the plane
void LevelWriter::WriteInto(const Raster& block, const Piece& piece, uint32_t plane,
                            const std::vector<unsigned>& positions) {
  const uint64_t tile = plane * format_.TilesPerPlane() + piece.tile;
  auto open = tiles_.find(tile);
  if (open == tiles_.end()) {
    build_->Forget(tile);
    open = tiles_.emplace(tile, MakeTile(tile, piece)).first;
  }
  CopyPixels(block, piece, positions, open->second);
  SettleAlpha(block, piece, positions, open->second);
  Cover(piece, format_.tileWidth, open->second);
  if (open->second.missing > 0) return;
  Finish(tile, plane, piece, open->second.samples);
  spare_.swap(open->second.samples);
  tiles_.erase(open);
}

LevelWriter::OpenTile LevelWriter::MakeTile(uint64_t tile, const Piece& piece) {
  OpenTile open;
  open.samples.swap(spare_);
  open.samples.resize(build_->Coding().TileBytes());  // pieces and padding cover all of it
  open.missing = uint64_t{piece.insideWidth} * piece.insideHeight;
  if (open.missing > uint64_t{piece.width} * piece.height)
    open.isCovered.resize(uint64_t{format_.tileWidth} * format_.tileHeight);
  if (isPartOfPixels_) std::fill(open.samples.begin(), open.samples.end(), uint8_t{0});
  if (storedTiles_) storedTiles_->ReadTile(static_cast<uint32_t>(tile), open.samples.data());
  return open;
}

void LevelWriter::CopyPixels(const Raster& block, const Piece& piece,
                             const std::vector<unsigned>& positions, OpenTile& to) const {
  const uint64_t sample = format_.SampleBytes();
  const uint64_t pixel = sample * format_.TileSamples();
  const bool areWholePixels =
      positions.size() == format_.TileSamples() && positions.size() == channels_.size() &&
      std::adjacent_find(channels_.begin(), channels_.end(), std::greater_equal<>()) ==
          channels_.end();
  for (uint32_t row = 0; row < piece.height; ++row) {
    const uint64_t first =
        uint64_t{piece.y - piece.tileY + row} * format_.tileWidth + (piece.x - piece.tileX);
    uint8_t* target = &to.samples[first * pixel];
    const uint64_t source =
        LayoutOf(block).Index(int64_t{piece.x} - block.x, int64_t{piece.y} - block.y + row);
    const uint8_t* from = block.data + source * sample * channels_.size();
    if (areWholePixels) {
      std::memcpy(target, from, piece.width * pixel);
      continue;
    }
    for (const unsigned position : positions) {
      const uint64_t inTile = format_.planar ? 0 : channels_[position] - 1;
      copy_(from + position * sample, channels_.size(), target + inTile * sample,
            format_.TileSamples(), piece.width);
    }
  }
}

void LevelWriter::Cover(const Piece& piece, uint32_t tileWidth, OpenTile& tile) {
  if (tile.isCovered.empty()) {
    tile.missing = 0;
    return;
  }
  for (uint32_t row = 0; row < piece.height; ++row) {
    uint8_t* first =
        &tile.isCovered[uint64_t{piece.y - piece.tileY + row} * tileWidth + piece.x - piece.tileX];
    tile.missing -= static_cast<uint64_t>(std::count(first, first + piece.width, uint8_t{0}));
    std::fill(first, first + piece.width, uint8_t{1});
  }
}

/// Fills what lies outside the level, so that it costs little and does not colour lossy codecs.
void LevelWriter::RepeatLastPixels(const Piece& piece, std::vector<uint8_t>& samples) const {
  const uint64_t pixel = uint64_t{format_.SampleBytes()} * format_.TileSamples();
  const uint64_t line = format_.TileRowBytes();
  for (uint32_t row = 0; row < piece.insideHeight && piece.insideWidth < format_.tileWidth; ++row) {
    uint8_t* end = &samples[row * line + piece.insideWidth * pixel];
    for (uint32_t x = piece.insideWidth; x < format_.tileWidth; ++x, end += pixel)
      std::memcpy(end, end - pixel, pixel);
  }
  for (uint64_t row = piece.insideHeight; row < format_.tileHeight; ++row)
    std::memcpy(&samples[row * line], &samples[(row - 1) * line], line);
}

bool LevelWriter::IsLeftOut(const std::vector<uint8_t>& samples) const {
  const size_t size = sparseSample_.size();
  return size > 0 && std::equal(sparseSample_.begin(), sparseSample_.end(), samples.begin()) &&
         std::memcmp(samples.data(), samples.data() + size, samples.size() - size) == 0;
}

void LevelWriter::Finish(uint64_t tile, uint32_t plane, const Piece& piece,
                         std::vector<uint8_t>& samples) {
  RepeatLastPixels(piece, samples);
  build_->Record(
      tile, IsLeftOut(samples) ? TilePlace() : store_.AppendTile(encoder_->Encode(samples, plane)));
}

}  // namespace orin::drivers
