// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalformats.h"

#include <dlfcn.h>
#include <gdal.h>
#include <strings.h>

#include <algorithm>
#include <mutex>
#include <string_view>
#include <vector>

#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/rasternames.h"
#include "host/drivers/gdal/specialfiles.h"

namespace orin::drivers {
namespace {

constexpr char kPagePrefix[] = "GTIFF_DIR:";

/// The library in the process, wherever it came from; null when it is part of the program.
void* LibraryInProcess() {
  Dl_info place;
  if (dladdr(reinterpret_cast<void*>(&GDALGetDriverByName), &place) == 0) return nullptr;
  return dlopen(place.dli_fname, RTLD_LAZY | RTLD_NOLOAD);
}

/// The drivers that may open a name, for the library's functions.
std::vector<const char*> OpeningDrivers() {
  std::vector<const char*> names;
  for (const GdalFormat& format : GdalFormats())
    if (format.code != 0) names.push_back(format.driver);
  names.push_back(nullptr);
  return names;
}

}  // namespace

void RegisterGdalFormats() {
  static std::once_flag once;
  std::call_once(once, [] {
    void* library = LibraryInProcess();
    for (const GdalFormat& format : GdalFormats())
      if (void* function = dlsym(library ? library : RTLD_DEFAULT, format.registration))
        reinterpret_cast<void (*)()>(function)();
  });
}

const GdalFormat* IdentifyGdalFormat(const std::string& name) {
  if (!IsRegularFile(name) && !IsLibraryName(name)) return nullptr;
  if (!SpecialFiles().Beside(name).empty()) return nullptr;
  const GdalErrors quiet;
  const auto allowed = OpeningDrivers();
  GDALDriverH driver = GDALIdentifyDriverEx(name.c_str(), GDAL_OF_RASTER, allowed.data(), nullptr);
  if (!driver) return nullptr;
  const std::string_view found = GDALGetDriverShortName(driver);
  const bool isPage = strncasecmp(name.c_str(), kPagePrefix, sizeof kPagePrefix - 1) == 0;
  const std::span<const GdalFormat> formats = GdalFormats();
  const auto format = std::find_if(formats.begin(), formats.end(), [&](const GdalFormat& f) {
    return f.driver == found && (!isPage || f.code == kFormatTiffPage);
  });
  return format == formats.end() ? nullptr : &*format;
}

}  // namespace orin::drivers
