/// Digests of what levels store, and which of them are known without being read.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <utility>

#include "host/drivers/tiff/leveldirectories.h"

namespace orin::drivers {

/// Digest of the sizes of a level's tiles and of the tags that give them meaning, its mask's
/// included. Where they stand does not count: levels move. Empty when it cannot be read.
std::string TableDigestOf(const PositionedFile& file, const TiffStructure& structure,
                          const StoredLevel& level);

/// Digest of all that the level stores, read from the file: equal ones give equal pixels. A text
/// that is no digest when it cannot be read.
std::string BytesDigestOf(const PositionedFile& file, const TiffStructure& structure,
                          const StoredLevel& level);

/// What levels store, at a moment that the stamp of their file tells. A level is known by what its
/// record says of it: its directory moves when space is reclaimed.
class LevelContents {
 public:
  /// The digest of its bytes. Empty when it is not known.
  std::string KnownBytes(const StoredLevel& level, const model::FileStamp& holder) const;
  void Learn(const StoredLevel& level, const model::FileStamp& holder, const std::string& bytes);
  /// Whether it is known to store what its record says.
  bool IsWhole(const StoredLevel& level, const model::FileStamp& holder) const;
  /// This program changed the file, and none of the levels that were known before.
  void Carry(const model::FileStamp& before, const model::FileStamp& now);

 private:
  using Key = std::pair<unsigned, std::string>;  ///< level, recorded digest
  static Key KeyOf(const StoredLevel& level) { return {level.level, level.metadata.content.bytes}; }

  std::map<Key, std::pair<model::FileStamp, std::string>> known_;
};

}  // namespace orin::drivers
