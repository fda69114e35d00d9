// SPDX-License-Identifier: MIT
#include "processes/overviews/resampletype.h"

#include <algorithm>
#include <string_view>

#include "host/services/preferences.h"

namespace {

struct Name {
  std::string_view prefix;
  QRTOverviewResampleType type;
};

constexpr Name kNames[] = {
    {"NEAR", ResampleNearest},  {"AVER", ResampleAverage}, {"MODE", ResampleMode},
    {"BILI", ResampleBilinear}, {"BICU", ResampleBicubic}, {"CUBIC", ResampleBicubic},
};

/// ASCII only, so that no locale changes what a name means.
char UpperCase(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; }

bool StartsLike(std::string_view name, std::string_view prefix) {
  return name.size() >= prefix.size() &&
         std::equal(prefix.begin(), prefix.end(), name.begin(),
                    [](char expected, char given) { return expected == UpperCase(given); });
}

}  // namespace

QRTOverviewResampleType GetPyramidType(std::string name) {
  for (const Name& known : kNames)
    if (StartsLike(name, known.prefix)) return known.type;
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
