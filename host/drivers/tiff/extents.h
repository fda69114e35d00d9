/// A set of byte ranges of a file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <optional>

namespace orin::drivers {

/// Positions in bytes: `start` is the first byte, `end` the one behind the last.
struct Extent {
  uint64_t start = 0;
  uint64_t end = 0;

  friend bool operator==(const Extent&, const Extent&) = default;
};

/// Extents that touch or overlap are one.
class ExtentSet {
 public:
  void Add(Extent extent);
  void Remove(Extent extent);
  void Remove(const ExtentSet& others);
  bool IsEmpty() const { return extents_.empty(); }
  /// True when every byte of `extent` is in the set.
  bool Holds(Extent extent) const;
  /// The position behind the last byte; 0 for an empty set.
  uint64_t End() const { return extents_.empty() ? 0 : extents_.rbegin()->second; }
  /// \pre not IsEmpty()
  Extent First() const { return {extents_.begin()->first, extents_.begin()->second}; }
  /// \pre not IsEmpty()
  Extent Last() const { return {extents_.rbegin()->first, extents_.rbegin()->second}; }
  /// Bytes.
  uint64_t Size() const;

  /// Removes `bytes` bytes from the set, which lie together and start at an even position: as near
  /// behind those taken before as there is room. \returns their position; none: there is no room
  std::optional<uint64_t> Take(uint64_t bytes);
  /// The same from the shortest extent that has room, the first one of these.
  std::optional<uint64_t> TakeFromShortest(uint64_t bytes);

  /// Ascending, from start to end.
  std::map<uint64_t, uint64_t>::const_iterator begin() const { return extents_.begin(); }
  std::map<uint64_t, uint64_t>::const_iterator end() const { return extents_.end(); }

 private:
  using Iterator = std::map<uint64_t, uint64_t>::iterator;

  std::optional<uint64_t> TakeFrom(Iterator at, uint64_t bytes);

  std::map<uint64_t, uint64_t> extents_;  // start to end
  uint64_t next_ = 0;                     // where the search for room begins
  uint64_t tooLarge_ = UINT64_MAX;        // for so many bytes no room was found
};

}  // namespace orin::drivers
