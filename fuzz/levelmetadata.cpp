/// Fuzzes the text of the metadata tag: what is read, written again and read back is the same.
// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelmetadata.h"

#include <vector>

#include "fuzz/check.h"
#include "host/drivers/tiff/gdalmetadata.h"

namespace {

using namespace orin;
using drivers::LevelMetadata;

void CheckItems(const std::string& text) {
  const std::vector<drivers::MetadataItem> items = drivers::ParseMetadata(text);
  fuzz::Demand(drivers::ParseMetadata(drivers::ComposeMetadata(items)) == items,
               "items that are written are read back");
}

bool AreSame(const LevelMetadata& a, const LevelMetadata& b) {
  return a.method == b.method && a.level == b.level && a.sourceLevel == b.sourceLevel &&
         a.program == b.program && a.validity == b.validity;
}

/// Overwrites the validity where it is said to be, as the store does in the file.
void CheckValidityIsFlipped(std::string text, const LevelMetadata& metadata) {
  const std::string& validity = metadata.validity;
  fuzz::Demand(text.compare(metadata.validityAt, validity.size(), validity) == 0,
               "the validity stands where it was found");
  fuzz::Demand(validity.find_first_not_of("-01") == validity.npos, "a validity is known");
  for (const char now : {drivers::kInvalid, drivers::kValid}) {
    text.replace(metadata.validityAt, validity.size(), validity.size(), now);
    const LevelMetadata after = drivers::ParseLevelMetadata(text);
    fuzz::Demand(after.validity == std::string(validity.size(), now) &&
                     after.validityAt == metadata.validityAt,
                 "a validity that is changed in place reads as changed");
  }
}

void CheckLevel(const std::string& text) {
  const LevelMetadata metadata = drivers::ParseLevelMetadata(text);
  const std::string written = drivers::ComposeLevelMetadata(metadata);
  const LevelMetadata again = drivers::ParseLevelMetadata(written);
  fuzz::Demand(AreSame(metadata, again), "a level's metadata that are written are read back");
  if (!metadata.validity.empty()) {
    CheckValidityIsFlipped(text, metadata);
    CheckValidityIsFlipped(written, again);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string text(reinterpret_cast<const char*>(data), size);
  CheckItems(text);
  CheckLevel(text);
  return 0;
}
