/// The factor of a level, told from its size.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>

namespace orin::drivers {

/// The factor of a level that another program made, from its size, rounded down or up in each axis;
/// none when the axes do not agree on one of 2 or more. A power of two wins, then the nearest.
std::optional<unsigned> FactorOf(uint32_t width, uint32_t height, uint32_t levelWidth,
                                 uint32_t levelHeight);

}  // namespace orin::drivers
