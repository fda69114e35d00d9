// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalreader.h"

#include <algorithm>
#include <utility>

#include "host/drivers/gdal/gdalbands.h"
#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/wholefile.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

gobs::DataType CommonTypeOf(const GdalHandle& handle, const std::vector<unsigned>& channels) {
  const auto refuse = [&](const char* format) {
    throw Exception(FormatString(format, handle.Name().c_str()), "host/drivers/gdal/gdalreader",
                    "orin::drivers::CommonTypeOf", 0);
  };
  std::optional<gobs::DataType> common;
  for (const unsigned channel : channels) {
    const auto type = TypeOfBand(handle.Band(channel));
    if (!type) refuse(_("%s: cannot be read: its pixel type is not supported."));
    if (common && !(*common == *type))
      refuse(_("%s: its channels differ in type; they cannot be treated together."));
    common = type;
  }
  return common.value_or(gobs::eDT_8U);
}

GdalReader::GdalReader(const std::string& name, const GdalFormat& format,
                       std::vector<unsigned> channels, datasources::AuxiliaryData metadata)
    : handle_(name, format),
      channels_(std::move(channels)),
      metadata_(std::move(metadata)),
      width_(static_cast<unsigned>(GDALGetRasterXSize(handle_.Get()))),
      height_(static_cast<unsigned>(GDALGetRasterYSize(handle_.Get()))),
      type_(CommonTypeOf(handle_, channels_)) {
  RequireWholeFile(handle_, format);
  int blockWidth = 1, blockHeight = 1;
  if (!channels_.empty())
    GDALGetBlockSize(handle_.Band(channels_.front()), &blockWidth, &blockHeight);
  tileWidth_ = format.decodesRows ? width_ : std::min(static_cast<unsigned>(blockWidth), width_);
  tileHeight_ = std::min(static_cast<unsigned>(blockHeight), height_);
}

void GdalReader::Read(gobs::Raster& block) {
  RequireFittingBlock(block, *this, handle_.Name());
  const datasources::InsideWindow inside = datasources::InsideOf(block, width_, height_);
  if (inside.width <= 0 || inside.height <= 0 || channels_.empty()) return;
  std::vector<int> bands(channels_.begin(), channels_.end());
  const auto pixel = static_cast<GSpacing>(PixelBytes(block));
  const GSpacing sample = pixel / static_cast<GSpacing>(bands.size());
  const GSpacing line = pixel * block.stride;
  uint8_t* const first =
      block.data +
      LayoutOf(block).Index(inside.x - block.x, inside.y - block.y) * PixelBytes(block);
  const GdalErrors errors;
  const auto width = static_cast<int>(inside.width);
  const auto height = static_cast<int>(inside.height);
  const CPLErr answer = GDALDatasetRasterIOEx(
      handle_.Get(), GF_Read, static_cast<int>(inside.x), static_cast<int>(inside.y), width, height,
      first, width, height, GDALGetRasterDataType(handle_.Band(channels_.front())),
      static_cast<int>(bands.size()), bands.data(), pixel, line, sample, nullptr);
  errors.Require(answer == CE_None, _("%s: cannot be read: %s."), handle_.Name());
  RepeatEdges(block, inside);
}

}  // namespace orin::drivers
