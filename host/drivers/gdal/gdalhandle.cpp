// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalhandle.h"

#include "host/drivers/gdal/gdalerrors.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

GdalHandle::GdalHandle(const std::string& name, const GdalFormat& format) : name_(name) {
  const GdalErrors errors;
  const char* const allowed[] = {format.driver, nullptr};
  dataset_ = GDALOpenEx(name.c_str(), GDAL_OF_RASTER | GDAL_OF_READONLY | GDAL_OF_VERBOSE_ERROR,
                        allowed, nullptr, nullptr);
  // Failures beside an opened dataset concern what we do not use: a lookup of coordinates, say.
  if (!dataset_) errors.Require(false, _("%s: cannot be opened: %s."), name_);
}

GdalHandle::~GdalHandle() {
  const GdalErrors ignored;
  GDALClose(dataset_);
}

GDALRasterBandH GdalHandle::Band(unsigned channel) const {
  const GdalErrors errors;
  GDALRasterBandH band = GDALGetRasterBand(dataset_, static_cast<int>(channel));
  errors.Require(band != nullptr, _("%s: cannot be read: %s."), name_);
  return band;
}

}  // namespace orin::drivers
