// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdaldriver.h"

#include <memory>
#include <mutex>

#include "host/drivers/gdal/drivermodule.h"
#include "host/drivers/gdal/formattable.h"
#include "host/drivers/gdal/rasternames.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// Stands for the driver in the module, which it loads for the first name that may be a raster.
class GdalDriver final : public datasources::IFormatDriver {
 public:
  std::vector<ZMBInfo_s> Formats() const override { return GdalFormatRecords(); }

  ZMBFormatType Identify(const std::string& file) const override {
    if (!MayBeRaster(file)) return kFormatUnknown;
    const LoadedDriver& loaded = Loaded();
    return loaded.driver ? loaded.driver->Identify(file) : kFormatUnknown;
  }

  std::string WhyUnrecognised(const std::string& file) const override {
    if (!MayBeRaster(file)) return "";
    const LoadedDriver& loaded = Loaded();
    if (loaded.driver) return loaded.driver->WhyUnrecognised(file);
    return FormatString(
        _("%s: is no TIFF file, and what reads other formats cannot be loaded: %s. Install Orin "
          "Overviews again with its folder lib/orin-overviews, and the GDAL library."),
        file.c_str(), loaded.problem.c_str());
  }

  std::unique_ptr<datasources::IRasterSource> Open(const std::string& file,
                                                   datasources::AccessMode access) override {
    return Required(file).Open(file, access);
  }

  std::unique_ptr<datasources::IRasterSource> OpenToRemoveLevels(const std::string& file) override {
    return Required(file).OpenToRemoveLevels(file);
  }

  bool IsPath(const std::string& file) const override { return IsRegularFile(file); }

 private:
  static bool MayBeRaster(const std::string& file) {
    return IsRegularFile(file) || IsLibraryName(file);
  }

  const LoadedDriver& Loaded() const {
    std::call_once(once_, [this] { loaded_ = LoadDriver(ORIN_GDAL_MODULE); });
    return loaded_;
  }

  datasources::IFormatDriver& Required(const std::string& file) const {
    const LoadedDriver& loaded = Loaded();
    if (!loaded.driver)
      throw Exception(WhyUnrecognised(file), "host/drivers/gdal/gdaldriver", "GdalDriver::Required",
                      0);
    return *loaded.driver;
  }

  mutable std::once_flag once_;
  mutable LoadedDriver loaded_;
};

}  // namespace

void RegisterGdalDriver() {
  datasources::FormatRegistry::Instance().Register(std::make_shared<GdalDriver>());
}

}  // namespace orin::drivers
