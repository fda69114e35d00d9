/// Does something to a file while nobody else has it open.
// SPDX-License-Identifier: MIT
#pragma once

#include <functional>

namespace orin {

enum class Alone { kDone, kOthersHaveItOpen, kCannotTell };

/// Does `action` while nothing but `descriptor` has the file open, in this process or another, and
/// nobody can open it. File systems that know no leases, and files of other owners, do not tell.
/// \returns whether it was done, or why not
Alone DoAlone(int descriptor, const std::function<void()>& action);

}  // namespace orin
