// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelmetadata.h"

#include <algorithm>
#include <iterator>
#include <vector>

#include "host/drivers/tiff/gdalmetadata.h"

namespace orin::drivers {
namespace {

/// An item that changes in place, where its position is kept, and its length; 0 for any.
struct InPlace {
  const char* name;
  uint64_t LevelMetadata::*at;
  size_t length;
};

constexpr InPlace kInPlace[] = {
    {model::kValidityItem, &LevelMetadata::validityAt, 0},
    {model::kImageItem, &LevelMetadata::imageAt, model::kImageTextLength},
    {model::kContentItem, &LevelMetadata::contentAt, model::kContentTextLength}};

}  // namespace

std::string ProgramName() { return "Orin Overviews " ORIN_VERSION; }

std::string ComposeLevelMetadata(const model::LevelRecord& record) {
  std::vector<MetadataItem> items;
  for (auto& [name, text] : model::ComposeRecord(record))
    items.push_back(
        {.name = name, .sample = {}, .role = {}, .domain = {}, .text = std::move(text)});
  return ComposeMetadata(items);
}

LevelMetadata ParseLevelMetadata(const std::string& text) {
  std::vector<size_t> textAt;
  const std::vector<MetadataItem> items = ParseMetadata(text, &textAt);
  std::vector<model::RecordItem> known;
  LevelMetadata metadata;
  for (size_t i = 0; i < items.size(); ++i) {
    const MetadataItem& item = items[i];
    if (item.sample) continue;
    const auto inPlace =
        std::find_if(std::begin(kInPlace), std::end(kInPlace),
                     [&](const InPlace& entry) { return item.name == entry.name; });
    if (inPlace == std::end(kInPlace)) {
      known.emplace_back(item.name, item.text);
      continue;
    }
    const bool isAsWritten =
        !item.text.empty() && text.compare(textAt[i], item.text.size(), item.text) == 0;
    const bool fits = inPlace->length == 0 || inPlace->length == item.text.size();
    metadata.*inPlace->at = isAsWritten && fits ? textAt[i] : 0;
    if (isAsWritten) known.emplace_back(item.name, item.text);
  }
  static_cast<model::LevelRecord&>(metadata) = model::ParseRecord(known);
  if (metadata.validity.empty()) metadata.validityAt = 0;
  return metadata;
}

}  // namespace orin::drivers
