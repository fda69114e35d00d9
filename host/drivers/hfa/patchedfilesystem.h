/// Where the library finds files of ours: a file system of our own among its virtual ones.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace orin::drivers {

class ILibraryFile;

/// Lets the library open `file` under the name that is returned, which ends in "/" and `fileName`.
/// Nothing else is found beside it, and nothing can be made there.
std::string ShowToLibrary(ILibraryFile& file, const std::string& fileName);
void HideFromLibrary(const std::string& libraryName);

}  // namespace orin::drivers
