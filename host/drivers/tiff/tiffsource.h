/// The image of a TIFF file, its first directory, as a raster source.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "host/datasources/levelstore.h"
#include "host/drivers/tiff/gdalmetadata.h"
#include "host/drivers/tiff/pixelformat.h"

namespace orin::drivers {

class TiffSource final : public datasources::IRasterSource {
 public:
  /// \throws orin::Exception  not a TIFF file, its layout is not supported, or for kUpdate: it
  ///                          cannot be opened for writing
  TiffSource(std::string file, datasources::AccessMode access);
  ~TiffSource() override;

  const std::string& File() const { return file_; }
  const PixelFormat& Format() const { return format_; }

  unsigned Width() const override { return format_.width; }
  unsigned Height() const override { return format_.height; }
  unsigned ChannelCount() const override { return format_.samplesPerPixel; }
  gobs::DataType TypeOf(unsigned) const override { return format_.type; }
  /// Items of the default domain. The no-data value is the item of that name, else what the file
  /// `NAME.EXT.aux.xml` declares, else the no-data tag, where these are numbers, NaN and infinities
  /// included.
  datasources::AuxiliaryData MetadataOf(const std::vector<unsigned>& channels) const override;
  unsigned StoredBitsOf(unsigned) const override {
    return format_.bitsPerSample / ComponentsPerSample(format_.type);
  }
  /// A palette, or category names in the file `NAME.EXT.aux.xml`.
  bool HoldsClasses() const override;
  bool IsCloudOptimized() const override { return isCloudOptimized_; }
  std::unique_ptr<datasources::IRasterReader> OpenReader(
      const std::vector<unsigned>& channels) override;
  unsigned AlphaChannel() const override { return alphaChannel_; }
  bool HasMask() const override { return maskOffset_ || hasMaskBeside_; }
  std::unique_ptr<datasources::IValidityReader> OpenMask() override;
  bool DeliversValidity() const override { return true; }
  datasources::ILevelStore* Levels() override { return levels_.get(); }
  /// With the tags that decide what stored bytes mean, and the palette.
  model::LevelInputs Inputs() const override;
  std::shared_ptr<datasources::ImageWatch> Watch() override { return watch_; }

 private:
  void FindMasks();

  std::string file_;
  PixelFormat format_;
  std::vector<MetadataItem> metadata_;
  std::shared_ptr<datasources::ImageWatch> watch_;
  unsigned alphaChannel_ = 0;
  std::optional<uint64_t> maskOffset_;  ///< of the mask inside the file
  bool hasMaskBeside_ = false;
  std::string coding_;   ///< digest
  std::string palette_;  ///< digest; empty without one
  bool namesCategories_ = false;
  model::NoDataOrigin noDataOrigin_ = model::NoDataOrigin::kNowhere;
  bool isCloudOptimized_ = false;
  std::unique_ptr<datasources::ILevelStore> levels_;
};

}  // namespace orin::drivers
