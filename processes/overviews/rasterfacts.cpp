// SPDX-License-Identifier: MIT
#include "processes/overviews/rasterfacts.h"

#include <memory>

#include "host/services/exception.h"
#include "host/services/text.h"
#include "processes/overviews/statusqueries.h"

namespace orin::overviews {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;

PlaceFacts FactsIn(datasources::LevelSite& site, LevelPlace place,
                   const datasources::LevelOptions& storing) {
  datasources::ILevelStore* store = site.LevelsIn(place);
  if (!store) return {};
  store->SetOptions(storing);
  return {store->List(), store->StoredOtherwise()};
}

}  // namespace

RasterFacts FactsOf(datasources::LevelSite& site, const datasources::LevelOptions& storing) {
  datasources::IRasterSource& image = site.Image();
  if (image.ChannelCount() == 0)
    throw Exception(FormatString(_("%s: holds no raster."), site.File().c_str()),
                    "processes/overviews/rasterfacts", "orin::overviews::FactsOf", 0);
  const auto dataset = site.DatasetFor(LevelPlace::kInternal);
  RasterFacts facts;
  facts.width = image.Width();
  facts.height = image.Height();
  for (unsigned channel = 1; channel <= image.ChannelCount(); ++channel)
    facts.channels.push_back(image.TypeOf(channel));
  facts.isTiff = site.Format().name.find("TIFF") != std::string::npos;
  facts.isCloudOptimized = image.IsCloudOptimized();
  facts.isCategorical = image.HoldsClasses();
  facts.isWritable = dataset->GetAccessMode() == datasources::kUpdate;
  // A file that is refused for update may show no levels inside; its refusal says why.
  facts.holdsLevels =
      SupportsInternalOverviews(dataset.get()) && (image.Levels() || !facts.isWritable);
  facts.inside = FactsIn(site, LevelPlace::kInternal, storing);
  facts.beside = FactsIn(site, LevelPlace::kSideCar, storing);
  facts.leftOver = site.FindLeftOver();
  return facts;
}

std::vector<LevelDescription> LevelsIn(datasources::LevelSite& site, LevelPlace place) {
  const datasources::ILevelStore* store = site.LevelsIn(place);
  return store ? store->List() : std::vector<LevelDescription>();
}

}  // namespace orin::overviews
