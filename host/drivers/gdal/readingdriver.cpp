// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/readingdriver.h"

#include <cpl_conv.h>
#include <cpl_error.h>
#include <cpl_vsi.h>
#include <cpl_vsi_error.h>
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

/// What a server answered: "HTTP response code: 403"; empty when it answered well. The library has
/// forgotten that when it opens the name a second time.
std::string ServerAnswer(const std::string& name) {
  if (!name.starts_with("/vsicurl")) return {};
  VSICurlPartialClearCache(name.c_str());
  VSIErrorReset();
  VSIStatBufL status;
  if (VSIStatExL(name.c_str(), &status, VSI_STAT_EXISTS_FLAG | VSI_STAT_SET_ERROR_FLAG) == 0)
    return {};
  return VSIGetLastErrorMsg();
}

/// In the words of the server or the library; empty when they have none.
std::string WhyNotOpened(const std::string& name) {
  const GdalErrors errors;
  std::string reason = ServerAnswer(name);
  if (reason.empty()) {
    GDALClose(GDALOpenEx(name.c_str(), GDAL_OF_RASTER | GDAL_OF_VERBOSE_ERROR, nullptr, nullptr,
                         nullptr));
    if (!errors.Any()) return {};
    reason = errors.Reason();
  }
  return FormatString(_("%s: cannot be opened: %s."), name.c_str(), reason.c_str());
}

class ReadingDriver final : public datasources::IFormatDriver {
 public:
  explicit ReadingDriver(OpenInternalLevels erdasLevels) : erdasLevels_(erdasLevels) {}

  std::vector<ZMBInfo_s> Formats() const override { return GdalFormatRecords(); }

  ZMBFormatType Identify(const std::string& file) const override {
    const GdalFormat* format = IdentifyGdalFormat(file);
    return format ? format->code : kFormatUnknown;
  }

  std::string WhyUnrecognised(const std::string& file) const override {
    const std::string special = SpecialFiles().Beside(file);
    if (!special.empty()) return SpecialFileText(file, special);
    return IsLibraryName(file) ? WhyNotOpened(file) : "";
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
  std::unique_ptr<datasources::IRasterSource> OpenFor(const std::string& file,
                                                      SourceUse use) const {
    const GdalFormat* format = IdentifyGdalFormat(file);
    if (!format)
      throw Exception(FormatString(_("%s: is not a raster file of a known format."), file.c_str()),
                      "host/drivers/gdal/readingdriver", "ReadingDriver::Open", 0);
    if (const std::string special = SpecialFileOf(file); !special.empty())
      throw Exception(SpecialFileText(file, special), "host/drivers/gdal/readingdriver",
                      "ReadingDriver::Open", 0);
    return std::make_unique<GdalSource>(file, *format, use, erdasLevels_);
  }

  OpenInternalLevels erdasLevels_;
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

std::unique_ptr<datasources::IFormatDriver> MakeReadingDriver(OpenInternalLevels erdasLevels) {
  SetUpLibrary();
  return std::make_unique<ReadingDriver>(erdasLevels);
}

}  // namespace orin::drivers
