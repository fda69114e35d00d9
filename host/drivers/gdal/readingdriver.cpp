// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/readingdriver.h"

#include <cpl_conv.h>
#include <gdal.h>

#include <memory>
#include <mutex>

#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/gdalformats.h"
#include "host/drivers/gdal/gdalsource.h"
#include "host/drivers/gdal/rasternames.h"
#include "host/drivers/gdal/specialfiles.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr GIntBig kCacheBytes = GIntBig{64} << 20;  // more slows down what is read only once

/// A setting of the library, and what it is here.
struct Setting {
  const char* key;
  const char* value;
};

constexpr Setting kSettings[] = {
    {"VRT_SHARED_SOURCE", "0"},  // a virtual raster's sources are its own, for its thread alone
    {"CPL_VSIL_GZIP_WRITE_PROPERTIES", "NO"},  // reading makes no file
};

class ReadingDriver final : public datasources::IFormatDriver {
 public:
  std::vector<ZMBInfo_s> Formats() const override { return GdalFormatRecords(); }

  ZMBFormatType Identify(const std::string& file) const override {
    const GdalFormat* format = IdentifyGdalFormat(file);
    return format ? format->code : kFormatUnknown;
  }

  std::string WhyUnrecognised(const std::string& file) const override {
    const std::string special = SpecialFiles().Beside(file);
    return special.empty() ? "" : SpecialFileText(file, special);
  }

  std::unique_ptr<datasources::IRasterSource> Open(const std::string& file,
                                                   datasources::AccessMode access) override {
    return OpenFor(file, access == datasources::kUpdate ? SourceUse::kUpdate : SourceUse::kRead);
  }

  std::unique_ptr<datasources::IRasterSource> OpenToRemoveLevels(const std::string& file) override {
    return OpenFor(file, SourceUse::kRemoveLevels);
  }

  bool IsPath(const std::string& file) const override { return IsRegularFile(file); }

 private:
  static std::unique_ptr<datasources::IRasterSource> OpenFor(const std::string& file,
                                                             SourceUse use) {
    const GdalFormat* format = IdentifyGdalFormat(file);
    if (!format)
      throw Exception(FormatString(_("%s: is not a raster file of a known format."), file.c_str()),
                      "host/drivers/gdal/readingdriver", "ReadingDriver::Open", 0);
    if (const std::string special = SpecialFileOf(file); !special.empty())
      throw Exception(SpecialFileText(file, special), "host/drivers/gdal/readingdriver",
                      "ReadingDriver::Open", 0);
    return std::make_unique<GdalSource>(file, *format, use);
  }
};

void SetUpLibrary() {
  static std::once_flag once;
  std::call_once(once, [] {
    SilenceGdal();
    RegisterGdalFormats();
    if (!CPLGetConfigOption("GDAL_CACHEMAX", nullptr)) GDALSetCacheMax64(kCacheBytes);
    for (const Setting& setting : kSettings)
      if (!CPLGetConfigOption(setting.key, nullptr)) CPLSetConfigOption(setting.key, setting.value);
  });
}

}  // namespace

std::unique_ptr<datasources::IFormatDriver> MakeReadingDriver() {
  SetUpLibrary();
  return std::make_unique<ReadingDriver>();
}

}  // namespace orin::drivers
