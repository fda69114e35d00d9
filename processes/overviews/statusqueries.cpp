// SPDX-License-Identifier: MIT
#include "processes/overviews/statusqueries.h"

#include <algorithm>
#include <limits>
#include <numeric>

#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/datasources/overviewaccessors.h"
#include "host/datasources/pyramidlevels.h"
#include "host/services/autoptr.h"
#include "processes/overviews/levelplanning.h"

namespace {

using orin::HAutoPtr;
using orin::datasources::BasicOverviewReaderAccessor;
using orin::datasources::IDataset;
using orin::datasources::IRasterDataset;

using DatasetHolder = HAutoPtr<IDataset>;

DatasetHolder OpenGenerically(const std::string& file) {
  return DatasetHolder(orin::datasources::DatasetManager::GetInstance()->OpenFormat(
      "ZMBALL", file, orin::datasources::kReadOnly));
}

/// 0 without levels; the largest unsigned value when none of them is valid.
unsigned SmallestValidLevel(IRasterDataset* raster, const std::vector<unsigned>& channels) {
  const BasicOverviewReaderAccessor accessor(raster, channels);
  const std::vector<unsigned> levels = accessor.GetLevels();
  if (levels.empty()) return 0;
  unsigned smallest = std::numeric_limits<unsigned>::max();
  for (const unsigned level : levels)
    if (level < smallest && accessor.IsLevelValid(level)) smallest = level;
  return smallest;
}

bool HasEnough(IRasterDataset* raster, const std::vector<unsigned>& channels, int factor) {
  const HAutoPtr<orin::datasources::IFormatDescriptor> notConsulted(raster->GetFormatDescriptor());
  unsigned step = SmallestValidLevel(raster, channels);
  if (step < 2) step = orin::overviews::PyramidFactorOrDefault(factor);
  const orin::datasources::BasicReader reader(raster, {1}, false);
  const size_t expected =
      ComputePyramidLevel(double(reader.GetWidth()), double(reader.GetHeight()), step).size();
  return std::none_of(channels.begin(), channels.end(), [&](unsigned channel) {
    return expected > BasicOverviewReaderAccessor(raster, {channel}).GetLevels().size();
  });
}

}  // namespace

bool HasEnoughOverviews(std::string file, int factor) {
  const DatasetHolder dataset = OpenGenerically(file);
  auto* raster = dynamic_cast<IRasterDataset*>(dataset.get());
  if (!raster) return false;
  std::vector<unsigned> channels(raster->GetChannelCount());
  std::iota(channels.begin(), channels.end(), 1u);
  return HasEnough(raster, channels, factor);
}

bool HasEnoughOverviews(std::string file, const std::vector<unsigned int>& channels, int factor) {
  const DatasetHolder dataset = OpenGenerically(file);
  auto* raster = dynamic_cast<IRasterDataset*>(dataset.get());
  return raster && HasEnough(raster, channels, factor);
}

bool HasEnoughOverviews(std::vector<std::string> files, int factor) {
  return std::all_of(files.begin(), files.end(), [factor](const std::string& file) {
    return HasEnoughOverviews(file, factor);
  });
}

bool HasNativeOverviews(std::string file) {
  const ZMBFormatType code = ZMBTestOpen(file.c_str());
  if (code == kFormatUnknown) return false;
  const ZMBInfo_s* info = ZMBGetFormatInfo(code);
  return info && info->nativeOverviews != 0;
}

bool SupportsInternalOverviews(IDataset* dataset) {
  if (!dataset) return false;
  const HAutoPtr<orin::datasources::IFormatDescriptor> format(dataset->GetFormatDescriptor());
  const std::string name = format->GetName();
  if (name == "TESSRA" || name == "TIFF" || name == "ZMBERDAS") return true;
  if (name != "ZMBALL") return false;
  const ZMBFormatType code = ZMBTestOpen(dataset->GetFileName().c_str());
  return code == kFormatMemory || code == kFormatTiff || code == kFormatErdas;
}
