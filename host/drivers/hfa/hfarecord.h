/// What is recorded of a level in an ERDAS Imagine file: how it was made, and which channels are up
/// to date.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

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

/// A level some of whose channels are finished and wait in the file for the others: no tree leads
/// to them, so that other programs do not see half a level.
struct HfaPendingLevel {
  HfaRecord record;  ///< kHfaAbsent for the channels that do not wait
  /// One a channel: where the node stands that becomes its level; 0 for those that do not wait.
  std::vector<uint32_t> parts;
};

/// Name of the metadata item of the file that holds the record of `level`.
std::string HfaRecordKey(unsigned level);
/// The item's text, which ParseHfaRecord reads back. It ends with the stamp of `image`, and all
/// texts of one program for one number of channels have one length, but for levels beyond 99999.
std::string ComposeHfaRecord(const HfaRecord& record);
/// \param channels  of the image
/// \returns nothing for a text that is no record of that many channels
std::optional<HfaRecord> ParseHfaRecord(const std::string& text, size_t channels);

/// Name of the item that tells of channels of `level` which wait for the others.
std::string HfaPendingKey(unsigned level);
/// The item's text: eight hexadecimal digits a channel, and the text of the record, whose lengths
/// are fixed.
std::string ComposeHfaPending(const HfaPendingLevel& pending);
/// \returns nothing for a text that is none of that many channels
std::optional<HfaPendingLevel> ParseHfaPending(const std::string& text, size_t channels);

/// True when both tell of pixels that were computed in the same way from the same image.
bool AreAlike(const HfaRecord& one, const HfaRecord& other);

/// The name and version that levels are signed with.
std::string HfaProgramName();

}  // namespace orin::drivers
