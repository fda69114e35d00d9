/// Fuzzes the text of a virtual raster: the names of its sources.
// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/vrtnames.h"

#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz/check.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string text(reinterpret_cast<const char*>(data), size);
  const auto names = orin::drivers::NamesInVrtText(text, "folder");
  if (!names) return 0;
  for (const std::string& name : *names) orin::fuzz::Demand(!name.empty(), "a name has letters");
  return 0;
}
