/// What a level remembers of the image that it was computed from.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace orin::datasources {

/// What the file system tells of an image's files, without reading them.
struct ImageStamp {
  uint64_t bytes = 0;       ///< size of the image's file
  int64_t modified = 0;     ///< its modification time, nanoseconds since 1970
  uint64_t companions = 0;  ///< digest of sizes and times of the other files; 0 without such files

  friend bool operator==(const ImageStamp&, const ImageStamp&) = default;
};

struct ImageRecord {
  std::string fingerprint;  ///< of the image's stored data; empty when it is unknown
  ImageStamp stamp;         ///< of a moment when the image held that data

  bool IsBlank() const { return fingerprint.empty(); }
  friend bool operator==(const ImageRecord&, const ImageRecord&) = default;
};

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
