// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/pixelfiles.h"

#include <filesystem>
#include <utility>

namespace orin::drivers {
namespace {

constexpr std::pair<std::string_view, std::string_view> kExtensions[] = {
    {"HFA", ".ige"}, {"RRASTER", ".gri"}, {"MRF", ".idx"}, {"MRF", ".ppg"}, {"MRF", ".pjg"},
    {"MRF", ".pzp"}, {"MRF", ".lrc"},     {"MRF", ".pzs"}, {"MRF", ".til"}, {"MRF", ".ptf"}};

bool HasHeaderBeside(std::string_view driver) { return driver == "ENVI" || driver == "EHdr"; }

}  // namespace

std::vector<std::string> PixelFilesBeside(const std::string& image, std::string_view driver) {
  std::vector<std::string> files;
  for (const auto& [format, extension] : kExtensions) {
    const auto file = std::filesystem::path(image).replace_extension(extension);
    std::error_code none;
    if (format == driver && file != image && std::filesystem::exists(file, none))
      files.push_back(file.string());
  }
  return files;
}

std::vector<std::string> HeadersBeside(const std::string& image, std::string_view driver) {
  std::vector<std::string> headers;
  if (!HasHeaderBeside(driver)) return headers;
  const std::filesystem::path path(image);
  for (const char* extension : {".hdr", ".HDR", ".clr", ".CLR"})
    for (const std::string& name :
         {std::filesystem::path(path).replace_extension(extension).string(), image + extension}) {
      std::error_code none;
      if (name != image && std::filesystem::is_regular_file(name, none)) headers.push_back(name);
    }
  return headers;
}

}  // namespace orin::drivers
