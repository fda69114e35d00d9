/// Reads windows of chosen channels through the GDAL library, at full resolution.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/datasources/rasterreader.h"
#include "host/drivers/gdal/decodedrows.h"
#include "host/drivers/gdal/gdalhandle.h"

namespace orin::drivers {

/// Has a handle of its own.
class GdalReader final : public datasources::ReaderState<datasources::IRasterReader> {
 public:
  /// \param channels  1-based, in the order of the blocks' channels
  /// \param decoded   where decoded rows of all channels are kept; null when each reader decodes
  ///                  its own
  /// \throws orin::Exception  the file cannot be opened, or the channels differ in type
  GdalReader(const std::string& name, const GdalFormat& format, std::vector<unsigned> channels,
             datasources::AuxiliaryData metadata, std::shared_ptr<DecodedRows> decoded);

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
  struct Target {
    uint8_t* first;      ///< sample of the window's first pixel
    uint64_t lineBytes;  ///< from line to line
  };

  void Fetch(const datasources::InsideWindow& window, const std::vector<int>& channels,
             const Target& target);
  void CopyDecoded(const datasources::InsideWindow& window, const Target& target);

  GdalHandle handle_;
  std::shared_ptr<DecodedRows> decoded_;
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
