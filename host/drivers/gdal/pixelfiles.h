/// The files beside an image that decide its pixels.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace orin::drivers {

/// Files of the same name with another extension that hold pixels, or tell where they are, and
/// exist.
/// \param driver  the library's name of the format
std::vector<std::string> PixelFilesBeside(const std::string& image, std::string_view driver);

/// Files of the same name that tell how a format without a header stores its pixels, and exist.
std::vector<std::string> HeadersBeside(const std::string& image, std::string_view driver);

}  // namespace orin::drivers
