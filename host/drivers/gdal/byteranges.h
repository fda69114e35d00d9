/// The bytes of a file that are free to be used.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <optional>

namespace orin::drivers {

/// Positions in bytes, from `start` to before `end`. Ranges that touch or overlap are one.
class ByteRanges {
 public:
  void Add(uint64_t start, uint64_t end);
  void Add(const ByteRanges& others);
  void Remove(uint64_t start, uint64_t end);
  void Remove(const ByteRanges& others);
  /// True when it has every byte of the range.
  bool Has(uint64_t start, uint64_t end) const;
  /// True when it has any byte of the range.
  bool Touches(uint64_t start, uint64_t end) const;
  uint64_t Size() const;
  /// The position behind the last byte; 0 when there is none.
  uint64_t End() const { return ranges_.empty() ? 0 : ranges_.rbegin()->second; }

  /// Removes the lowest `count` bytes that lie together, and returns their position; none where
  /// they would begin at `limit` or behind it.
  std::optional<uint64_t> TakeBefore(uint64_t limit, uint64_t count);

  /// From start to end, ascending.
  const std::map<uint64_t, uint64_t>& All() const { return ranges_; }

 private:
  std::map<uint64_t, uint64_t> ranges_;
};

}  // namespace orin::drivers
