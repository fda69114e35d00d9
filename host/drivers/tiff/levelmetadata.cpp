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

/// Where the text of an item starts that is written as it is read, or npos.
size_t FindPlain(const std::string& text, const char* item, const std::string& plain) {
  const size_t name = text.find(std::string("name=\"") + item + '"');
  if (name == text.npos) return name;
  const size_t start = text.find('>', name);
  const bool isThere = start != text.npos && text.compare(start + 1, plain.size(), plain) == 0;
  return isThere ? start + 1 : text.npos;
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
  for (const MetadataItem& item : ParseMetadata(text)) {
    if (item.name == kMethod && !item.sample) metadata.method = item.text;
    if (item.name == kFactor) metadata.level = NumberIn(item.text);
    if (item.name == kSource) metadata.sourceLevel = NumberIn(item.text);
    if (item.name == kProgram) metadata.program = item.text;
    if (item.name == kValidity) metadata.validity = item.text;
    if (item.name == kImage) image = item.text;
  }
  const size_t at = FindPlain(text, kValidity, metadata.validity);
  const bool isWhole = metadata.validity.find_first_not_of("-01") == std::string::npos;
  if (at == text.npos || !isWhole) metadata.validity.clear();
  else metadata.validityAt = at;
  const size_t imageAt = FindPlain(text, kImage, image);
  if (image.size() != datasources::kImageRecordLength || imageAt == text.npos) return metadata;
  metadata.image = datasources::ParseImageRecord(image);
  metadata.imageAt = imageAt;
  return metadata;
}

}  // namespace orin::drivers
