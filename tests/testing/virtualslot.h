/// The place of a virtual operation in its class's table.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstring>

namespace orin::testing {

/// Slot of a virtual member function, from 0; a virtual destructor takes two. Holds for the Itanium
/// C++ ABI on x86-64, where a pointer to a virtual member is one more than the slot's byte offset.
template <class Member>
size_t SlotOf(Member member) {
  static_assert(sizeof(Member) == 2 * sizeof(ptrdiff_t));
  ptrdiff_t words[2];
  std::memcpy(words, &member, sizeof words);
  return static_cast<size_t>(words[0] - 1) / sizeof(void*);
}

}  // namespace orin::testing
