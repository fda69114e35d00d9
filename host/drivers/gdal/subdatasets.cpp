// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/subdatasets.h"

#include <cpl_string.h>

#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr int kNamedAtMost = 10;

/// "A", "B", ... of which ten are named; empty when there is none.
std::string NamesIn(const GdalHandle& handle) {
  CSLConstList items = GDALGetMetadata(handle.Get(), "SUBDATASETS");
  std::string names;
  for (int i = 1;; ++i) {
    const char* name =
        CSLFetchNameValue(items, ("SUBDATASET_" + std::to_string(i) + "_NAME").c_str());
    if (!name) return names;
    if (i > kNamedAtMost) return names + " ...";
    names += (i == 1 ? "'" : ", '") + std::string(name) + "'";
  }
}

}  // namespace

std::string NoRasterText(const GdalHandle& handle) {
  const std::string names = NamesIn(handle);
  if (names.empty()) return FormatString(_("%s: holds no raster."), handle.Name().c_str());
  return FormatString(_("%s: holds several rasters. Name one of them: %s."), handle.Name().c_str(),
                      names.c_str());
}

}  // namespace orin::drivers
