// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/vrtsources.h"

#include <cpl_string.h>

#include <array>
#include <filesystem>
#include <fstream>
#include <set>
#include <stop_token>
#include <string_view>
#include <utility>

#include "host/datasources/fingerprint.h"
#include "host/datasources/imagerecord.h"
#include "host/datasources/imagewatch.h"
#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/pixelfiles.h"
#include "host/drivers/gdal/rasternames.h"
#include "host/drivers/gdal/vrtnames.h"

namespace orin::drivers {
namespace {

constexpr size_t kMaxSources = 100000;
constexpr std::string_view kArchives[] = {"/vsizip/", "/vsitar/", "/vsigzip/", "/vsi7z/",
                                          "/vsirar/"};

/// Mosaics name thousands of them: they need not be identified by the library.
bool IsTiff(const std::string& file) {
  std::array<char, 4> start{};
  std::ifstream(file, std::ios::binary).read(start.data(), start.size());
  const std::string_view bytes(start.data(), start.size());
  for (const char* magic : {"II*\0", "MM\0*", "II+\0", "MM\0+"})
    if (bytes == std::string_view(magic, 4)) return true;
  return false;
}

/// "photo.tif" of "vrt://photo.tif?bands=1"; the name itself when it is none of these.
std::string WithoutVrtPrefix(const std::string& name) {
  constexpr std::string_view kPrefix = "vrt://";
  return name.starts_with(kPrefix) ? name.substr(kPrefix.size(), name.find('?') - kPrefix.size())
                                   : name;
}

/// "a/b" of "a/./c/../b"; names that only the library understands stay as they are.
std::string Normal(const std::string& name) {
  return IsLibraryName(name) ? name : std::filesystem::path(name).lexically_normal().string();
}

/// The plain file that holds a part of an archive: "a.zip" of "/vsizip/a.zip/image.tif"; empty when
/// there is none.
std::string ArchiveOf(std::string name) {
  for (const std::string_view prefix : kArchives) {
    if (!name.starts_with(prefix)) continue;
    name.erase(0, prefix.size());
    if (name.starts_with('{')) name = name.substr(1, name.find('}') - 1);
    if (name.starts_with("/vsi")) return ArchiveOf(name);
    for (; !name.empty() && name != "/"; name = std::filesystem::path(name).parent_path().string())
      if (IsRegularFile(name)) return name;
  }
  if (!name.starts_with("/vsisubfile/")) return {};
  const size_t comma = name.find(',');
  const std::string whole = comma == name.npos ? "" : name.substr(comma + 1);
  return IsRegularFile(whole) ? whole : ArchiveOf(whole);
}

class Tracer {
 public:
  explicit Tracer(const std::string& vrt) { seen_.insert(Normal(vrt)); }

  void AddNamesOf(const std::string& vrt) {
    const auto names = NamesInVrt(vrt);
    if (!names) sources_.areAllFiles = false;
    for (const std::string& name : names.value_or(std::vector<std::string>())) AddName(name);
  }

  /// What the library knows of beside the text. False when it names no file.
  bool AddFilesOf(GDALDatasetH dataset) {
    char** list = GDALGetFileList(dataset);
    bool isAny = false;
    for (CSLConstList file = list; file && *file; ++file) {
      const std::string_view name = *file;
      if (name.ends_with(".aux.xml") || name.ends_with(".ovr")) continue;
      isAny = isAny || IsRegularFile(*file);
      AddName(*file);
    }
    CSLDestroy(list);
    return isAny;
  }

  VrtSources Take() { return std::move(sources_); }

 private:
  void AddName(const std::string& given) {
    const std::string name = Normal(WithoutVrtPrefix(given));
    if (!seen_.insert(name).second) return;
    if (sources_.files.size() >= kMaxSources) {
      sources_.areAllFiles = false;
    } else if (IsRegularFile(name)) {
      AddImage(name);
    } else if (const std::string archive = ArchiveOf(name); !archive.empty()) {
      if (seen_.insert(archive).second) sources_.files.push_back(archive);
    } else if (IsLibraryName(name)) {
      AddPartOfFile(name);
    } else {
      std::error_code none;
      sources_.areAllFiles = sources_.areAllFiles && !std::filesystem::exists(name, none);
      sources_.files.push_back(name);  // if it appears, the pixels are others
    }
  }

  void AddImage(const std::string& name) {
    sources_.files.push_back(name);
    sources_.files.push_back(name + ".msk");
    if (IsTiff(name)) return;
    const GdalFormat* format = IdentifyGdalFormat(name);
    if (!format) return;
    for (const auto& files :
         {PixelFilesBeside(name, format->driver), HeadersBeside(name, format->driver)})
      sources_.files.insert(sources_.files.end(), files.begin(), files.end());
    if (std::string_view(format->driver) == "VRT") AddNamesOf(name);
  }

  /// "GTIFF_DIR:2:pages.tif": the library knows the file.
  void AddPartOfFile(const std::string& name) {
    const GdalErrors quiet;
    GDALDatasetH dataset = name.starts_with("/vsi") ? nullptr
                                                    : GDALOpenEx(name.c_str(), GDAL_OF_RASTER,
                                                                 nullptr, nullptr, nullptr);
    if (!dataset || !AddFilesOf(dataset)) sources_.areAllFiles = false;
    GDALClose(dataset);
  }

  std::set<std::string> seen_;
  VrtSources sources_;
};

}  // namespace

VrtSources SourcesOfVrt(const GdalHandle& vrt) {
  const GdalErrors quiet;
  Tracer tracer(vrt.Name());
  tracer.AddNamesOf(vrt.Name());
  tracer.AddFilesOf(vrt.Get());  // the file itself at least
  return tracer.Take();
}

std::string FingerprintOfVrt(const std::string& file, const GdalFormat& format) {
  datasources::Fingerprinter fingerprint;
  fingerprint.AddText(datasources::FingerprintOfFile(file, {}));  // which holds the names
  const VrtSources sources = SourcesOfVrt(GdalHandle(file, format));
  if (!sources.areAllFiles) return {};
  for (const std::string& source : sources.files) {
    const auto stamp = datasources::ImageWatch(source).Stamp();
    fingerprint.AddText(stamp ? datasources::TextOf(*stamp) : "");
  }
  return fingerprint.Text();
}

}  // namespace orin::drivers
