/// The formats that are read through the GDAL library.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/datasources/formats.h"

namespace orin::drivers {

/// What a driver decodes together.
enum class Decoding {
  kBlocks,             ///< rectangles
  kRows,               ///< square windows cost more than windows as wide as the image
  kRowsOfAllChannels,  ///< and reading one channel costs as much as reading all
};

/// One driver of the library.
struct GdalFormat {
  const char* driver;        ///< the library's name of it: "JP2OpenJPEG"
  const char* registration;  ///< the library's function that registers it
  int code;                  ///< in the format table; 0 for a driver that opens nothing for us
  const char* name;
  const char* description;
  int nativeOverviews;
  Decoding decoding;
};

/// Registers those of our drivers that the installed library has; once a process.
void RegisterGdalFormats();

/// Records for the format table, one a code, of the drivers that the installed library has.
std::vector<ZMBInfo_s> GdalFormatRecords();

/// The format that the library opens `name` as, or null. Neither a directory nor memory of a
/// program is a raster here.
const GdalFormat* IdentifyGdalFormat(const std::string& name);

/// True for a path of the operating system, and not for the library's own kinds of names:
/// "/vsizip/...", "NETCDF:..."
bool IsRegularFile(const std::string& name);

}  // namespace orin::drivers
