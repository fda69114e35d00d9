// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tiffdriver.h"

#include <fstream>
#include <memory>
#include <string>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/datasources/formats.h"
#include "host/drivers/tiff/sidecar.h"
#include "host/drivers/tiff/tiffmagic.h"
#include "host/drivers/tiff/tiffsource.h"

namespace orin::drivers {
namespace {

class TiffDriver final : public datasources::IFormatDriver {
 public:
  std::vector<ZMBInfo_s> Formats() const override {
    return {{"TIFF", "TIFF / GeoTIFF", kFormatTiff, 1}};
  }

  ZMBFormatType Identify(const std::string& file) const override {
    struct stat status;
    if (stat(file.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) return kFormatUnknown;
    TiffMagic magic{};
    if (!std::ifstream(file, std::ios::binary).read(magic.data(), magic.size()))
      return kFormatUnknown;
    return IsTiff(magic) ? kFormatTiff : kFormatUnknown;
  }

  bool MayUpdate(const std::string& file) const override {
    return faccessat(AT_FDCWD, file.c_str(), W_OK, AT_EACCESS) == 0;
  }

  std::unique_ptr<datasources::IRasterSource> Open(const std::string& file,
                                                   datasources::AccessMode access) override {
    return std::make_unique<TiffSource>(file, access);
  }
};

}  // namespace

void RegisterTiffDriver() {
  datasources::FormatRegistry& registry = datasources::FormatRegistry::Instance();
  registry.Register(std::make_shared<TiffDriver>());
  registry.SetSideCarFormat(std::make_shared<TiffSideCar>());
}

}  // namespace orin::drivers
