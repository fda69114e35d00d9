/// What the file system shows of files, without their contents being read.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace orin::model {

/// Of one file.
struct FileStamp {
  uint64_t bytes = 0;    ///< size; 0 where nothing was recorded
  int64_t modified = 0;  ///< nanoseconds since 1970

  bool IsBlank() const { return bytes == 0; }
  friend bool operator==(const FileStamp&, const FileStamp&) = default;
};

/// Of an image and of the other files that its pixels come from.
struct ImageStamp {
  uint64_t bytes = 0;       ///< size of the image's file; 0 where nothing was recorded
  int64_t modified = 0;     ///< its modification time, nanoseconds since 1970
  uint64_t companions = 0;  ///< digest of what the other files show; 0 without such files
  int64_t changed = 0;      ///< its status change time, nanoseconds since 1970
  uint64_t inode = 0;       ///< its number on its device

  bool IsBlank() const { return bytes == 0; }
  /// As a record inside the image's own file can hold it: writing a status change time changes it,
  /// and a copy of the file takes its levels along.
  ImageStamp InImage() const { return {bytes, modified, companions, 0, 0}; }
  FileStamp File() const { return {bytes, modified}; }
  friend bool operator==(const ImageStamp&, const ImageStamp&) = default;
};

/// True when an image that shows `now` is as it was when it showed `recorded`. A record without a
/// status change time and a number says nothing of them.
bool IsUnchanged(const ImageStamp& recorded, const ImageStamp& now);

/// Characters of the texts, which are fixed so that they can be overwritten in place.
inline constexpr size_t kFileStampLength = 41;
inline constexpr size_t kImageStampTextLength = 96;

/// "BYTES MODIFIED": 20 digits, a sign and 19 digits.
std::string TextOf(const FileStamp& stamp);
/// "BYTES MODIFIED COMPANIONS CHANGED INODE": as above, then 16 hexadecimal digits, a sign and 19
/// digits, 16 hexadecimal digits.
std::string ComposeImageStamp(const ImageStamp& stamp);
/// None for any other text.
std::optional<FileStamp> ParseFileStamp(std::string_view text);
std::optional<ImageStamp> ParseImageStamp(std::string_view text);

}  // namespace orin::model
