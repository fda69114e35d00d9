/// Decides which pixels of a block are no data, and builds the block's mask from that.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"

namespace orin::gobs {

/// A per-pixel validity decision over all channels of a block.
class IMaskDecision {
 public:
  virtual ~IMaskDecision() = default;
  /// Sets the bit of every buffer pixel of `block`, margins included, in `mask`, which has its
  /// geometry. Called from one thread at a time.
  virtual void Decide(const Raster& block, Mask& mask) const = 0;
};

/// Builds masks from a decision that its owner keeps alive.
class MaskDecisionBuilder {
 public:
  explicit MaskDecisionBuilder(const IMaskDecision* decision) : decision_(decision) {}

  /// A new mask of the geometry of `block`, owned by the caller. What the decision throws passes
  /// through.
  Mask* BuildMask(const Raster& block) const;

 private:
  const IMaskDecision* decision_;
};

}  // namespace orin::gobs
