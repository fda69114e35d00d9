// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/numberlist.h"

#include <algorithm>
#include <charconv>
#include <optional>
#include <string_view>

#include "host/services/text.h"

namespace orin::app {
namespace {

constexpr unsigned kMostChannels = 65535;

std::optional<unsigned> NumberOf(std::string_view text) {
  unsigned number = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error != std::errc() || stop != end) return std::nullopt;
  return number;
}

std::vector<std::string_view> SplitAtCommas(std::string_view text) {
  std::vector<std::string_view> parts;
  for (;;) {
    const size_t comma = text.find(',');
    parts.push_back(text.substr(0, comma));
    if (comma == std::string_view::npos) return parts;
    text.remove_prefix(comma + 1);
  }
}

struct Range {
  unsigned first;
  unsigned last;
};

/// "3" or "3-5"; nothing when it is neither or runs backwards.
std::optional<Range> RangeOf(std::string_view text) {
  const size_t dash = text.find('-');
  const auto first = NumberOf(text.substr(0, dash));
  const auto last = dash == std::string_view::npos ? first : NumberOf(text.substr(dash + 1));
  if (!first || !last || *last < *first) return std::nullopt;
  return Range{*first, *last};
}

}  // namespace

NumberList ParseLevels(const std::string& text) {
  NumberList list;
  for (const std::string_view part : SplitAtCommas(text)) {
    const auto level = NumberOf(part);
    if (!level)
      return {{}, FormatString(_("\"%s\" is not a list of levels such as 2,4,8"), text.c_str())};
    list.numbers.push_back(*level);
  }
  return list;
}

NumberList ParseChannels(const std::string& text) {
  NumberList list;
  for (const std::string_view part : SplitAtCommas(text)) {
    const auto range = RangeOf(part);
    if (!range)
      return {{}, FormatString(_("\"%s\" is not a list of channels such as 1,3-5"), text.c_str())};
    if (range->last > kMostChannels)
      return {{}, FormatString(_("no raster has a channel %u"), range->last)};
    for (unsigned channel = range->first; channel <= range->last; ++channel)
      if (std::find(list.numbers.begin(), list.numbers.end(), channel) == list.numbers.end())
        list.numbers.push_back(channel);
  }
  return list;
}

std::string JoinNumbers(const std::vector<unsigned>& numbers) {
  std::string text;
  for (const unsigned number : numbers) {
    if (!text.empty()) text += ", ";
    text += std::to_string(number);
  }
  return text;
}

}  // namespace orin::app
