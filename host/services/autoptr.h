/// A scoped holder of a host object, released through its policy.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

namespace orin {

/// Releases a host object through its virtual destructor.
template <class T>
using DeletePolicy = std::default_delete<T>;

/// Owns one host object; the contract's raw pointers are taken into it on the line that receives
/// them.
template <class T, class Policy = DeletePolicy<T>>
using HAutoPtr = std::unique_ptr<T, Policy>;

}  // namespace orin
