// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalmask.h"

#include <filesystem>

#include "host/drivers/gdal/gdalerrors.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

class GdalMask final : public datasources::IValidityReader {
 public:
  GdalMask(const std::string& name, const GdalFormat& format)
      : handle_(name, format), mask_(GDALGetMaskBand(handle_.Band(1))) {}

  uint32_t Width() const override {
    return static_cast<uint32_t>(GDALGetRasterXSize(handle_.Get()));
  }
  uint32_t Height() const override {
    return static_cast<uint32_t>(GDALGetRasterYSize(handle_.Get()));
  }
  void Read(uint32_t x, uint32_t y, uint32_t width, uint32_t height, uint8_t* bytes) override {
    const GdalErrors errors;
    const CPLErr answer =
        GDALRasterIOEx(mask_, GF_Read, int(x), int(y), int(width), int(height), bytes, int(width),
                       int(height), GDT_Byte, 1, GSpacing{width}, nullptr);
    errors.Require(answer == CE_None, _("%s: its mask cannot be read: %s."), handle_.Name());
  }

 private:
  GdalHandle handle_;
  GDALRasterBandH mask_;
};

}  // namespace

bool HasMaskInside(const GdalHandle& handle) {
  const GdalErrors quiet;
  std::error_code none;
  const bool isBeside = std::filesystem::exists(handle.Name() + ".msk", none);
  return !isBeside && GDALGetMaskFlags(handle.Band(1)) == GMF_PER_DATASET;
}

std::unique_ptr<datasources::IValidityReader> OpenMaskInside(const std::string& name,
                                                             const GdalFormat& format) {
  return std::make_unique<GdalMask>(name, format);
}

}  // namespace orin::drivers
