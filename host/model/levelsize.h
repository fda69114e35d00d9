/// The size of an overview level.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace orin::model {

/// Whole pixels only: what is left of the image at its right and bottom edges has none.
struct LevelSize {
  uint32_t width = 0;   ///< pixels
  uint32_t height = 0;  ///< pixels

  constexpr bool IsEmpty() const { return width == 0 || height == 0; }
  friend bool operator==(const LevelSize&, const LevelSize&) = default;
};

/// \param width, height  of the image in pixels
/// \param level          the decimation factor; 0 gives a level without pixels
constexpr LevelSize LevelSizeOf(uint32_t width, uint32_t height, unsigned level) {
  return level == 0 ? LevelSize{} : LevelSize{width / level, height / level};
}

}  // namespace orin::model
