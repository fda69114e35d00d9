/// Pipes and devices under the names of images: a program that opens them waits, or reads for ever.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <string>
#include <vector>

namespace orin::drivers {

/// Remembers what it saw of each folder; made for one look at an image and its sources.
class SpecialFiles {
 public:
  /// A pipe or device that has the name of `image` but for extensions; empty when there is none.
  /// The library opens whatever has such a name.
  std::string Beside(const std::string& image);

 private:
  std::map<std::string, std::vector<std::string>> folders_;
};

/// The same for an image and, where it is a virtual raster, for all of its sources, which may be
/// pipes or devices themselves.
std::string SpecialFileOf(const std::string& image);

/// What to tell of it.
std::string SpecialFileText(const std::string& image, const std::string& specialFile);

}  // namespace orin::drivers
