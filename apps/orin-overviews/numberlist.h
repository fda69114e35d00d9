/// Lists of numbers as a user types them: "2,4,8" and "1,3-5".
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

namespace orin::app {

/// The result of reading a list: the numbers, or why there are none.
struct NumberList {
  std::vector<unsigned> numbers;
  std::string problem;  ///< for the user; empty when the list is good
};

/// Reads levels, "2,4,8", in the order given, repeated ones included.
NumberList ParseLevels(const std::string& text);

/// Reads channels, "1,3-5"; a channel named twice counts once, where it was named first.
/// No number may pass 65535, the most channels that a raster file holds.
NumberList ParseChannels(const std::string& text);

/// "2, 4, 8"
std::string JoinNumbers(const std::vector<unsigned>& numbers);

}  // namespace orin::app
