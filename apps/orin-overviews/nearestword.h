/// The known word that a mistyped one probably means.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

namespace orin::app {

/// The word of `known` that differs least from `word`, in any letter case; empty when none is near:
/// at most one letter of three may be wrong, missing, too many, or swapped with its neighbour.
std::string NearestWord(const std::string& word, const std::vector<std::string>& known);

/// " Did you mean WORD?" or nothing.
std::string SuggestionFor(const std::string& word, const std::vector<std::string>& known);

}  // namespace orin::app
