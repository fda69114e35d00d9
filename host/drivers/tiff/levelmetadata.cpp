// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelmetadata.h"

#include <charconv>
#include <vector>

#include "host/drivers/tiff/gdalmetadata.h"

namespace orin::drivers {
namespace {

constexpr char kMethod[] = "RESAMPLING";  // the item that raster programs know
constexpr char kFactor[] = "ORIN_FACTOR";
constexpr char kSource[] = "ORIN_SOURCE_LEVEL";
constexpr char kProgram[] = "ORIN_PROGRAM";
constexpr char kValidity[] = "ORIN_VALID";
constexpr char kImage[] = "ORIN_IMAGE";

unsigned NumberIn(const std::string& text) {
  unsigned number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size() ? number : 0;
}

/// Whether an item's text stands in the tag as it is read: only then is it changed in place.
bool IsAsWritten(const std::string& tag, size_t at, const std::string& text) {
  return !text.empty() && tag.compare(at, text.size(), text) == 0;
}

}  // namespace

std::string ProgramName() { return "Orin Overviews " ORIN_VERSION; }

std::string ComposeLevelMetadata(const LevelMetadata& metadata) {
  std::vector<MetadataItem> items;
  const auto add = [&](const char* name, std::string text) {
    items.push_back(
        {.name = name, .sample = {}, .role = {}, .domain = {}, .text = std::move(text)});
  };
  if (!metadata.method.empty()) add(kMethod, metadata.method);
  add(kFactor, std::to_string(metadata.level));
  add(kSource, std::to_string(metadata.sourceLevel));
  add(kProgram, metadata.program);
  add(kValidity, metadata.validity);
  add(kImage, TextOf(metadata.image));
  return ComposeMetadata(items);
}

LevelMetadata ParseLevelMetadata(const std::string& text) {
  LevelMetadata metadata;
  std::string image;
  std::vector<size_t> textAt;
  const std::vector<MetadataItem> items = ParseMetadata(text, &textAt);
  for (size_t i = 0; i < items.size(); ++i) {
    const MetadataItem& item = items[i];
    if (item.name == kMethod && !item.sample) metadata.method = item.text;
    if (item.name == kFactor) metadata.level = NumberIn(item.text);
    if (item.name == kSource) metadata.sourceLevel = NumberIn(item.text);
    if (item.name == kProgram) metadata.program = item.text;
    if (item.name == kValidity) {
      metadata.validity = item.text;
      metadata.validityAt = textAt[i];
    }
    if (item.name == kImage) {
      image = item.text;
      metadata.imageAt = textAt[i];
    }
  }
  const bool isKnown = metadata.validity.find_first_not_of("-01") == std::string::npos;
  if (!isKnown || !IsAsWritten(text, metadata.validityAt, metadata.validity)) {
    metadata.validity.clear();
    metadata.validityAt = 0;
  }
  if (image.size() == datasources::kImageRecordLength && IsAsWritten(text, metadata.imageAt, image))
    metadata.image = datasources::ParseImageRecord(image);
  else metadata.imageAt = 0;
  return metadata;
}

}  // namespace orin::drivers
