// SPDX-License-Identifier: MIT
#include "basic/gobs/mask/maskdecision.h"

#include <memory>

namespace orin::gobs {

Mask* MaskDecisionBuilder::BuildMask(const Raster& block) const {
  auto mask = std::make_unique<Mask>(block.width, block.height, block.Window());
  decision_->Decide(block, *mask);
  return mask.release();
}

}  // namespace orin::gobs
