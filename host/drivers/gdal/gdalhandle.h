/// An opened dataset of the GDAL library.
// SPDX-License-Identifier: MIT
#pragma once

#include <gdal.h>

#include <string>

#include "host/drivers/gdal/gdalformats.h"

namespace orin::drivers {

/// Opened for reading; for one thread at a time. Opening and reading change no file, nor do they
/// make one.
class GdalHandle {
 public:
  /// \throws orin::Exception  the library cannot open it as that format; the text says why
  GdalHandle(const std::string& name, const GdalFormat& format);
  ~GdalHandle();
  GdalHandle(const GdalHandle&) = delete;
  GdalHandle& operator=(const GdalHandle&) = delete;

  const std::string& Name() const { return name_; }
  GDALDatasetH Get() const { return dataset_; }
  /// \param channel  1-based. \throws orin::Exception  no such channel
  GDALRasterBandH Band(unsigned channel) const;

 private:
  std::string name_;
  GDALDatasetH dataset_;
};

}  // namespace orin::drivers
