// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/declarednodata.h"

#include <algorithm>

#include "host/datasources/auxiliarydata.h"
#include "host/datasources/nodatavalue.h"

namespace orin::drivers {
namespace {

using datasources::kNoDataKey;

bool IsNoData(const MetadataItem& item) { return item.domain.empty() && item.name == kNoDataKey; }

std::string NumberOrNone(const std::string& text) {
  return datasources::ParseNoData(text) ? text : "";
}

}  // namespace

std::string DeclareNoData(std::vector<MetadataItem>& items, PixelFormat& format,
                          const AuxiliaryFile& auxiliary) {
  if (std::any_of(items.begin(), items.end(), IsNoData)) return "item";
  std::vector<std::string> texts(format.samplesPerPixel, NumberOrNone(format.noData));
  std::string origin = texts.front().empty() ? "" : "tag";
  for (const auto& [channel, text] : auxiliary.noData) {
    if (channel > texts.size() || NumberOrNone(text).empty()) continue;
    texts[channel - 1] = text;
    origin = "aux.xml";
  }
  const bool agree = std::all_of(texts.begin(), texts.end(),
                                 [&](const std::string& text) { return text == texts.front(); });
  if (agree && !texts.front().empty())
    items.push_back({kNoDataKey, std::nullopt, "", "", texts.front()});
  for (unsigned sample = 0; sample < texts.size() && !agree; ++sample)
    if (!texts[sample].empty()) items.push_back({kNoDataKey, sample, "", "", texts[sample]});
  format.noDataIsBeside = origin == "aux.xml";
  if (format.noDataIsBeside) format.noData = texts.front();
  return origin;
}

}  // namespace orin::drivers
