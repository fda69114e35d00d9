// SPDX-License-Identifier: MIT
#include "host/datasources/rasterreader.h"

#include <algorithm>
#include <cstring>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

constexpr char kSource[] = "host/datasources/rasterreader";

unsigned TilesAlong(unsigned size, unsigned tile) {
  return tile == 0 ? 0 : size / tile + (size % tile != 0);
}

}  // namespace

unsigned IRasterReader::TilesAcross() const { return TilesAlong(GetWidth(), GetTileWidth()); }
unsigned IRasterReader::TilesDown() const { return TilesAlong(GetHeight(), GetTileHeight()); }
unsigned IRasterReader::GetTileCount() const { return TilesAcross() * TilesDown(); }

std::unique_ptr<gobs::Raster> IRasterReader::GetRaster(unsigned index) {
  if (index >= GetTileCount())
    throw DataException(
        FormatString(_("There is no tile %u; the raster has %u."), index, GetTileCount()), kSource,
        "IRasterReader::GetRaster(unsigned int)", 0);
  const unsigned across = std::max(TilesAcross(), 1u);
  const unsigned x = index % across * GetTileWidth();
  const unsigned y = index / across * GetTileHeight();
  const gobs::RasterInfo info(std::min(GetTileWidth(), GetWidth() - x),
                              std::min(GetTileHeight(), GetHeight() - y), GetChannelCount(),
                              GetDataType());
  auto block = std::make_unique<gobs::Raster>(
      info, parallelio::ProcessWindow{GetMarginX(), GetMarginY(), x, y});
  Read(*block);
  return block;
}

unsigned IRasterReader::FindRaster(unsigned x, unsigned y) const {
  if (x >= GetWidth() || y >= GetHeight())
    throw DataException(
        FormatString(_("The pixel (%u, %u) lies outside the raster of %u x %u pixels."), x, y,
                     GetWidth(), GetHeight()),
        kSource, "IRasterReader::FindRaster(unsigned int, unsigned int) const", 0);
  return y / GetTileHeight() * TilesAcross() + x / GetTileWidth();
}

InsideWindow InsideOf(const gobs::Raster& block, unsigned rasterWidth, unsigned rasterHeight) {
  const int64_t left = int64_t{block.x} - block.marginX;
  const int64_t top = int64_t{block.y} - block.marginY;
  const int64_t x = std::max<int64_t>(left, 0);
  const int64_t y = std::max<int64_t>(top, 0);
  return {x, y, std::min<int64_t>(left + block.stride, rasterWidth) - x,
          std::min<int64_t>(top + block.bufferLines, rasterHeight) - y};
}

void RepeatEdges(gobs::Raster& block, const InsideWindow& inside) {
  if (inside.width <= 0 || inside.height <= 0) return;
  const int64_t first = inside.x - block.x;  // of the filled columns, in block coordinates
  const int64_t last = first + inside.width - 1;
  const int64_t left = -int64_t{block.marginX};
  const int64_t right = left + block.stride;
  const uint64_t pixel = PixelBytes(block);
  const int64_t top = inside.y - block.y;
  const int64_t bottom = top + inside.height - 1;
  for (int64_t y = top; y <= bottom; ++y) {
    for (int64_t x = left; x < first; ++x)
      std::memcpy(PixelAddress(block, x, y), PixelAddress(block, first, y), pixel);
    for (int64_t x = last + 1; x < right; ++x)
      std::memcpy(PixelAddress(block, x, y), PixelAddress(block, last, y), pixel);
  }
  const uint64_t line = pixel * block.stride;
  const int64_t firstLine = -int64_t{block.marginY};
  for (int64_t y = firstLine; y < firstLine + int64_t{block.bufferLines}; ++y)
    if (y < top || y > bottom)
      std::memcpy(PixelAddress(block, left, y), PixelAddress(block, left, y < top ? top : bottom),
                  line);
}

void RequireFittingBlock(const gobs::Raster& block, const IRasterReader& raster,
                         const std::string& file) {
  const char* function =
      "RequireFittingBlock(const orin::gobs::Raster&, const IRasterReader&, "
      "const std::string&)";
  if (block.channelCount != raster.GetChannelCount() || !(block.dataType == raster.GetDataType()))
    throw DataException(
        FormatString(_("%s: a block of another pixel type or channel count was asked for."),
                     file.c_str()),
        kSource, function, 0);
  if (uint64_t{block.x} + block.width > raster.GetWidth() ||
      uint64_t{block.y} + block.height > raster.GetHeight())
    throw DataException(
        FormatString(_("%s: a block outside the raster was asked for."), file.c_str()), kSource,
        function, 0);
}

}  // namespace orin::datasources
