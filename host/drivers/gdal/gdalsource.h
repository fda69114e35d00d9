/// A dataset of the GDAL library as a raster source.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "host/datasources/levelstore.h"
#include "host/drivers/gdal/decodedrows.h"
#include "host/drivers/gdal/gdalhandle.h"
#include "host/drivers/gdal/internallevels.h"
#include "host/drivers/gdal/sourceuse.h"

namespace orin::drivers {

class GdalSource final : public datasources::IRasterSource {
 public:
  /// \throws orin::Exception  it cannot be opened, it holds no raster, or unless for kRead: it
  ///                          cannot be written, or cannot hold levels that its format could
  /// \param erdasLevels  of ERDAS Imagine files; may be null
  GdalSource(std::string name, const GdalFormat& format, SourceUse use,
             OpenInternalLevels erdasLevels);
  ~GdalSource() override;

  unsigned Width() const override { return width_; }
  unsigned Height() const override { return height_; }
  unsigned ChannelCount() const override { return static_cast<unsigned>(types_.size()); }
  gobs::DataType TypeOf(unsigned channel) const override { return types_.at(channel - 1); }
  unsigned StoredBitsOf(unsigned channel) const override { return storedBits_.at(channel - 1); }
  /// A colour table, category names, or a layer that is called thematic.
  bool HoldsClasses() const override { return holdsClasses_; }
  unsigned AlphaChannel() const override { return alphaChannel_; }
  /// A mask that is part of the raster. One in a file beside it is left to others.
  bool HasMask() const override { return hasMask_; }
  std::unique_ptr<datasources::IValidityReader> OpenMask() override;
  /// Items of the default domain. The no-data value is the item of that name, else what is
  /// declared, NaN and infinities included: for the file when all of its channels agree.
  datasources::AuxiliaryData MetadataOf(const std::vector<unsigned>& channels) const override;
  std::unique_ptr<datasources::IRasterReader> OpenReader(
      const std::vector<unsigned>& channels) override;
  /// Levels inside the file; what the format makes up without storing it is none.
  datasources::ILevelStore* Levels() override { return levels_.get(); }
  std::shared_ptr<datasources::ImageWatch> Watch() override { return watch_; }

 private:
  void ReadChannels(const GdalHandle& handle);
  void KeepDecodedRows(const GdalHandle& handle);
  void RequireAllValid() const;
  void DeclareNoData(const std::vector<std::string>& declared);

  std::string name_;
  const GdalFormat& format_;
  unsigned width_ = 0;
  unsigned height_ = 0;
  unsigned alphaChannel_ = 0;
  bool holdsClasses_ = false;
  bool hasMask_ = false;
  std::vector<gobs::DataType> types_;
  std::vector<unsigned> storedBits_;  ///< one a channel
  datasources::AuxiliaryData::Items items_;
  std::vector<datasources::AuxiliaryData::Items> channelItems_;
  std::optional<model::NoData> noData_;                      ///< declared alike by all channels
  std::vector<std::optional<model::NoData>> channelNoData_;  ///< where channels differ
  std::shared_ptr<datasources::ImageWatch> watch_;
  std::unique_ptr<datasources::ILevelStore> levels_;
  std::shared_ptr<DecodedRows> decoded_;  ///< null when readers decode for themselves
};

}  // namespace orin::drivers
