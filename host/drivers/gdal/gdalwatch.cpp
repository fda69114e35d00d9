// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalwatch.h"

#include <stop_token>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/datasources/fingerprint.h"
#include "host/drivers/gdal/gdalreader.h"
#include "host/drivers/gdal/pixelfiles.h"
#include "host/drivers/gdal/rasternames.h"
#include "host/drivers/gdal/rawlayout.h"
#include "host/drivers/gdal/vrtsources.h"

namespace orin::drivers {
namespace {

using datasources::Fingerprinter;
using datasources::ImageWatch;

std::string FingerprintOfFiles(const std::vector<std::string>& files, const std::stop_token& stop) {
  if (files.size() == 1) return datasources::FingerprintOfFile(files.front(), stop);
  Fingerprinter all;
  for (const std::string& file : files) all.AddText(datasources::FingerprintOfFile(file, stop));
  return stop.stop_requested() ? "" : all.Text();
}

/// With the header that tells how they are to be read.
std::string FingerprintOfRaw(const std::string& name, const GdalFormat& format,
                             const std::vector<std::string>& files, const std::stop_token& stop) {
  Fingerprinter all;
  all.AddText(FingerprintOfFiles(files, stop));
  all.AddText(RawLayoutOf(GdalHandle(name, format), format));
  return stop.stop_requested() ? "" : all.Text();
}

/// Channel by channel, as the format keeps them and because they may differ in type.
std::string FingerprintOfChannels(const std::string& name, const GdalFormat& format,
                                  unsigned channels, const std::stop_token& stop) {
  Fingerprinter all;
  for (unsigned channel = 1; channel <= channels; ++channel) {
    GdalReader reader(name, format, {channel}, {}, nullptr);
    all.AddText(datasources::FingerprintOfPixels(reader, stop));
    if (stop.stop_requested()) return {};
  }
  return all.Text();
}

}  // namespace

std::shared_ptr<ImageWatch> WatchOf(const GdalHandle& handle, const GdalFormat& format) {
  const std::string name = handle.Name();
  if (!IsRegularFile(name)) return nullptr;
  const std::string_view driver = format.driver;
  if (driver == "VRT") {
    return std::make_shared<ImageWatch>(
        name, [name, &format](const std::stop_token&) { return FingerprintOfVrt(name, format); },
        SourcesOfVrt(handle).files);
  }
  std::vector<std::string> others = PixelFilesBeside(name, driver);
  if (driver == "HFA") {
    const auto channels = static_cast<unsigned>(GDALGetRasterCount(handle.Get()));
    return std::make_shared<ImageWatch>(
        name,
        [name, &format, channels](const std::stop_token& stop) {
          return FingerprintOfChannels(name, format, channels, stop);
        },
        std::move(others));
  }
  std::vector<std::string> all = {name};
  all.insert(all.end(), others.begin(), others.end());
  const std::vector<std::string> headers = HeadersBeside(name, driver);
  others.insert(others.end(), headers.begin(), headers.end());
  const bool isRaw = !headers.empty();
  return std::make_shared<ImageWatch>(
      name,
      [name, all, isRaw, &format](const std::stop_token& stop) {
        return isRaw ? FingerprintOfRaw(name, format, all, stop) : FingerprintOfFiles(all, stop);
      },
      std::move(others));
}

}  // namespace orin::drivers
