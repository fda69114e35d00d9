// SPDX-License-Identifier: MIT
#include "host/drivers/common/byteranges.h"

#include <algorithm>
#include <iterator>

namespace orin::drivers {

void ByteRanges::Add(ByteRange range) {
  if (range.start >= range.end) return;
  tooLarge_ = UINT64_MAX;
  auto at = ranges_.upper_bound(range.start);
  if (at != ranges_.begin() && std::prev(at)->second >= range.start) --at;
  while (at != ranges_.end() && at->first <= range.end) {
    range.start = std::min(range.start, at->first);
    range.end = std::max(range.end, at->second);
    at = ranges_.erase(at);
  }
  ranges_.emplace(range.start, range.end);
}

void ByteRanges::Remove(ByteRange range) {
  if (range.start >= range.end) return;
  auto at = ranges_.upper_bound(range.start);
  if (at != ranges_.begin() && std::prev(at)->second > range.start) --at;
  while (at != ranges_.end() && at->first < range.end) {
    const ByteRange old{at->first, at->second};
    at = ranges_.erase(at);
    if (old.start < range.start) ranges_.emplace(old.start, range.start);
    if (old.end > range.end) at = ranges_.emplace(range.end, old.end).first;
  }
}

void ByteRanges::Add(const ByteRanges& others) {
  for (const auto& [start, end] : others) Add({start, end});
}

void ByteRanges::Remove(const ByteRanges& others) {
  for (const auto& [start, end] : others) Remove({start, end});
}

bool ByteRanges::Holds(ByteRange range) const {
  if (range.start >= range.end) return true;
  const auto at = ranges_.upper_bound(range.start);
  return at != ranges_.begin() && std::prev(at)->second >= range.end;
}

bool ByteRanges::Touches(ByteRange range) const {
  const auto behind = ranges_.lower_bound(range.end);
  return range.start < range.end && behind != ranges_.begin() &&
         std::prev(behind)->second > range.start;
}

uint64_t ByteRanges::Size() const {
  uint64_t bytes = 0;
  for (const auto& [start, end] : ranges_) bytes += end - start;
  return bytes;
}

std::optional<uint64_t> ByteRanges::TakeFrom(Iterator at, uint64_t bytes) {
  const uint64_t position = at->first + at->first % 2;
  if (position >= at->second || bytes > at->second - position) return std::nullopt;
  Remove({position, position + bytes});
  return position;
}

std::optional<uint64_t> ByteRanges::Take(uint64_t bytes) {
  if (bytes == 0 || bytes >= tooLarge_) return std::nullopt;
  const auto first = ranges_.lower_bound(next_);
  std::optional<uint64_t> position;
  for (auto at = first; at != ranges_.end() && !position;) position = TakeFrom(at++, bytes);
  for (auto at = ranges_.begin(); at != first && !position;) position = TakeFrom(at++, bytes);
  if (position) next_ = *position + bytes;
  else tooLarge_ = bytes;
  return position;
}

std::optional<uint64_t> ByteRanges::TakeBefore(uint64_t limit, uint64_t bytes) {
  for (const auto& [start, end] : ranges_) {
    if (start >= limit) break;
    if (end - start < bytes) continue;
    const uint64_t position = start;
    Remove({position, position + bytes});
    return position;
  }
  return std::nullopt;
}

std::optional<uint64_t> ByteRanges::TakeFromShortest(uint64_t bytes) {
  if (bytes == 0 || bytes >= tooLarge_) return std::nullopt;
  Iterator shortest = ranges_.end();
  const auto room = [](Iterator at) { return at->second - at->first - at->first % 2; };
  for (auto at = ranges_.begin(); at != ranges_.end(); ++at)
    if (room(at) >= bytes && (shortest == ranges_.end() || room(at) < room(shortest)))
      shortest = at;
  if (shortest == ranges_.end()) return std::nullopt;
  return TakeFrom(shortest, bytes);
}

}  // namespace orin::drivers
