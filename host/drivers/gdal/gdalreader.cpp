// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalreader.h"

#include <algorithm>
#include <numeric>
#include <optional>
#include <utility>

#include "host/datasources/samplecopy.h"
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
                       std::vector<unsigned> channels, datasources::AuxiliaryData metadata,
                       std::shared_ptr<DecodedRows> decoded)
    : handle_(name, format),
      decoded_(std::move(decoded)),
      channels_(std::move(channels)),
      metadata_(std::move(metadata)),
      width_(static_cast<unsigned>(GDALGetRasterXSize(handle_.Get()))),
      height_(static_cast<unsigned>(GDALGetRasterYSize(handle_.Get()))),
      type_(CommonTypeOf(handle_, channels_)) {
  RequireWholeFile(handle_, format);
  int blockWidth = 1, blockHeight = 1;
  if (!channels_.empty())
    GDALGetBlockSize(handle_.Band(channels_.front()), &blockWidth, &blockHeight);
  tileWidth_ = format.decoding != Decoding::kBlocks
                   ? width_
                   : std::min(static_cast<unsigned>(blockWidth), width_);
  tileHeight_ = std::min(static_cast<unsigned>(blockHeight), height_);
}

/// Reads `channels` side by side.
void GdalReader::Fetch(const datasources::InsideWindow& window, const std::vector<int>& channels,
                       const Target& target) {
  const auto sample = GSpacing{BytesPerComponent(type_)} * ComponentsPerSample(type_);
  const auto pixel = sample * static_cast<GSpacing>(channels.size());
  const auto width = static_cast<int>(window.width);
  const auto height = static_cast<int>(window.height);
  std::vector<int> bands = channels;
  const GdalErrors errors;
  const CPLErr answer = GDALDatasetRasterIOEx(
      handle_.Get(), GF_Read, static_cast<int>(window.x), static_cast<int>(window.y), width, height,
      target.first, width, height, GDALGetRasterDataType(handle_.Band(channels_.front())),
      static_cast<int>(bands.size()), bands.data(), pixel, static_cast<GSpacing>(target.lineBytes),
      sample, nullptr);
  errors.Require(answer == CE_None, _("%s: cannot be read: %s."), handle_.Name());
}

/// Takes this reader's channels out of the rows of all channels.
void GdalReader::CopyDecoded(const datasources::InsideWindow& window, const Target& target) {
  std::vector<int> all(static_cast<size_t>(GDALGetRasterCount(handle_.Get())));
  std::iota(all.begin(), all.end(), 1);
  const uint64_t sample = uint64_t{BytesPerComponent(type_)} * ComponentsPerSample(type_);
  const datasources::CopySamples copy = datasources::CopierOf(sample);
  const auto decode = [&](unsigned firstRow, unsigned rows, uint8_t* to) {
    Fetch({0, firstRow, width_, rows}, all, {to, decoded_->RowBytes()});
  };
  for (int64_t y = window.y; y < window.y + window.height;) {
    const auto number = static_cast<unsigned>(y / decoded_->BandRows());
    const DecodedRows::Bytes band = decoded_->Band(number, decode);
    const int64_t first = int64_t{number} * decoded_->BandRows();
    const int64_t end = std::min(first + decoded_->BandRows(), window.y + window.height);
    for (; y < end; ++y) {
      const uint8_t* from = band->data() + uint64_t(y - first) * decoded_->RowBytes() +
                            uint64_t(window.x) * all.size() * sample;
      uint8_t* to = target.first + uint64_t(y - window.y) * target.lineBytes;
      for (size_t i = 0; i < channels_.size(); ++i)
        copy(from + (channels_[i] - 1) * sample, all.size(), to + i * sample, channels_.size(),
             uint64_t(window.width));
    }
  }
}

void GdalReader::Read(gobs::Raster& block) {
  RequireFittingBlock(block, *this, handle_.Name());
  const datasources::InsideWindow inside = datasources::InsideOf(block, width_, height_);
  if (inside.width <= 0 || inside.height <= 0 || channels_.empty()) return;
  const uint64_t pixel = PixelBytes(block);
  const Target target{
      block.data + LayoutOf(block).Index(inside.x - block.x, inside.y - block.y) * pixel,
      pixel * block.stride};
  if (decoded_) CopyDecoded(inside, target);
  else Fetch(inside, {channels_.begin(), channels_.end()}, target);
  RepeatEdges(block, inside);
}

}  // namespace orin::drivers
