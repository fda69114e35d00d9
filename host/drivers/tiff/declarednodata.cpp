// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/declarednodata.h"

#include <algorithm>

#include "host/datasources/auxiliarydata.h"

namespace orin::drivers {
namespace {

using datasources::kNoDataKey;
using model::NoDataOrigin;

bool IsNumber(const std::string& text) {
  return model::NoData::Parse(text, NoDataOrigin::kItem).has_value();
}

bool DeclaresNoData(const MetadataItem& item) {
  return item.domain.empty() && item.name == kNoDataKey && IsNumber(item.text);
}

}  // namespace

NoDataOrigin DeclareNoData(std::vector<MetadataItem>& items, PixelFormat& format,
                           const AuxiliaryFile& auxiliary) {
  if (std::any_of(items.begin(), items.end(), DeclaresNoData)) return NoDataOrigin::kItem;
  std::erase_if(items, [](const MetadataItem& item) {
    return item.domain.empty() && item.name == kNoDataKey;
  });
  std::vector<std::string> texts(format.samplesPerPixel,
                                 IsNumber(format.noData) ? format.noData : "");
  NoDataOrigin origin = texts.front().empty() ? NoDataOrigin::kNowhere : NoDataOrigin::kTag;
  for (const auto& [channel, text] : auxiliary.noData) {
    if (channel > texts.size() || !IsNumber(text)) continue;
    texts[channel - 1] = text;
    origin = NoDataOrigin::kAuxFile;
  }
  const bool agree = std::all_of(texts.begin(), texts.end(),
                                 [&](const std::string& text) { return text == texts.front(); });
  if (agree && !texts.front().empty())
    items.push_back({kNoDataKey, std::nullopt, "", "", texts.front()});
  for (unsigned sample = 0; sample < texts.size() && !agree; ++sample)
    if (!texts[sample].empty()) items.push_back({kNoDataKey, sample, "", "", texts[sample]});
  format.noDataIsBeside = origin == NoDataOrigin::kAuxFile;
  if (format.noDataIsBeside) format.noData = texts.front();
  return origin;
}

}  // namespace orin::drivers
