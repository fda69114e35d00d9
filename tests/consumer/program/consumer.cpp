/// A program that embeds the library: hands a raster over and prints the level built of it.
// SPDX-License-Identifier: MIT
#include <cstdio>

#include "host/drivers/memory/memorydriver.h"
#include "processes/overviews/createoverviews.h"

int main() {
  orin::drivers::RegisterMemoryDriver();
  orin::drivers::MemoryRaster raster;
  raster.width = raster.height = 4;
  raster.channels.push_back({orin::gobs::eDT_8U,
                             {1, 2, 3, 4,     //
                              5, 6, 7, 8,     //
                              9, 10, 11, 12,  //
                              13, 14, 15, 16},
                             {}});
  orin::drivers::PutMemoryRaster("mem:consumer", raster);

  CreateFileOverviews job("mem:consumer");
  job.SetPyramidType(GetPyramidType("nearest"));
  job.SetPyramidLevels({2}, false);
  const bool done = job.Generate();
  std::printf("%s:", done ? "done" : "failed");
  for (const int sample : orin::drivers::MemoryLevelSamples("mem:consumer", 1, 2))
    std::printf(" %d", sample);
  std::printf("\n");
}
