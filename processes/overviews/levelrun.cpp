// SPDX-License-Identifier: MIT
#include "processes/overviews/levelrun.h"

#include <locale>
#include <memory>
#include <sstream>

#include "host/datasources/basicreader.h"
#include "host/datasources/nodatamask.h"
#include "host/datasources/overviewaccessors.h"
#include "host/services/counter.h"
#include "host/services/text.h"

namespace {

using orin::datasources::AuxiliaryData;
using orin::datasources::BasicOverviewWriterAccessor;
using orin::datasources::BasicReader;
using orin::datasources::IRasterReader;
using orin::datasources::IRasterWriter;
using orin::datasources::kNoDataKey;

constexpr uint32_t kMemoryBudget = 67108864;  // bytes

/// Work for a level, relative to the others.
double CostOf(unsigned level) { return (1.0 / level) / level; }

std::string NoDataTextOf(const AuxiliaryData& metadata) {
  const std::string text = metadata.GetFileMetadataValue(kNoDataKey);
  return text.empty() ? metadata.GetChanMetadataValue(kNoDataKey, 1) : text;
}

/// 0 when the text is no number.
double ParseNoData(const std::string& text) {
  std::istringstream stream(text);
  stream.imbue(std::locale::classic());
  double value = 0.0;
  stream >> value;
  return value;
}

/// What a pass does about pixels without data.
struct NoData {
  explicit NoData(IRasterReader& reader)
      : text(NoDataTextOf(reader.GetAuxiliaryData())), decision(GetFileMetadataSrcMask(&reader)) {
    if (!decision || text.empty()) return;
    builder = std::make_unique<orin::gobs::MaskDecisionBuilder>(decision.get());
    value = ParseNoData(text);
  }

  std::string text;
  std::unique_ptr<orin::gobs::IMaskDecision> decision;
  std::unique_ptr<orin::gobs::MaskDecisionBuilder> builder;  ///< null: no mask
  double value = 0.0;
};

}  // namespace

LevelRun::LevelRun(const LevelRequest& request) : request_(request) {
  for (const unsigned level : request_.levels) totalCost_ += CostOf(level);
}

bool LevelRun::Build() {
  for (const unsigned level : request_.levels) {
    const bool empty =
        request_.raster->GetWidth() / level == 0 || request_.raster->GetHeight() / level == 0;
    if (!empty && !BuildLevel(level)) return false;
  }
  return true;
}

bool LevelRun::BuildLevel(unsigned level) {
  if (request_.showProgress)
    orin::tarn::Counter::Update(static_cast<float>(done_),
                                MkString(_("Generating overview level: %d"), int(level)), nullptr);
  const double share = CostOf(level) / totalCost_;
  const auto step = static_cast<float>(share / double(request_.channels.size()));
  Range range{static_cast<float>(done_), static_cast<float>(done_) + step};
  done_ += share;
  if (request_.isTiff) {
    range.end = 1.0f;  // deliberate: a pass over all channels reports up to completion
    return request_.channels.empty() || BuildPass(level, request_.channels, range);
  }
  for (const unsigned channel : request_.channels) {
    if (!BuildPass(level, {channel}, range)) return false;
    range.start += step;
    range.end += step;
  }
  return true;
}

bool LevelRun::BuildPass(unsigned level, const std::vector<unsigned>& channels,
                         const Range& range) {
  BasicReader fullResolution(request_.raster, channels, false);
  NoData noData(fullResolution);
  BasicOverviewWriterAccessor accessor(request_.raster, channels);
  accessor.SetResamplingName(request_.methodName);
  accessor.CreateLevel(level);
  std::unique_ptr<IRasterReader> source;
  const std::unique_ptr<IRasterWriter> target(accessor.CreateRasterWriter(level));
  const unsigned sourceLevel = SourceLevelOf(level, accessor.GetLevels());
  if (sourceLevel == 1) source = std::make_unique<BasicReader>(request_.raster, channels, false);
  else source.reset(accessor.CreateRasterWriter(sourceLevel));
  const unsigned margin = request_.factory ? request_.factory->GetMargin() : 0;
  source->SetMargin(margin, margin, orin::datasources::kMarginRepeatEdge);

  orin::parallelio::LevelDriver driver;
  Configure(driver, double(sourceLevel) / level, range);
  driver.maskBuilder = noData.builder.get();
  driver.noDataValue = noData.value;
  driver.complex = fullResolution.GetDataType().isComplex;
  driver.Process(source.get(), target.get());
  if (!driver.HasWrittenAll()) return false;
  if (request_.isTiff) accessor.SetLevelValid(level, true);
  else accessor.SetValid(1, level, true);
  return !driver.IsCancelled();
}

/// The largest level below `level` that may be its source, 1 for full resolution.
unsigned LevelRun::SourceLevelOf(unsigned level, const std::vector<unsigned>& present) const {
  unsigned source = 1;
  for (const unsigned candidate : present) {
    if (candidate >= level) break;
    if (!request_.onlyFromDivisors || level % candidate == 0) source = candidate;
  }
  return source;
}

void LevelRun::Configure(orin::parallelio::LevelDriver& driver, double scale,
                         const Range& range) const {
  using Processing = orin::resamplers::ResamplerManager;
  using Access = orin::parallelio::ResamplerAccessPolicy;
  driver.factory = request_.factory;
  driver.Processing::xRatio = driver.Processing::yRatio = scale;
  driver.Access::xRatio = driver.Access::yRatio = scale;
  driver.SetRange(range.start, range.end);
  driver.SetEnabled(true);
  driver.memoryBudget = kMemoryBudget;
}
