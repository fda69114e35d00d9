/// Names and texts of others, made safe to print.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <string_view>

namespace orin::app {

/// `text` without anything that steers a terminal or begins a line: control characters, and bytes
/// that are no UTF-8, stand as \n, \x1b and the like.
std::string Printable(std::string_view text);

/// Every line of `text` after "FILE: ", which stands once however the line begins. The name is
/// printable wherever it stands.
std::string AfterFileName(const std::string& file, const std::string& text);

}  // namespace orin::app
