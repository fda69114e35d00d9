// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/rasternames.h"

#include <sys/stat.h>

#include <algorithm>
#include <cctype>

namespace orin::drivers {

bool IsRegularFile(const std::string& name) {
  struct stat status;
  return stat(name.c_str(), &status) == 0 && S_ISREG(status.st_mode);
}

bool IsLibraryName(const std::string& name) {
  if (name.starts_with("/vsi")) return true;
  const size_t colon = name.find(':');
  return colon != name.npos && colon > 1 &&
         std::all_of(name.begin(), name.begin() + static_cast<std::ptrdiff_t>(colon),
                     [](unsigned char c) { return std::isalnum(c) || c == '_'; });
}

}  // namespace orin::drivers
