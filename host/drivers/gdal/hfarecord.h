/// What is recorded of a level in an ERDAS Imagine file: how it was made, and which channels are up
/// to date.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>

#include "host/datasources/imagerecord.h"

namespace orin::drivers {

inline constexpr char kHfaAbsent = '-';   ///< the channel's level is not ours
inline constexpr char kHfaInvalid = '0';  ///< not up to date
inline constexpr char kHfaValid = '1';

struct HfaRecord {
  std::string method;        ///< "NEAREST" ...
  unsigned sourceLevel = 0;  ///< 1 for full resolution; 0 unknown
  std::string program;
  std::string validity;                 ///< one character a channel
  datasources::ImageRecord image = {};  ///< that it was computed from; blank when unknown
};

/// Name of the metadata item of the file that holds the record of `level`.
std::string HfaRecordKey(unsigned level);
/// The item's text, which ParseHfaRecord reads back. It ends with the stamp of `image`, and all
/// texts of one program for one number of channels have one length, but for levels beyond 99999.
std::string ComposeHfaRecord(const HfaRecord& record);
/// \param channels  of the image
/// \returns nothing for a text that is no record of that many channels
std::optional<HfaRecord> ParseHfaRecord(const std::string& text, size_t channels);

/// The name and version that levels are signed with.
std::string HfaProgramName();

}  // namespace orin::drivers
