// SPDX-License-Identifier: MIT
#include "processes/overviews/diagnosis.h"

#include <memory>
#include <optional>
#include <vector>

#include "host/services/exception.h"
#include "host/services/text.h"
#include "processes/overviews/createoverviews.h"
#include "processes/overviews/opening.h"

namespace orin::overviews {

Diagnosis Diagnose(const CreateFileOverviews& job) {
  const char* file = job.fileName_.c_str();
  std::unique_ptr<datasources::IDataset> dataset;
  bool readOnly = false;
  try {
    const auto external = job.automatic_ ? std::nullopt : std::optional<bool>(job.external_);
    dataset = OpenForOverviews(job.fileName_, external, readOnly);
  } catch (const Exception& exception) {
    return {Obstacle::kCannotBeOpened, _(exception.GetMessage().c_str())};
  }
  const auto* raster = dynamic_cast<datasources::IRasterDataset*>(dataset.get());
  if (!raster || raster->GetChannelCount() == 0)
    return {Obstacle::kNoRaster, FormatString(_("%s: holds no pixels."), file)};
  std::vector<unsigned> levels;
  if (!job.GetLevelsToCompute(dataset.get(), levels) || levels.empty())
    return {Obstacle::kNoLevelNeeded,
            FormatString(_("%s: an image of %u x %u pixels needs no levels."), file,
                         raster->GetWidth(), raster->GetHeight())};
  return {Obstacle::kNone, ""};
}

}  // namespace orin::overviews
