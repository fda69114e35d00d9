/// How a TIFF file begins.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>

namespace orin::drivers {

/// Bytes that tell.
using TiffMagic = std::array<char, 4>;

/// True for the first bytes of a classic TIFF or a BigTIFF, in either byte order.
inline bool IsTiff(const TiffMagic& first) {
  static constexpr std::array<TiffMagic, 4> kKnown = {
      {{'I', 'I', '*', '\0'}, {'M', 'M', '\0', '*'}, {'I', 'I', '+', '\0'}, {'M', 'M', '\0', '+'}}};
  return std::find(kKnown.begin(), kKnown.end(), first) != kKnown.end();
}

}  // namespace orin::drivers
