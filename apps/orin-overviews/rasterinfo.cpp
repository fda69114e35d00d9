// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/rasterinfo.h"

#include <algorithm>
#include <iterator>
#include <memory>
#include <vector>

#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/datasources/levelstore.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

/// Adds the levels that stand in both places a second time, each in front of the one that counts.
void AddHidden(const datasources::ILevelStore& store,
               std::vector<datasources::LevelDescription>& levels) {
  std::vector<datasources::LevelDescription> hidden = store.ListHidden();
  levels.insert(levels.begin(), std::make_move_iterator(hidden.begin()),
                std::make_move_iterator(hidden.end()));
  std::stable_sort(levels.begin(), levels.end(),
                   [](const auto& a, const auto& b) { return a.level < b.level; });
}

}  // namespace

RasterInfo CollectInfo(const std::string& file, bool keepsAnswers) {
  const auto site =
      datasources::DatasetManager::GetInstance()->OpenSite(file, datasources::kReadOnly);
  // The generic layer lists the levels inside the file and those beside it together.
  const auto raster = site->DatasetFor(datasources::LevelPlace::kSideCar);
  if (raster->GetChannelCount() == 0)
    throw Exception(FormatString(_("%s: holds no raster."), file.c_str()),
                    "apps/orin-overviews/rasterinfo", "orin::app::CollectInfo(const std::string&)",
                    0);
  RasterInfo info;
  info.file = file;
  if (const ZMBInfo_s* format = ZMBGetFormatInfo(raster->GetFileFormatCode())) {
    info.formatName = format->name;
    info.formatDescription = format->description;
  }
  info.width = raster->GetWidth();
  info.height = raster->GetHeight();
  for (unsigned channel = 1; channel <= raster->GetChannelCount(); ++channel)
    info.channels.push_back(
        std::unique_ptr<datasources::IChannelInfo>(raster->GetChannelInfo(channel))->GetDataType());
  info.hasMask = raster->GetSource()->HasMask();
  info.alphaChannel = raster->GetSource()->AlphaChannel();
  info.isCloudOptimized = raster->GetSource()->IsCloudOptimized();
  const std::unique_ptr<datasources::IOverviewInfo> levels(raster->GetOverviewInfo());
  auto* store = raster->GetSource()->Levels();
  if (store && keepsAnswers) store->KeepAnswers();
  if (levels) info.levels = levels->Describe();
  if (store) AddHidden(*store, info.levels);
  info.leftOver = site->FindLeftOver();
  return info;
}

std::string TypeName(const gobs::DataType& type) {
  if (type.bits == 1) return "bit";
  const std::string kind = type.isFloat ? "float" : type.isSigned ? "int" : "uint";
  return (type.isComplex ? "complex " : "") + kind + std::to_string(type.bits);
}

}  // namespace orin::app
