// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/gdalwatch.h"

#include <filesystem>
#include <stop_token>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/datasources/fingerprint.h"
#include "host/datasources/vrtsources.h"
#include "host/drivers/gdal/gdalreader.h"
#include "host/drivers/gdal/rasternames.h"

namespace orin::drivers {
namespace {

using datasources::Fingerprinter;
using datasources::ImageWatch;

/// Files of the same name with another extension that hold pixels, or where they are.
constexpr std::pair<std::string_view, std::string_view> kPixelFiles[] = {
    {"HFA", ".ige"}, {"RRASTER", ".gri"}, {"MRF", ".idx"}, {"MRF", ".ppg"}, {"MRF", ".pjg"},
    {"MRF", ".pzp"}, {"MRF", ".lrc"},     {"MRF", ".pzs"}, {"MRF", ".til"}, {"MRF", ".ptf"}};

std::vector<std::string> PixelFilesBeside(const std::string& name, std::string_view driver) {
  std::vector<std::string> files;
  for (const auto& [format, extension] : kPixelFiles) {
    const auto file = std::filesystem::path(name).replace_extension(extension);
    std::error_code none;
    if (format == driver && file != name && std::filesystem::exists(file, none))
      files.push_back(file.string());
  }
  return files;
}

std::string FingerprintOfFiles(const std::vector<std::string>& files, const std::stop_token& stop) {
  if (files.size() == 1) return datasources::FingerprintOfFile(files.front(), stop);
  Fingerprinter all;
  for (const std::string& file : files) all.AddText(datasources::FingerprintOfFile(file, stop));
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
  if (driver == "VRT")
    return std::make_shared<ImageWatch>(
        name, [name](const std::stop_token&) { return datasources::FingerprintOfVrt(name); },
        datasources::SourcesOfVrt(name));
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
  return std::make_shared<ImageWatch>(
      name, [all](const std::stop_token& stop) { return FingerprintOfFiles(all, stop); },
      std::move(others));
}

}  // namespace orin::drivers
