// SPDX-License-Identifier: MIT
#include "processes/overviews/levelpass.h"

#include <locale>
#include <memory>
#include <sstream>

#include "basic/gobs/cancelled.h"
#include "host/datasources/basicreader.h"
#include "host/datasources/nodatamask.h"
#include "host/datasources/overviewaccessors.h"
#include "processes/qrtfilters/resamplers/parallelio/filteriodriver.h"

namespace orin::overviews {
namespace {

using datasources::AuxiliaryData;
using datasources::BasicOverviewWriterAccessor;
using datasources::BasicReader;
using datasources::IRasterReader;
using datasources::IRasterWriter;
using datasources::kNoDataKey;

constexpr uint32_t kMemoryBudget = 67108864;  // bytes

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
    builder = std::make_unique<gobs::MaskDecisionBuilder>(decision.get());
    value = ParseNoData(text);
  }

  std::string text;
  std::unique_ptr<gobs::IMaskDecision> decision;
  std::unique_ptr<gobs::MaskDecisionBuilder> builder;  ///< null: no mask
  double value = 0.0;
};

/// The largest level below `level` that may be its source, 1 for full resolution.
unsigned SourceLevelOf(const PassRequest& request, const std::vector<unsigned>& present) {
  unsigned source = 1;
  for (const unsigned candidate : present) {
    if (candidate >= request.level) break;
    if (!request.onlyFromDivisors || request.level % candidate == 0) source = candidate;
  }
  return source;
}

void Configure(parallelio::LevelDriver& driver, const PassRequest& request, double scale,
               const PassReports& reports) {
  using Processing = resamplers::ResamplerManager;
  using Access = parallelio::ResamplerAccessPolicy;
  driver.factory = request.factory;
  driver.Processing::xRatio = driver.Processing::yRatio = scale;
  driver.Access::xRatio = driver.Access::yRatio = scale;
  driver.SetRange(reports.start, reports.end);
  driver.SetEnabled(true);
  driver.callback = reports.callback;
  driver.userData = reports.userData;
  driver.memoryBudget = kMemoryBudget;
}

PassResult Build(const PassRequest& request, const PassReports& reports) {
  BasicReader fullResolution(request.raster, request.channels, false);
  NoData noData(fullResolution);
  BasicOverviewWriterAccessor accessor(request.raster, request.channels);
  accessor.SetResamplingName(request.methodName);
  accessor.CreateLevel(request.level);
  std::unique_ptr<IRasterReader> source;
  const std::unique_ptr<IRasterWriter> target(accessor.CreateRasterWriter(request.level));
  PassResult result;
  result.sourceLevel = SourceLevelOf(request, accessor.GetLevels());
  if (result.sourceLevel == 1)
    source = std::make_unique<BasicReader>(request.raster, request.channels, false);
  else source.reset(accessor.CreateRasterWriter(result.sourceLevel));
  const unsigned margin = request.factory ? request.factory->GetMargin() : 0;
  source->SetMargin(margin, margin, datasources::kMarginRepeatEdge);

  parallelio::LevelDriver driver;
  Configure(driver, request, double(result.sourceLevel) / request.level, reports);
  driver.maskBuilder = noData.builder.get();
  driver.noDataValue = noData.value;
  driver.complex = fullResolution.GetDataType().isComplex;
  driver.Process(source.get(), target.get());
  result.isCancelled = driver.IsCancelled();
  if (!driver.HasWrittenAll()) return result;
  if (request.marksWholeLevel) accessor.SetLevelValid(request.level, true);
  else accessor.SetValid(1, request.level, true);
  result.isComplete = true;
  return result;
}

}  // namespace

PassResult BuildPass(const PassRequest& request, const PassReports& reports) {
  try {
    return Build(request, reports);
  } catch (const Cancelled&) {  // by the host, before the first block
    return {.isComplete = false, .isCancelled = true};
  }
}

}  // namespace orin::overviews
