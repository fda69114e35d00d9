// SPDX-License-Identifier: MIT
#include <cstdio>

#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/warning.h"
#include "processes/overviews/createoverviews.h"
#include "processes/overviews/diagnosis.h"

int main() {
  orin::drivers::RegisterTiffDriver();  // once: the formats that jobs can open
  orin::tarn::Warning::SetSink([](const orin::tarn::Report& warning) {
    std::fprintf(stderr, "%s\n", warning.message.c_str());
  });

  CreateFileOverviews job("scene.tif");
  job.SetPyramidLevels({2, 4, 8}, false);
  job.SetPyramidType(GetPyramidType("average"));
  const bool done = job.Generate();
  const auto obstacle = orin::overviews::Diagnose(job);  // what no warning tells
  if (!done && !obstacle.text.empty()) std::fprintf(stderr, "%s\n", obstacle.text.c_str());
  std::printf("done=%d\n", done);
}
