/// The names that the text of a virtual raster (VRT) gives to its sources.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>
#include <vector>

namespace orin::drivers {

/// The names as the library would open them, in order of appearance: those of source files and
/// datasets, and of the grids that a warped raster needs. Names that are said to be relative are
/// completed with `folder`; a text inside a text counts with the names in it.
/// \returns nothing when it is no XML text
std::optional<std::vector<std::string>> NamesInVrtText(const std::string& text,
                                                       const std::string& folder);

/// The same of a file. \returns nothing when it cannot be read or is larger than 64 MiB
std::optional<std::vector<std::string>> NamesInVrt(const std::string& file);

}  // namespace orin::drivers
