// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfalevelwriter.h"

#include <algorithm>
#include <utility>

#include "host/drivers/gdal/gdalerrors.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr unsigned kTile = 64;  // edge of the format's tiles, pixels

}  // namespace

HfaLevelWriter::HfaLevelWriter(HfaLevelStore& store, Level level)
    : store_(store), level_(std::move(level)) {}

HfaLevelWriter::~HfaLevelWriter() {
  if (build_) store_.EndWriting(*build_);
}

unsigned HfaLevelWriter::StoredTileWidth() const { return std::min(kTile, level_.width); }
unsigned HfaLevelWriter::StoredTileHeight() const { return std::min(kTile, level_.height); }

void HfaLevelWriter::OpenPixels() {
  const HfaLevelPixels pixels = store_.PixelsOf(level_.factor, level_.channels);
  view_ = pixels.view;
  handle_ = std::make_unique<GdalHandle>(pixels.name, store_.Format());
  const GdalErrors errors;
  for (size_t i = 0; i < pixels.positions.size(); ++i) {
    GDALRasterBandH band = GDALGetOverview(handle_->Band(level_.channels[i]), pixels.positions[i]);
    const bool fits = band && GDALGetRasterBandXSize(band) >= int(level_.width) &&
                      GDALGetRasterBandYSize(band) >= int(level_.height);
    errors.Require(fits, _("%s: cannot be read: %s."), level_.path);
    bands_.push_back(band);
  }
}

void HfaLevelWriter::Read(gobs::Raster& block) {
  RequireFittingBlock(block, *this, level_.path);
  if (!handle_) OpenPixels();
  const auto inside = datasources::InsideOf(block, level_.width, level_.height);
  if (inside.width <= 0 || inside.height <= 0) return;
  const uint64_t pixel = PixelBytes(block);
  uint8_t* first =
      block.data + LayoutOf(block).Index(inside.x - block.x, inside.y - block.y) * pixel;
  const GdalErrors errors;
  CPLErr answer = CE_None;
  for (size_t i = 0; i < bands_.size() && answer == CE_None; ++i)
    answer = GDALRasterIOEx(bands_[i], GF_Read, int(inside.x), int(inside.y), int(inside.width),
                            int(inside.height), first + i * (pixel / bands_.size()),
                            int(inside.width), int(inside.height), GDALGetRasterDataType(bands_[i]),
                            GSpacing(pixel), GSpacing(pixel * block.stride), nullptr);
  errors.Require(answer == CE_None, _("%s: cannot be read: %s."), level_.path);
  RepeatEdges(block, inside);
}

/// A copy without the values that methods compute beyond what 2 or 4 bits hold, which the library
/// would cut to their last bits; null where all bits of a byte are stored.
std::unique_ptr<gobs::Raster> HfaLevelWriter::Clamped(const gobs::Raster& block) const {
  const bool areWhole = std::all_of(level_.storedBits.begin(), level_.storedBits.end(),
                                    [&](unsigned bits) { return bits >= level_.type.bits; });
  if (areWhole || level_.type.bits != 8) return nullptr;
  auto copy =
      std::make_unique<gobs::Raster>(block, parallelio::ProcessWindow{0, 0, block.x, block.y});
  const size_t count = level_.storedBits.size();
  uint8_t* to = copy->data;
  for (uint32_t y = 0; y < block.height; ++y) {
    const uint8_t* from = PixelAddress(block, 0, y);
    for (size_t i = 0; i < block.width * count; ++i)
      *to++ = static_cast<uint8_t>(
          std::min<unsigned>(*from++, (1u << std::min(8u, level_.storedBits[i % count])) - 1));
  }
  return copy;
}

void HfaLevelWriter::Write(const gobs::Raster& block) {
  RequireFittingBlock(block, *this, level_.path);
  const std::unique_ptr<gobs::Raster> clamped = Clamped(block);
  Store(clamped ? *clamped : block);
}

void HfaLevelWriter::Store(const gobs::Raster& block) {
  if (!build_ || build_->IsClosed()) build_ = store_.BeginWriting(level_.factor, level_.channels);
  build_->Write(block);
}

}  // namespace orin::drivers
