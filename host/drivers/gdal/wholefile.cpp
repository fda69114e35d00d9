// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/wholefile.h"

#include <cpl_vsi.h>

#include <cstdlib>
#include <string>

#include "host/drivers/gdal/netcdfextent.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// Bytes of pixels in a file without compression.
uint64_t PixelBytesOf(const GdalHandle& handle) {
  uint64_t bytes = 0;
  const uint64_t pixels =
      uint64_t(GDALGetRasterXSize(handle.Get())) * uint64_t(GDALGetRasterYSize(handle.Get()));
  for (int band = 1; band <= GDALGetRasterCount(handle.Get()); ++band)
    bytes += pixels *
             uint64_t(GDALGetDataTypeSizeBytes(GDALGetRasterDataType(handle.Band(unsigned(band)))));
  return bytes;
}

/// Where the last pixel of an ENVI file ends; 0 when that is not known.
uint64_t EndOfEnvi(const GdalHandle& handle) {
  const auto item = [&](const char* key) {
    const char* text = GDALGetMetadataItem(handle.Get(), key, "ENVI");
    return text ? std::strtoull(text, nullptr, 10) : 0;
  };
  return item("file_compression") != 0 ? 0 : item("header_offset") + PixelBytesOf(handle);
}

}  // namespace

void RequireWholeFile(const GdalHandle& handle, const GdalFormat& format) {
  VSIStatBufL status;
  if (VSIStatL(handle.Name().c_str(), &status) != 0) return;  // a part of a container
  const std::string driver = format.driver;
  uint64_t end = 0;
  if (driver == "ENVI") end = EndOfEnvi(handle);
  if (driver == "netCDF") end = EndOfClassicNetcdf(handle.Name());
  if (end <= uint64_t(status.st_size)) return;
  throw Exception(
      FormatString(_("%s: cannot be read: the file ends too early: it has %s bytes, and "
                     "its header tells of %s."),
                   handle.Name().c_str(), std::to_string(status.st_size).c_str(),
                   std::to_string(end).c_str()),
      "host/drivers/gdal/wholefile", "orin::drivers::RequireWholeFile", 0);
}

}  // namespace orin::drivers
