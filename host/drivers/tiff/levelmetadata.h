/// What a level's metadata tag says of it: how it was made, and which channels are up to date.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "host/datasources/imagerecord.h"

namespace orin::drivers {

inline constexpr char kAbsent = '-';   ///< the channel was not created
inline constexpr char kInvalid = '0';  ///< created, not up to date
inline constexpr char kValid = '1';

struct LevelMetadata {
  std::string method;        ///< "NEAREST" ...; may be empty
  unsigned level = 0;        ///< decimation factor; 0 when the tag does not say
  unsigned sourceLevel = 0;  ///< 1 for full resolution; 0 unknown
  std::string program;
  std::string validity;  ///< one character a channel; empty when the tag has none
  uint64_t validityAt =
      0;  ///< of its first character in the tag's text: changed in place, never moved
  datasources::ImageRecord image = {};  ///< that the level was computed from
  uint64_t imageAt = 0;                 ///< as validityAt; 0 when the tag has no such item
};

/// The name and version that levels are signed with.
std::string ProgramName();

/// The tag's text.
std::string ComposeLevelMetadata(const LevelMetadata& metadata);

/// What can be understood of a tag's text, also of another program's.
LevelMetadata ParseLevelMetadata(const std::string& text);

}  // namespace orin::drivers
