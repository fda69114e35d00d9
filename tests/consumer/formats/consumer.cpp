/// A program that opens formats beside TIFF: their module is loaded by the first of them, and
/// shares classes and services with the program.
// SPDX-License-Identifier: MIT
#include <cstdio>
#include <fstream>
#include <memory>
#include <string>

#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/drivers/gdal/gdaldriver.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/exception.h"

namespace {

/// Whether the GDAL library is part of the process.
bool IsGdalLoaded() {
  std::ifstream maps("/proc/self/maps");
  for (std::string line; std::getline(maps, line);)
    if (line.find("libgdal") != line.npos) return true;
  return false;
}

void TellOf(const char* file) {
  try {
    const std::unique_ptr<orin::datasources::IDataset> dataset(
        orin::datasources::DatasetManager::GetInstance()->Open(file, orin::datasources::kReadOnly));
    auto* raster = dynamic_cast<orin::datasources::IRasterDataset*>(dataset.get());
    std::printf("%s: %u x %u, %s\n", file, raster->GetWidth(), raster->GetHeight(),
                orin::datasources::FormatNameOf(*dataset).c_str());
  } catch (const orin::Exception& error) {
    const std::string text = error.GetMessage();
    const size_t reason = text.rfind(": ");  // the library's words
    std::printf("%s\n", text.substr(0, reason).c_str());
  }
}

}  // namespace

int main() {
  orin::drivers::RegisterTiffDriver();
  orin::drivers::RegisterGdalDriver();
  std::printf("%s\n", ZMBGetFormatInfo(kFormatErdas)->name.c_str());
  std::ofstream("damaged.tif") << std::string("II*\0\0\0\0\0", 8);
  TellOf("damaged.tif");
  TellOf("missing.vrt");
  std::printf("loaded: %s\n", IsGdalLoaded() ? "yes" : "no");
  std::ofstream("image.vrt") << "<VRTDataset rasterXSize='4' rasterYSize='3'>"
                                "<VRTRasterBand dataType='Byte' band='1'/></VRTDataset>";
  TellOf("image.vrt");
  std::ofstream("damaged.vrt") << "<VRTDataset rasterXSize='4' rasterYSize='3'><VRTRasterBand";
  TellOf("damaged.vrt");
  std::printf("loaded: %s\n", IsGdalLoaded() ? "yes" : "no");
}
