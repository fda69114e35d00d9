// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/nearestword.h"

#include <algorithm>
#include <cstddef>

#include "host/services/text.h"

namespace orin::app {
namespace {

std::string LowerCase(std::string text) {
  for (char& letter : text)
    if (letter >= 'A' && letter <= 'Z') letter = static_cast<char>(letter - 'A' + 'a');
  return text;
}

/// Letters to change, add, leave out, or swap with their neighbours.
size_t DistanceOf(const std::string& one, const std::string& other) {
  std::vector<std::vector<size_t>> steps(one.size() + 1, std::vector<size_t>(other.size() + 1));
  for (size_t i = 0; i <= one.size(); ++i) {
    for (size_t j = 0; j <= other.size(); ++j) {
      if (i == 0 || j == 0) {
        steps[i][j] = i + j;
        continue;
      }
      const size_t change = one[i - 1] == other[j - 1] ? 0 : 1;
      steps[i][j] =
          std::min({steps[i - 1][j] + 1, steps[i][j - 1] + 1, steps[i - 1][j - 1] + change});
      if (i > 1 && j > 1 && one[i - 1] == other[j - 2] && one[i - 2] == other[j - 1])
        steps[i][j] = std::min(steps[i][j], steps[i - 2][j - 2] + 1);
    }
  }
  return steps[one.size()][other.size()];
}

}  // namespace

std::string NearestWord(const std::string& word, const std::vector<std::string>& known) {
  constexpr size_t kMaxLetters = 40;  // of a word that somebody typed
  if (word.size() > kMaxLetters) return "";
  std::string nearest;
  size_t least = word.size() / 3 + 1;
  for (const std::string& candidate : known) {
    const size_t distance = DistanceOf(LowerCase(word), LowerCase(candidate));
    if (distance >= least) continue;
    least = distance;
    nearest = candidate;
  }
  return nearest;
}

std::string SuggestionFor(const std::string& word, const std::vector<std::string>& known) {
  const std::string nearest = NearestWord(word, known);
  return nearest.empty() ? "" : FormatString(_(" Did you mean %s?"), nearest.c_str());
}

}  // namespace orin::app
