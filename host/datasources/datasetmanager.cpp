// SPDX-License-Identifier: MIT
#include "host/datasources/datasetmanager.h"

#include <cerrno>
#include <cstring>
#include <memory>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/datasources/formats.h"
#include "host/datasources/genericlayer.h"
#include "host/datasources/sourcedataset.h"
#include "host/datasources/withmemory.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

[[noreturn]] void Refuse(const std::string& text, const char* function) {
  throw Exception(text, "host/datasources/datasetmanager", function, 0);
}

/// Why a file that is there cannot be read, in the system's words; empty when it can be.
std::string ObstacleTo(const std::string& file, const struct stat& status) {
  if (S_ISDIR(status.st_mode))
    return FormatString(_("%s: is a directory, not a raster file."), file.c_str());
  if (!S_ISREG(status.st_mode))
    return FormatString(_("%s: is a pipe or a device, not a raster file."), file.c_str());
  const int descriptor = open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (descriptor < 0)
    return FormatString(_("%s: cannot be opened: %s."), file.c_str(), std::strerror(errno));
  close(descriptor);
  return {};
}

/// Why no driver took the file: it is not there, cannot be read, or is nothing that a driver knows.
std::string UnrecognisedText(const std::string& file) {
  struct stat status;
  const bool isThere = stat(file.c_str(), &status) == 0;
  const int error = errno;
  if (isThere)
    if (std::string obstacle = ObstacleTo(file, status); !obstacle.empty()) return obstacle;
  if (std::string why = FormatRegistry::Instance().WhyUnrecognised(file); !why.empty()) return why;
  if (!isThere)
    return FormatString(_("%s: cannot be opened: %s."), file.c_str(), std::strerror(error));
  return FormatString(_("%s: is not a raster file of a known format. If another program reads it, "
                        "make a TIFF of it: gdal_translate %s OUT.tif"),
                      file.c_str(), file.c_str());
}

/// True for a format of its own whose name the library takes for the generic layer's, so that it
/// never reopens such a dataset: what is opened for reading has to keep new levels beside the file
/// from the start.
bool KeepsItsName(int code) {
  const ZMBInfo_s* record = ZMBGetFormatInfo(code);
  return record && record->name.find("ZMB") != std::string::npos &&
         FormatRegistry::Instance().SideCarFormat() != nullptr;
}

IDataset* OpenThrough(int formatCode, const std::string& file, AccessMode mode,
                      const char* function) {
  ZMBFormatType fileCode = kFormatUnknown;
  IFormatDriver* driver = FormatRegistry::Instance().DriverOf(file, fileCode);
  if (!driver) Refuse(UnrecognisedText(file), function);
  if (formatCode == kFormatGeneric)
    return new SourceDataset(OpenGeneric(*driver, file), file, mode, kFormatGeneric, fileCode);
  if (formatCode != kFormatUnknown && formatCode != fileCode)
    Refuse(
        FormatString(_("%s: is not a %s file."), file.c_str(), ZMBInfo[formatCode]->name.c_str()),
        function);
  if (mode == kReadOnly && KeepsItsName(fileCode))
    return new SourceDataset(OpenGeneric(*driver, file), file, mode, fileCode, fileCode);
  return new SourceDataset(driver->Open(file, mode), file, mode, fileCode, fileCode);
}

int CodeOfName(const std::string& format) {
  for (const ZMBInfo_s* record : ZMBInfo)
    if (record && record->code != kFormatUnknown && record->name == format) return record->code;
  Refuse(FormatString(_("There is no raster format named %s."), format.c_str()),
         "orin::datasources::DatasetManager::OpenFormat(const std::string&, const std::string&, "
         "orin::datasources::AccessMode)");
}

}  // namespace

DatasetManager* DatasetManager::GetInstance() {
  static DatasetManager manager;
  return &manager;
}

IDataset* DatasetManager::Open(const std::string& file, AccessMode mode) {
  constexpr char kFunction[] =
      "orin::datasources::DatasetManager::Open(const std::string&, "
      "orin::datasources::AccessMode)";
  return ReadWithMemory(file, kFunction,
                        [&] { return OpenThrough(kFormatUnknown, file, mode, kFunction); });
}

IDataset* DatasetManager::OpenFormat(const std::string& format, const std::string& file,
                                     AccessMode mode) {
  FormatRegistry::Instance();  // fills the table's fixed records
  constexpr char kFunction[] =
      "orin::datasources::DatasetManager::OpenFormat(const std::string&, "
      "const std::string&, orin::datasources::AccessMode)";
  return ReadWithMemory(file, kFunction,
                        [&] { return OpenThrough(CodeOfName(format), file, mode, kFunction); });
}

std::unique_ptr<LevelSite> DatasetManager::OpenSite(const std::string& file, AccessMode mode) {
  constexpr char kFunction[] =
      "orin::datasources::DatasetManager::OpenSite(const std::string&, "
      "orin::datasources::AccessMode)";
  return ReadWithMemory(file, kFunction, [&] {
    ZMBFormatType code = kFormatUnknown;
    IFormatDriver* driver = FormatRegistry::Instance().DriverOf(file, code);
    if (!driver) Refuse(UnrecognisedText(file), kFunction);
    return std::make_unique<LevelSite>(*driver, code, file, mode);
  });
}

}  // namespace orin::datasources
