// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalsource.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "host/drivers/gdal/archivedlevels.h"
#include "host/drivers/gdal/gdalbands.h"
#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/gdalmask.h"
#include "host/drivers/gdal/gdalreader.h"
#include "host/drivers/gdal/gdalwatch.h"
#include "host/drivers/gdal/rasternames.h"
#include "host/drivers/gdal/subdatasets.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::AuxiliaryData;

[[noreturn]] void Refuse(const std::string& text) {
  throw Exception(text, "host/drivers/gdal/gdalsource", "orin::drivers::GdalSource::GdalSource", 0);
}

/// Looks only: nothing is opened for writing before there is something to write.
void RequireWritable(const std::string& name) {
  if (!IsRegularFile(name))
    Refuse(FormatString(_("%s: cannot be opened for writing: it is no file of its own."),
                        name.c_str()));
  if (access(name.c_str(), W_OK) != 0)
    Refuse(FormatString(_("%s: cannot be opened for writing: %s."), name.c_str(),
                        std::strerror(errno)));
}

}  // namespace

GdalSource::GdalSource(std::string name, const GdalFormat& format, SourceUse use,
                       OpenInternalLevels erdasLevels)
    : name_(std::move(name)), format_(format) {
  if (use != SourceUse::kRead) RequireWritable(name_);
  const GdalHandle handle(name_, format_);
  if (GDALGetRasterCount(handle.Get()) == 0) Refuse(NoRasterText(handle));
  width_ = static_cast<unsigned>(GDALGetRasterXSize(handle.Get()));
  height_ = static_cast<unsigned>(GDALGetRasterYSize(handle.Get()));
  items_ = ItemsOf(handle.Get());
  ReadChannels(handle);
  KeepDecodedRows(handle);
  hasMask_ = HasMaskInside(handle);
  watch_ = WatchOf(handle, format_);
  if (format_.code == kFormatArchivedTiff || format_.code == kFormatTiffPage)
    levels_ = ArchivedLevels(name_, format_);
  if (format_.code != kFormatErdas || !erdasLevels) return;
  if (use == SourceUse::kUpdate) RequireAllValid();
  levels_ = erdasLevels(name_, format_, *this, use);
}

GdalSource::~GdalSource() = default;

/// Levels inside could not say which of their pixels hold data.
void GdalSource::RequireAllValid() const {
  datasources::ISideCarFormat* beside = datasources::FormatRegistry::Instance().SideCarFormat();
  if (alphaChannel_ != 0 || hasMask_ || (beside && beside->OpenMaskBeside(name_, width_, height_)))
    Refuse(FormatString(_("%s: has a mask or opacity, which levels inside this format cannot "
                          "have."),
                        name_.c_str()));
}

std::unique_ptr<datasources::IValidityReader> GdalSource::OpenMask() {
  return hasMask_ ? OpenMaskInside(name_, format_) : nullptr;
}

void GdalSource::ReadChannels(const GdalHandle& handle) {
  std::vector<std::string> declared;
  const GdalErrors quiet;
  for (unsigned channel = 1; int(channel) <= GDALGetRasterCount(handle.Get()); ++channel) {
    GDALRasterBandH band = handle.Band(channel);
    types_.push_back(CommonTypeOf(handle, {channel}));
    channelItems_.push_back(ItemsOf(band));
    declared.push_back(NoDataTextOf(band));
    storedBits_.push_back(StoredBitsOfBand(band, types_.back()));
    holdsClasses_ = holdsClasses_ || HoldsClassNumbers(band);
    if (alphaChannel_ == 0 && GDALGetRasterColorInterpretation(band) == GCI_AlphaBand)
      alphaChannel_ = channel;
  }
  DeclareNoData(declared);
}

/// Where reading one channel costs as much as reading all, and all fit into memory.
void GdalSource::KeepDecodedRows(const GdalHandle& handle) {
  constexpr int kFewestRows = 64, kMostRows = 1024;
  const bool areAlike = std::all_of(types_.begin(), types_.end(),
                                    [&](const gobs::DataType& type) { return type == types_[0]; });
  if (format_.decoding != Decoding::kRowsOfAllChannels || types_.size() < 2 || !areAlike) return;
  const uint64_t pixel =
      uint64_t{BytesPerComponent(types_[0])} * ComponentsPerSample(types_[0]) * types_.size();
  if (pixel > DecodedRows::kMostBytes / width_ / height_) return;
  int blockWidth = 1, blockHeight = 1;
  GDALGetBlockSize(handle.Band(1), &blockWidth, &blockHeight);
  const auto rows = static_cast<unsigned>(std::clamp(blockHeight, kFewestRows, kMostRows));
  decoded_ = std::make_shared<DecodedRows>(width_, height_, pixel, rows);
}

/// One value for the file where all channels agree.
void GdalSource::DeclareNoData(const std::vector<std::string>& declared) {
  const bool agree = std::all_of(declared.begin(), declared.end(),
                                 [&](const std::string& text) { return text == declared[0]; });
  constexpr auto kOrigin = model::NoDataOrigin::kChannel;
  if (agree) noData_ = model::NoData::Parse(declared[0], kOrigin);
  for (const std::string& text : declared)
    channelNoData_.push_back(agree ? std::nullopt : model::NoData::Parse(text, kOrigin));
}

AuxiliaryData GdalSource::MetadataOf(const std::vector<unsigned>& channels) const {
  std::vector<AuxiliaryData::Items> items;
  for (const unsigned channel : channels) items.push_back(channelItems_.at(channel - 1));
  AuxiliaryData metadata(items_, std::move(items));
  if (metadata.Facts().noData) return metadata;  // the item of that name
  if (noData_) metadata.DeclareNoData(*noData_);
  for (unsigned n = 1; n <= channels.size(); ++n)
    if (const auto& own = channelNoData_.at(channels[n - 1] - 1);
        own && !metadata.Facts().OfChannel(n))
      metadata.DeclareNoData(n, *own);
  return metadata;
}

std::unique_ptr<datasources::IRasterReader> GdalSource::OpenReader(
    const std::vector<unsigned>& channels) {
  const bool takesAll = channels.size() == types_.size();  // needs nothing for another reader
  return std::make_unique<GdalReader>(name_, format_, channels, MetadataOf(channels),
                                      takesAll ? nullptr : decoded_);
}

}  // namespace orin::drivers
