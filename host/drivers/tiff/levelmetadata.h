/// The record of a level in the metadata tag of its directory.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

#include "host/model/levelrecord.h"

namespace orin::drivers {

using model::kAbsent;
using model::kInvalid;
using model::kValid;

/// With the places in the tag's text of the items that are changed there, never moved; 0 where the
/// tag has no such item, or where its text is not written as it is read.
struct LevelMetadata : model::LevelRecord {
  uint64_t validityAt = 0;
  uint64_t imageAt = 0;
  uint64_t contentAt = 0;
};

/// The name and version that levels are signed with.
std::string ProgramName();

/// The tag's text.
std::string ComposeLevelMetadata(const model::LevelRecord& record);

/// What can be understood of a tag's text, also of another program's. What cannot be changed in
/// place counts as not there.
LevelMetadata ParseLevelMetadata(const std::string& text);

}  // namespace orin::drivers
