/// Reads windows of chosen channels through the GDAL library, at full resolution.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/datasources/rasterreader.h"
#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

/// Has a handle of its own.
class GdalReader final : public datasources::ReaderState<datasources::IRasterReader> {
 public:
  /// \param channels  1-based, in the order of the blocks' channels
  /// \throws orin::Exception  the file cannot be opened, or the channels differ in type
  GdalReader(const std::string& name, const GdalFormat& format, std::vector<unsigned> channels,
             datasources::AuxiliaryData metadata);

  unsigned GetWidth() const override { return width_; }
  unsigned GetHeight() const override { return height_; }
  unsigned GetChannelCount() const override { return static_cast<unsigned>(channels_.size()); }
  const gobs::DataType& GetDataType() const override { return type_; }
  unsigned GetLevel() const override { return 1; }
  datasources::AuxiliaryData GetAuxiliaryData() const override { return metadata_; }
  std::vector<unsigned> GetChannelsInfo() const override { return channels_; }
  void Read(gobs::Raster& block) override;

 protected:
  unsigned StoredTileWidth() const override { return tileWidth_; }
  unsigned StoredTileHeight() const override { return tileHeight_; }

 private:
  GdalHandle handle_;
  std::vector<unsigned> channels_;
  datasources::AuxiliaryData metadata_;
  unsigned width_;
  unsigned height_;
  unsigned tileWidth_ = 0;
  unsigned tileHeight_ = 0;
  gobs::DataType type_;
};

/// The type that all of `channels` have.
/// \throws orin::Exception  there is none, or no block can hold it
gobs::DataType CommonTypeOf(const GdalHandle& handle, const std::vector<unsigned>& channels);

}  // namespace orin::drivers
