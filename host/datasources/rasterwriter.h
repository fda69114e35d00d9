/// Writes blocks of pixels of one overview level.
// SPDX-License-Identifier: MIT
#pragma once

#include "host/datasources/rasterreader.h"

namespace orin::datasources {

/// Its reading side delivers the level's own pixels, so that a level can be the source of a smaller
/// one.
class IRasterWriter : public virtual IRasterReader {
 public:
  /// Stores the useful area of `block` at (block.x, block.y). The first call marks the level's
  /// channels as not valid.
  /// \pre the block has this writer's channel count and data type, and its useful area lies inside
  /// \throws orin::Exception  the pixels cannot be stored; the text names the file and the reason
  virtual void Write(const gobs::Raster& block) = 0;
};

}  // namespace orin::datasources
