/// Builds a level of an array in memory and prints it.
// SPDX-License-Identifier: MIT
#include <cstdio>

#include "host/drivers/memory/memorydriver.h"
#include "processes/overviews/createoverviews.h"

int main() {
  orin::drivers::RegisterMemoryDriver();
  orin::drivers::MemoryRaster raster;
  raster.width = 6;
  raster.height = 4;
  raster.channels.push_back({orin::gobs::eDT_8U,
                             {10, 20, 30, 40, 50, 60,  //
                              10, 20, 30, 40, 50, 60,  //
                              70, 70, 80, 80, 90, 90,  //
                              70, 70, 80, 80, 90, 90},
                             {}});
  orin::drivers::PutMemoryRaster("mem:array", raster);

  CreateFileOverviews job("mem:array");
  job.SetPyramidType(GetPyramidType("average"));
  job.SetPyramidLevels({2}, false);
  if (!job.Generate()) return 1;
  const auto level = orin::drivers::MemoryLevelSamples("mem:array", 1, 2);  // 3 x 2 pixels
  for (size_t i = 0; i < level.size(); ++i) std::printf("%3d%s", level[i], i % 3 == 2 ? "\n" : " ");
}
