// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tiffsource.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <cstring>
#include <map>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

#include "host/drivers/tiff/pixelreader.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::AuxiliaryData;
using datasources::kNoDataKey;

/// A reader of full-resolution pixels.
class TiffReader final : public datasources::ReaderState<datasources::IRasterReader> {
 public:
  TiffReader(const std::string& file, std::vector<unsigned> channels, AuxiliaryData metadata)
      : file_(file),
        channels_(std::move(channels)),
        metadata_(std::move(metadata)),
        pixels_(file, 0, channels_) {}

  unsigned GetWidth() const override { return pixels_.Format().width; }
  unsigned GetHeight() const override { return pixels_.Format().height; }
  unsigned GetChannelCount() const override { return static_cast<unsigned>(channels_.size()); }
  const gobs::DataType& GetDataType() const override { return pixels_.Format().type; }
  unsigned GetLevel() const override { return 1; }
  AuxiliaryData GetAuxiliaryData() const override { return metadata_; }
  std::vector<unsigned> GetChannelsInfo() const override { return channels_; }
  void Read(gobs::Raster& block) override {
    RequireFittingBlock(block, *this, file_);
    pixels_.Read(block);
  }

 protected:
  unsigned StoredTileWidth() const override { return pixels_.Format().tileWidth; }
  unsigned StoredTileHeight() const override { return pixels_.Format().tileHeight; }

 private:
  std::string file_;
  std::vector<unsigned> channels_;
  AuxiliaryData metadata_;
  PixelReader pixels_;
};

/// Opening for update changes nothing in the file, not even its times.
void RequireWritable(const std::string& file) {
  const int descriptor = open(file.c_str(), O_RDWR | O_CLOEXEC);
  if (descriptor < 0)
    throw Exception(FormatString(_("%s: cannot be opened for writing: %s."), file.c_str(),
                                 std::strerror(errno)),
                    "host/drivers/tiff/tiffsource", "RequireWritable(const std::string&)", 0);
  close(descriptor);
}

bool IsFiniteDecimal(const std::string& text) {
  double value = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, value);
  return error == std::errc() && stop == end && std::isfinite(value);
}

}  // namespace

TiffSource::TiffSource(std::string file, datasources::AccessMode access) : file_(std::move(file)) {
  if (access == datasources::kUpdate) RequireWritable(file_);
  const TiffHandle tiff = TiffHandle::OpenAt(file_, 0);
  format_ = FormatOf(tiff);
  metadata_ = ParseMetadata(tiff.TextOf(TIFFTAG_GDAL_METADATA));
  const bool declared = std::any_of(
      metadata_.begin(), metadata_.end(),
      [](const MetadataItem& item) { return item.domain.empty() && item.name == kNoDataKey; });
  if (!declared && IsFiniteDecimal(format_.noData))
    metadata_.push_back({kNoDataKey, std::nullopt, "", "", format_.noData});
  levels_ = OpenInternalLevels(file_, format_, access == datasources::kUpdate);
}

TiffSource::~TiffSource() = default;

AuxiliaryData TiffSource::MetadataOf(const std::vector<unsigned>& channels) const {
  std::map<std::optional<unsigned>, AuxiliaryData::Items> bySample;  // none: of the file
  for (const MetadataItem& item : metadata_)
    if (item.domain.empty()) bySample[item.sample].emplace(item.name, item.text);
  std::vector<AuxiliaryData::Items> channelItems;
  for (const unsigned channel : channels) channelItems.push_back(bySample[channel - 1]);
  return {bySample[std::nullopt], std::move(channelItems)};
}

std::unique_ptr<datasources::IRasterReader> TiffSource::OpenReader(
    const std::vector<unsigned>& channels) {
  return std::make_unique<TiffReader>(file_, channels, MetadataOf(channels));
}

}  // namespace orin::drivers
