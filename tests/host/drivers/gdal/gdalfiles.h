/// Files that tests write through the GDAL library, and the registry with our drivers.
// SPDX-License-Identifier: MIT
#pragma once

#include <gdal_priv.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/readingdriver.h"
#include "host/drivers/hfa/hfalevelstore.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/exception.h"

namespace orin::tests {

#ifdef ORIN_HAS_HFA_LEVELS
inline constexpr drivers::OpenInternalLevels kErdasLevels = &drivers::OpenHfaLevels;
#else
inline constexpr drivers::OpenInternalLevels kErdasLevels = nullptr;
#endif

/// A folder of the test's own; the TIFF driver and the GDAL driver in the registry.
class GdalFiles : public ::testing::Test {
 protected:
  GdalFiles() {
    std::string name = (std::filesystem::temp_directory_path() / "orin-gdal-XXXXXX").string();
    if (!mkdtemp(name.data())) ADD_FAILURE() << "no scratch folder";
    folder_ = name;
    datasources::FormatRegistry::Instance().Clear();
    drivers::RegisterTiffDriver();
    datasources::FormatRegistry::Instance().Register(drivers::MakeReadingDriver(kErdasLevels));
  }
  ~GdalFiles() override {
    datasources::FormatRegistry::Instance().Clear();
    std::filesystem::remove_all(folder_);
  }

  std::string File(const std::string& name) const { return (folder_ / name).string(); }

  std::filesystem::path folder_;
};

/// Value of the pixel (x, y) of a channel: neighbours differ, and rows differ.
inline int PatternAt(int x, int y, int channel) { return (x * 7 + y * 13 + channel * 53) % 251; }

struct Picture {
  int width = 37, height = 29, channels = 1;
  GDALDataType type = GDT_Byte;
  std::vector<std::string> options = {};
};

/// Writes the pattern; `edit` may change the dataset before it is stored.
inline void WritePicture(
    const std::string& file, const char* driver, const Picture& picture,
    const std::function<void(GDALDataset&)>& edit = [](GDALDataset&) {}) {
  const drivers::GdalErrors quiet;
  GDALDriverManager& drivers = *GetGDALDriverManager();
  const std::unique_ptr<GDALDataset> memory(drivers.GetDriverByName("MEM")->Create(
      "", picture.width, picture.height, picture.channels, picture.type, nullptr));
  for (int channel = 1; channel <= picture.channels; ++channel)
    for (int y = 0; y < picture.height; ++y)
      for (int x = 0; x < picture.width; ++x) {
        double value[2] = {double(PatternAt(x, y, channel)), 0};
        ASSERT_EQ(CE_None, memory->GetRasterBand(channel)->RasterIO(GF_Write, x, y, 1, 1, value, 1,
                                                                    1, GDT_CFloat64, 0, 0));
      }
  edit(*memory);
  CPLStringList options;
  for (const std::string& option : picture.options) options.AddString(option.c_str());
  const std::unique_ptr<GDALDataset> copy(drivers.GetDriverByName(driver)->CreateCopy(
      file.c_str(), memory.get(), FALSE, options.List(), nullptr, nullptr));
  ASSERT_TRUE(copy) << driver;
  std::filesystem::remove(file + ".aux.xml");
}

inline std::unique_ptr<datasources::IRasterDataset> Open(
    const std::string& file, datasources::AccessMode mode = datasources::kReadOnly) {
  datasources::IDataset* dataset = datasources::DatasetManager::GetInstance()->Open(file, mode);
  return std::unique_ptr<datasources::IRasterDataset>(
      dynamic_cast<datasources::IRasterDataset*>(dataset));
}

/// The message of the exception that `work` throws; empty when it throws none.
inline std::string RefusalOf(const std::function<void()>& work) {
  try {
    work();
  } catch (const Exception& refusal) {
    return refusal.GetMessage();
  }
  return "";
}

inline std::string BytesOf(const std::string& file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

inline void WriteBytes(const std::string& file, const std::string& bytes) {
  std::ofstream(file, std::ios::binary).write(bytes.data(), std::streamsize(bytes.size()));
}

}  // namespace orin::tests
