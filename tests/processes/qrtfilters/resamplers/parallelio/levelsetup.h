/// One level on its way from a recorded reader to a recorded writer.
// SPDX-License-Identifier: MIT
#pragma once

#include <gmock/gmock.h>

#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/blockmemory.h"
#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/overviewaccessors.h"
#include "processes/qrtfilters/resamplers/parallelio/filteriodriver.h"
#include "tests/testing/fakekernel.h"
#include "tests/testing/pictures.h"
#include "tests/testing/recordinghost.h"

namespace orin::parallelio {

/// Level 2 of a raster of 80 x 12 bytes, in blocks of 40 x 2: three of them. The kernel logs
/// "process(x,y)", the place of its source block.
struct LevelSetup {
  static constexpr size_t kBlocks = 3;

  explicit LevelSetup(unsigned height = 12) {
    host.Put("a.tif", orin::testing::NoiseOf(80, height, 1));
    dataset.reset(datasources::DatasetManager::GetInstance()->Open("a.tif", datasources::kUpdate));
    auto* raster = dynamic_cast<datasources::IRasterDataset*>(dataset.get());
    reader =
        std::make_unique<datasources::BasicReader>(dataset.get(), std::vector<unsigned>{1}, false);
    datasources::BasicOverviewWriterAccessor accessor(raster, {1});
    accessor.CreateLevel(2);
    writer.reset(accessor.CreateRasterWriter(2));
    factory.before = [this](const gobs::Raster& src, const gobs::Mask*, const gobs::Raster&) {
      host.Note("process(" + std::to_string(src.x) + "," + std::to_string(src.y) + ")");
    };
    driver.factory = &factory;
    driver.ResamplerManager::xRatio = driver.ResamplerManager::yRatio = 0.5;
    driver.ResamplerAccessPolicy::xRatio = driver.ResamplerAccessPolicy::yRatio = 0.5;
    driver.memoryBudget = 1000;
    host.Clear();
  }

  void Process() { driver.Process(reader.get(), writer.get()); }

  /// Lines of reading, processing, writing and progress.
  std::vector<std::string> Log() const {
    std::vector<std::string> lines = host.Log();
    std::erase_if(lines, [](const std::string& line) { return line[0] == '~'; });
    return lines;
  }
  /// Place of a line in the log; a failure, and a place behind the end, when it is not there.
  size_t PlaceOf(const std::string& line) const {
    const std::vector<std::string> lines = Log();
    const auto found = std::find(lines.begin(), lines.end(), line);
    EXPECT_NE(lines.end(), found) << line;
    return static_cast<size_t>(found - lines.begin());
  }
  size_t Count(const std::string& start) const { return host.Log(start).size(); }
  size_t Reads() const { return Count("reader[1]{1}.Read"); }
  size_t Processed() const { return Count("process"); }
  size_t Writes() const { return Count("writer[2]{1}.Write"); }

  /// True when the level holds every second pixel of every second row of the image.
  bool LevelIsRight() {
    const auto& image = host.Levels("a.tif");
    const std::vector<unsigned char>& level = image.levels.at(2).channels[0].samples;
    const auto block = reader->GetRaster(0);
    for (unsigned y = 0; y < image.height / 2; ++y)
      for (unsigned x = 0; x < 40; ++x)
        if (level[y * 40 + x] != *PixelAddress(*block, 2 * x, 2 * y)) return false;
    return true;
  }

  orin::testing::RecordingHost host;
  orin::testing::FakeKernelFactory factory;
  std::unique_ptr<datasources::IDataset> dataset;
  std::unique_ptr<datasources::IRasterReader> reader;
  std::unique_ptr<datasources::IRasterWriter> writer;
  LevelDriver driver;
};

inline std::string ReadLine(unsigned block) {
  return "reader[1]{1}.Read(0," + std::to_string(4 * block) + ",80,4)";
}
inline std::string ProcessLine(unsigned block) {
  return "process(0," + std::to_string(4 * block) + ")";
}
inline std::string WriteLine(unsigned block) {
  return "writer[2]{1}.Write(0," + std::to_string(2 * block) + ",40,2)";
}

}  // namespace orin::parallelio
