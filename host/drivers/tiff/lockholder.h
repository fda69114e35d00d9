/// Finds out who has locked a file.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include <sys/stat.h>

namespace orin::drivers {

/// "name (process 1234)" of the process whose lock on the file is in force; empty where the system
/// does not tell.
/// \param file  as `fstat` describes it
std::string LockHolderOf(const struct stat& file);

}  // namespace orin::drivers
