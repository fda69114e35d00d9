// SPDX-License-Identifier: MIT
#include "host/datasources/sourceinputs.h"

#include <array>
#include <charconv>
#include <cmath>
#include <numeric>
#include <vector>

#include "host/datasources/levelstore.h"

namespace orin::datasources {
namespace {

/// One text for each number. Whole numbers keep their digits, which a double may not hold.
std::string NumberText(const model::NoData& value) {
  const std::string& decimal = value.Decimal();
  const bool isNegative = decimal.starts_with('-');
  const std::string digits = decimal.substr(isNegative ? 1 : 0);
  if (!digits.empty() && digits.find_first_not_of("0123456789") == digits.npos) {
    const size_t first = digits.find_first_not_of('0');
    return first == digits.npos ? "0" : (isNegative ? "-" : "") + digits.substr(first);
  }
  const double number = value.Number();
  if (std::isnan(number)) return "nan";
  if (number == 0) return "0";
  std::array<char, 400> text;
  constexpr double kFewestFractions = 1e15;
  const bool isWhole = std::trunc(number) == number && std::abs(number) < kFewestFractions;
  const auto end = isWhole ? std::to_chars(text.data(), text.data() + text.size(),
                                           static_cast<long long>(number))
                           : std::to_chars(text.data(), text.data() + text.size(), number);
  return {text.data(), end.ptr};
}

}  // namespace

std::string NoDataInputs(const model::SourceFacts& facts) {
  std::string inputs = facts.noData ? NumberText(*facts.noData) : "";
  for (unsigned channel = 1; channel <= facts.channels.size(); ++channel)
    if (const auto& own = facts.OfChannel(channel))
      inputs += (inputs.empty() ? "" : ",") + std::to_string(channel) + "=" + NumberText(*own);
  return inputs;
}

model::LevelInputs InputsOf(const IRasterSource& source) {
  std::vector<unsigned> channels(source.ChannelCount());
  std::iota(channels.begin(), channels.end(), 1u);
  const AuxiliaryData metadata = source.MetadataOf(channels);
  const model::SourceFacts& facts = metadata.Facts();
  model::LevelInputs inputs;
  inputs.noData = NoDataInputs(facts);
  if (const auto& first = facts.First()) inputs.noDataOrigin = model::NameOf(first->Origin());
  if (source.HasMask()) inputs.mask = "inside";
  inputs.alphaChannel = source.AlphaChannel();
  return inputs;
}

}  // namespace orin::datasources
