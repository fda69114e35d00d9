/// The first version of the texts that levels keep of their image.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "host/model/levelrecord.h"

namespace orin::datasources {

using model::ImageRecord;
using model::ImageStamp;

/// Characters of a record's text, and of its part for the stamp, which ends it. Both are fixed, so
/// that they can be overwritten in place.
inline constexpr size_t kImageRecordLength = 91;
inline constexpr size_t kImageStampLength = 58;

/// "FINGERPRINT SIZE TIME COMPANIONS", or dashes for a blank record; plain ASCII.
std::string TextOf(const ImageRecord& record);
/// "SIZE TIME COMPANIONS"
std::string TextOf(const ImageStamp& stamp);
/// The record of such a text; a blank one for any other text.
ImageRecord ParseImageRecord(const std::string& text);

}  // namespace orin::datasources
