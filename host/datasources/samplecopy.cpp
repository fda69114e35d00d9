// SPDX-License-Identifier: MIT
#include "host/datasources/samplecopy.h"

#include <cstring>

namespace orin::datasources {
namespace {

template <uint32_t Bytes>
void Copy(const uint8_t* from, uint64_t fromStride, uint8_t* to, uint64_t toStride,
          uint64_t count) {
  if (fromStride == 1 && toStride == 1) {
    std::memcpy(to, from, count * Bytes);
    return;
  }
  for (uint64_t i = 0; i < count; ++i, from += fromStride * Bytes, to += toStride * Bytes)
    std::memcpy(to, from, Bytes);
}

}  // namespace

CopySamples CopierOf(uint64_t sampleBytes) {
  switch (sampleBytes) {
    case 1:
      return Copy<1>;
    case 2:
      return Copy<2>;
    case 4:
      return Copy<4>;
    case 8:
      return Copy<8>;
    default:
      return Copy<16>;
  }
}

}  // namespace orin::datasources
