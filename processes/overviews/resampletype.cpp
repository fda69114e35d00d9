// SPDX-License-Identifier: MIT
#include "processes/overviews/resampletype.h"

#include <algorithm>
#include <iterator>
#include <string_view>

#include "host/services/preferences.h"

namespace {

using orin::model::kMethods;
using orin::model::Method;

/// ASCII only, so that no locale changes what a name means.
char UpperCase(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; }
char LowerCase(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

bool StartsLike(std::string_view name, std::string_view prefix) {
  return !prefix.empty() && name.size() >= prefix.size() &&
         std::equal(prefix.begin(), prefix.end(), name.begin(),
                    [](char expected, char given) { return expected == UpperCase(given); });
}

}  // namespace

QRTOverviewResampleType GetPyramidType(std::string name) {
  for (const Method& method : kMethods)
    for (const std::string_view prefix : method.prefixes)
      if (StartsLike(name, prefix)) return method.type;
  return ResampleInvalid;
}

QRTOverviewResampleType GetDefaultPyramidType() {
  const PreferenceRegistry* registry = PreferenceRegistry::Get();
  const auto* preference = registry ? registry->Find<RasterLayerPreference>("") : nullptr;
  if (!preference) return ResampleNearest;
  switch (preference->GetOverviewGenerationMethod()) {
    case 1:
      return ResampleAverage;
    case 2:
      return ResampleMode;
    default:
      return ResampleNearest;  // deliberate: bilinear and bicubic are never a preference
  }
}

std::string PyramidTypeNames() {
  std::string names;
  for (const Method& method : kMethods) {
    if (!names.empty()) names += ", ";
    std::transform(method.name.begin(), method.name.end(), std::back_inserter(names), LowerCase);
  }
  return names;
}
