/// A set of byte ranges of a file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <optional>

namespace orin::drivers {

/// Positions in bytes: `start` is the first byte, `end` the one behind the last.
struct ByteRange {
  uint64_t start = 0;
  uint64_t end = 0;

  friend bool operator==(const ByteRange&, const ByteRange&) = default;
};

/// Ranges that touch or overlap are one.
class ByteRanges {
 public:
  void Add(ByteRange range);
  void Add(const ByteRanges& others);
  void Remove(ByteRange range);
  void Remove(const ByteRanges& others);
  bool IsEmpty() const { return ranges_.empty(); }
  /// True when every byte of `range` is in the set.
  bool Holds(ByteRange range) const;
  /// True when any byte of `range` is in the set.
  bool Touches(ByteRange range) const;
  /// The position behind the last byte; 0 for an empty set.
  uint64_t End() const { return ranges_.empty() ? 0 : ranges_.rbegin()->second; }
  /// \pre not IsEmpty()
  ByteRange First() const { return {ranges_.begin()->first, ranges_.begin()->second}; }
  /// \pre not IsEmpty()
  ByteRange Last() const { return {ranges_.rbegin()->first, ranges_.rbegin()->second}; }
  /// Bytes.
  uint64_t Size() const;

  /// Removes `bytes` bytes from the set, which lie together and start at an even position: as near
  /// behind those taken before as there is room. \returns their position; none: there is no room
  std::optional<uint64_t> Take(uint64_t bytes);
  /// The same from the shortest range that has room, the first one of these.
  std::optional<uint64_t> TakeFromShortest(uint64_t bytes);
  /// Removes the lowest `bytes` bytes that lie together, at any position, and returns theirs; none
  /// where they would begin at `limit` or behind it.
  std::optional<uint64_t> TakeBefore(uint64_t limit, uint64_t bytes);

  /// Ascending, from start to end.
  std::map<uint64_t, uint64_t>::const_iterator begin() const { return ranges_.begin(); }
  std::map<uint64_t, uint64_t>::const_iterator end() const { return ranges_.end(); }

 private:
  using Iterator = std::map<uint64_t, uint64_t>::iterator;

  std::optional<uint64_t> TakeFrom(Iterator at, uint64_t bytes);

  std::map<uint64_t, uint64_t> ranges_;  // start to end
  uint64_t next_ = 0;                    // where the search for room begins
  uint64_t tooLarge_ = UINT64_MAX;       // for so many bytes no room was found
};

}  // namespace orin::drivers
