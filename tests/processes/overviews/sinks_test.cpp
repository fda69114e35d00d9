/// Sinks that ask the library about the file that they are told of.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "host/datasources/formats.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/counter.h"
#include "host/services/warning.h"
#include "processes/overviews/createoverviews.h"
#include "processes/overviews/statusqueries.h"
#include "tests/e2e/tiffpicture.h"

namespace orin::testing {
namespace {

namespace fs = std::filesystem;

TEST(Sinks, MayAskAboutTheFileThatAWarningIsAbout) {
  const fs::path folder = fs::temp_directory_path() / ("orin-sinks-" + std::to_string(getpid()));
  fs::create_directories(folder);
  const std::string file = folder / "scene.tif";
  WritePicture(file, Picture<uint8_t>(600, 20, 1), {.tile = 64});
  std::ofstream(file + ".msk") << "no mask, but it has the name of one";
  drivers::RegisterTiffDriver();
  int warnings = 0, reports = 0;
  tarn::Warning::SetSink([&](const tarn::Report&) {
    ++warnings;
    EXPECT_FALSE(HasEnoughOverviews(file, 2));
  });
  tarn::Counter::SetSink([&](float, const std::string*) {
    HasEnoughOverviews(file, 2);
    return ++reports < 1000;
  });
  EXPECT_TRUE(CreateFileOverviews(file).Generate());
  EXPECT_EQ(1, warnings);
  EXPECT_LT(3, reports);
  tarn::Warning::SetSink({});
  tarn::Counter::SetSink({});
  EXPECT_TRUE(HasEnoughOverviews(file, 2));
  datasources::FormatRegistry::Instance().Clear();
  fs::remove_all(folder);
}

}  // namespace
}  // namespace orin::testing
