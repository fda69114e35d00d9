/// Byte ranges as text.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/drivers/common/byteranges.h"

namespace orin::tests {

/// "2-5 9-10"
inline std::string TextOf(const drivers::ByteRanges& ranges) {
  std::string text;
  for (const auto& [start, end] : ranges)
    text += (text.empty() ? "" : " ") + std::to_string(start) + "-" + std::to_string(end);
  return text;
}

}  // namespace orin::tests
