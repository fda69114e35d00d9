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

unsigned NumberIn(const std::string& text) {
  unsigned number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size() ? number : 0;
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
  return ComposeMetadata(items);
}

LevelMetadata ParseLevelMetadata(const std::string& text) {
  LevelMetadata metadata;
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
  }
  const std::string& validity = metadata.validity;
  const bool isKnown = validity.find_first_not_of("-01") == validity.npos;
  const bool isAsWritten = text.compare(metadata.validityAt, validity.size(), validity) == 0;
  if (validity.empty() || !isKnown || !isAsWritten) {
    metadata.validity.clear();
    metadata.validityAt = 0;
  }
  return metadata;
}

}  // namespace orin::drivers
