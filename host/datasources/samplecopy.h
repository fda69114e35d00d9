/// Copies runs of samples between layouts of different interleaving.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace orin::datasources {

/// Copies `count` samples; the strides are counted in samples, a source stride of 0 repeats one
/// sample.
using CopySamples = void (*)(const uint8_t* from, uint64_t fromStride, uint8_t* to,
                             uint64_t toStride, uint64_t count);

/// \param sampleBytes  1, 2, 4, 8 or 16
CopySamples CopierOf(uint64_t sampleBytes);

}  // namespace orin::datasources
