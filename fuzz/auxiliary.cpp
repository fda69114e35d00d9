/// Fuzzes the text beside an image: whatever it holds, the declared values are texts of channels.
// SPDX-License-Identifier: MIT
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "fuzz/check.h"
#include "host/drivers/common/auxiliaryfile.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  for (const bool isWhole : {true, false})
    for (const auto& [channel, value] : orin::drivers::ParseAuxiliaryText(text, isWhole).noData)
      orin::fuzz::Demand(channel != 0 && !value.empty(), "a value has a channel and a text");
  return 0;
}
