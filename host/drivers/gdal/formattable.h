/// The formats that are read through the GDAL library, known without it.
// SPDX-License-Identifier: MIT
#pragma once

#include <span>
#include <vector>

#include "host/datasources/formats.h"

namespace orin::drivers {

/// What a driver decodes together.
enum class Decoding {
  kBlocks,             ///< rectangles
  kRows,               ///< square windows cost more than windows as wide as the image
  kRowsOfAllChannels,  ///< and reading one channel costs as much as reading all
};

// TIFF that is no file by itself.
inline constexpr int kFormatArchivedTiff = 301;
inline constexpr int kFormatTiffPage = 317;

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

/// Most specific first: a file is the first one's that knows it.
std::span<const GdalFormat> GdalFormats();

/// Records for the format table, one a code, whether the installed library has the driver or not.
std::vector<ZMBInfo_s> GdalFormatRecords();

}  // namespace orin::drivers
