// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/specialfiles.h"

#include <filesystem>
#include <fstream>
#include <set>

#include "host/drivers/gdal/rasternames.h"
#include "host/drivers/gdal/vrtnames.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

namespace fs = std::filesystem;

bool IsSpecial(fs::file_type type) {
  return type == fs::file_type::fifo || type == fs::file_type::character ||
         type == fs::file_type::block;
}

std::vector<std::string> SpecialFilesIn(const std::string& folder) {
  std::vector<std::string> names;
  std::error_code error;
  for (fs::directory_iterator entry(folder, error), end; !error && entry != end;
       entry.increment(error)) {
    std::error_code none;
    fs::file_type type = entry->symlink_status(none).type();  // comes with the name
    if (type == fs::file_type::symlink) type = entry->status(none).type();
    if (IsSpecial(type)) names.push_back(entry->path().filename().string());
  }
  return names;
}

/// As the library tells.
bool MayBeVrt(const std::string& file) {
  std::string start(1024, '\0');
  std::ifstream(file, std::ios::binary).read(start.data(), std::streamsize(start.size()));
  return start.find("<VRTDataset") != start.npos;
}

/// Looks at virtual rasters without the library, which opens some sources with them.
class SourceSearch {
 public:
  std::string Find(const std::string& image) {
    if (!seen_.insert(image).second) return {};
    std::error_code none;
    if (IsSpecial(fs::status(image, none).type())) return image;
    if (!IsRegularFile(image)) return {};
    if (std::string found = files_.Beside(image); !found.empty()) return found;
    if (!MayBeVrt(image)) return {};
    for (const std::string& name : NamesInVrt(image).value_or(std::vector<std::string>()))
      if (std::string found = Find(name); !found.empty()) return found;
    return {};
  }

 private:
  SpecialFiles files_;
  std::set<std::string> seen_;
};

}  // namespace

std::string SpecialFiles::Beside(const std::string& image) {
  const fs::path path(image);
  const std::string folder = path.has_parent_path() ? path.parent_path().string() : ".";
  const auto known = folders_.find(folder);
  const auto& names =
      known != folders_.end() ? known->second : folders_[folder] = SpecialFilesIn(folder);
  const std::string stem = path.stem().string() + ".";
  for (const std::string& name : names)
    if (name.starts_with(stem)) return (path.parent_path() / name).string();
  return {};
}

std::string SpecialFileOf(const std::string& image) { return SourceSearch().Find(image); }

std::string SpecialFileText(const std::string& image, const std::string& specialFile) {
  return FormatString(_("%s: is not read: %s is a pipe or a device, which would be waited for."),
                      image.c_str(), specialFile.c_str());
}

}  // namespace orin::drivers
