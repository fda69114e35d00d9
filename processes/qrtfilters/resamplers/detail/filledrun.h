/// Marks the pixels that a kernel fills in a destination row.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"

namespace orin::resamplers::detail {

/// The validity that a kernel keeps of `dst`, all valid so far: attached to it where the source has
/// a mask and carries a validity; null where nobody asks for it.
/// \throws orin::OutOfMemory
inline gobs::Mask* KeptValidity(const gobs::Raster& src, const gobs::Mask* srcMask,
                                gobs::Raster& dst) {
  if (!srcMask || !src.validity) return nullptr;
  dst.validity = std::make_unique<gobs::Mask>(dst.width, dst.height, dst.Window());
  return dst.validity.get();
}

/// The filled pixels of one row, marked a run at a time. Several threads may mark rows of one
/// block.
class FilledRun {
 public:
  /// \param validity  of the destination; null: nothing is marked
  FilledRun(gobs::Mask* validity, uint32_t row) : validity_(validity), row_(row) {}
  FilledRun(const FilledRun&) = delete;
  FilledRun& operator=(const FilledRun&) = delete;
  ~FilledRun() { Mark(); }

  /// \param column  beyond those added before
  void Add(int64_t column) {
    if (!validity_) return;
    if (column != end_) {
      Mark();
      first_ = column;
    }
    end_ = column + 1;
  }

 private:
  void Mark() {
    if (first_ < end_) validity_->ClearRun(first_, row_, static_cast<uint64_t>(end_ - first_));
  }

  gobs::Mask* validity_;
  int64_t row_;
  int64_t first_ = 0;
  int64_t end_ = 0;
};

}  // namespace orin::resamplers::detail
