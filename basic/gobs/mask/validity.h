/// The one validity test of kernels: chosen outside the loop, folded away when there is no mask.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <utility>

#include "basic/gobs/mask/mask.h"

namespace orin::gobs {

/// No mask: every pixel is valid.
struct AllValid {
  static constexpr bool kAlways = true;
  constexpr bool operator()(int64_t, int64_t) const { return true; }
};

/// Calls `body` with the validity test that `mask` (null: none) asks for. Most masks of an image
/// with a border of no data have every bit set.
template <class Body>
void WithValidity(const Mask* mask, Body&& body) {
  if (mask && mask->Uniform() != true)
    std::forward<Body>(body)(MaskBits{mask->begin, LayoutOf(*mask)});
  else std::forward<Body>(body)(AllValid{});
}

}  // namespace orin::gobs
