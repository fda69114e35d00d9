/// Writes blocks of one level of an ERDAS Imagine file, and reads the level that is in the file.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/datasources/rasterwriter.h"
#include "host/drivers/gdal/gdalhandle.h"
#include "host/drivers/hfa/hfalevelstore.h"

namespace orin::drivers {

/// One thread may read while another writes: they have handles of their own.
class HfaLevelWriter final : public datasources::ReaderState<datasources::IRasterWriter> {
 public:
  struct Level {
    std::string path;
    unsigned factor = 0;
    unsigned width = 0;
    unsigned height = 0;
    std::vector<unsigned> channels;
    gobs::DataType type;
    datasources::AuxiliaryData metadata;
    std::vector<unsigned> storedBits;  ///< of a sample; one for each of `channels`
  };
  /// \param store  outlives the writer
  HfaLevelWriter(HfaLevelStore& store, Level level);
  ~HfaLevelWriter() override;

  unsigned GetWidth() const override { return level_.width; }
  unsigned GetHeight() const override { return level_.height; }
  unsigned GetChannelCount() const override {
    return static_cast<unsigned>(level_.channels.size());
  }
  const gobs::DataType& GetDataType() const override { return level_.type; }
  unsigned GetLevel() const override { return level_.factor; }
  datasources::AuxiliaryData GetAuxiliaryData() const override { return level_.metadata; }
  std::vector<unsigned> GetChannelsInfo() const override { return level_.channels; }

  /// The pixels in the file, which are those before this writer's until the level is stored.
  void Read(gobs::Raster& block) override;
  void Write(const gobs::Raster& block) override;

 protected:
  unsigned StoredTileWidth() const override;
  unsigned StoredTileHeight() const override;

 private:
  void OpenPixels();
  std::unique_ptr<gobs::Raster> Clamped(const gobs::Raster& block) const;
  void Store(const gobs::Raster& block);

  HfaLevelStore& store_;
  Level level_;
  std::shared_ptr<HfaView> view_;       // outlives the handle; null where the file shows the level
  std::unique_ptr<GdalHandle> handle_;  // opened by the first Read
  std::vector<GDALRasterBandH> bands_;
  std::shared_ptr<HfaLevelBuild> build_;  // from the first Write on
};

}  // namespace orin::drivers
