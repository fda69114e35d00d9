// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/pagerecord.h"

#include <charconv>
#include <vector>

#include "host/drivers/tiff/gdalmetadata.h"
#include "host/drivers/tiff/pixelformat.h"

namespace orin::drivers {
namespace {

constexpr char kPage[] = "ORIN_PAGE";

}  // namespace

std::string WithPage(std::string text, unsigned page) {
  std::vector<MetadataItem> items = ParseMetadata(text);
  items.push_back(
      {.name = kPage, .sample = {}, .role = {}, .domain = {}, .text = std::to_string(page)});
  return ComposeMetadata(items);
}

std::optional<unsigned> PageNamedIn(const PositionedFile& file, const TiffStructure& structure,
                                    const TiffDirectory& directory) {
  constexpr uint64_t kMaxBytes = 1 << 20;  // ours takes a few hundred
  const TiffEntry* entry = directory.Find(TIFFTAG_GDAL_METADATA);
  if (!entry || entry->bytes > kMaxBytes) return std::nullopt;
  const std::vector<uint8_t> bytes = ReadBytes(file, structure, *entry);
  for (const MetadataItem& item : ParseMetadata(std::string(bytes.begin(), bytes.end()))) {
    if (item.name != kPage || item.sample) continue;
    unsigned page = 0;
    const char* end = item.text.data() + item.text.size();
    const auto read = std::from_chars(item.text.data(), end, page);
    if (read.ec == std::errc() && read.ptr == end) return page;
  }
  return std::nullopt;
}

}  // namespace orin::drivers
