// SPDX-License-Identifier: MIT
#include "processes/overviews/levelplanning.h"

#include "host/datasources/dataset.h"
#include "host/datasources/pyramidlevels.h"
#include "host/services/preferences.h"
#include "processes/overviews/createoverviews.h"

namespace {

constexpr unsigned kDefaultFactor = 2;

bool IsPyramidFactor(long long factor) { return factor == 2 || factor == 3; }

}  // namespace

unsigned int GetDefaultDecimationLevels() {
  const PreferenceRegistry* registry = PreferenceRegistry::Get();
  const auto* preference = registry ? registry->Find<RasterLayerPreference>("") : nullptr;
  if (!preference) return kDefaultFactor;
  const int factor = preference->GetDecimationLevels();
  return IsPyramidFactor(factor) ? static_cast<unsigned>(factor) : kDefaultFactor;
}

unsigned int orin::overviews::PyramidFactorOrDefault(long long factor) {
  return IsPyramidFactor(factor) ? static_cast<unsigned>(factor) : GetDefaultDecimationLevels();
}

bool CreateFileOverviews::GetLevelsToCompute(orin::datasources::IDataset* dataset,
                                             std::vector<unsigned int>& levels) const {
  levels.clear();
  const auto* raster = dynamic_cast<orin::datasources::IRasterDataset*>(dataset);
  if (!raster) return false;
  if (levels_.empty())
    levels = ComputePyramidLevel(double(raster->GetWidth()), double(raster->GetHeight()),
                                 orin::overviews::PyramidFactorOrDefault(factor_));
  else levels = levels_;  // as given: not sorted, repeated ones stay
  return true;
}
