// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/byteranges.h"

#include <algorithm>
#include <iterator>

namespace orin::drivers {

void ByteRanges::Add(uint64_t start, uint64_t end) {
  if (start >= end) return;
  auto at = ranges_.upper_bound(start);
  if (at != ranges_.begin() && std::prev(at)->second >= start) --at;
  while (at != ranges_.end() && at->first <= end) {
    start = std::min(start, at->first);
    end = std::max(end, at->second);
    at = ranges_.erase(at);
  }
  ranges_.emplace(start, end);
}

void ByteRanges::Add(const ByteRanges& others) {
  for (const auto& [start, end] : others.ranges_) Add(start, end);
}

void ByteRanges::Remove(const ByteRanges& others) {
  for (const auto& [start, end] : others.ranges_) Remove(start, end);
}

void ByteRanges::Remove(uint64_t start, uint64_t end) {
  if (start >= end) return;
  auto at = ranges_.upper_bound(start);
  if (at != ranges_.begin() && std::prev(at)->second > start) --at;
  while (at != ranges_.end() && at->first < end) {
    const auto [first, last] = *at;
    at = ranges_.erase(at);
    if (first < start) ranges_.emplace(first, start);
    if (last > end) ranges_.emplace(end, last);
  }
}

bool ByteRanges::Has(uint64_t start, uint64_t end) const {
  if (start >= end) return true;
  const auto at = ranges_.upper_bound(start);
  return at != ranges_.begin() && std::prev(at)->second >= end;
}

bool ByteRanges::Touches(uint64_t start, uint64_t end) const {
  const auto behind = ranges_.lower_bound(end);
  return start < end && behind != ranges_.begin() && std::prev(behind)->second > start;
}

uint64_t ByteRanges::Size() const {
  uint64_t bytes = 0;
  for (const auto& [start, end] : ranges_) bytes += end - start;
  return bytes;
}

std::optional<uint64_t> ByteRanges::TakeBefore(uint64_t limit, uint64_t count) {
  for (const auto& [start, end] : ranges_) {
    if (start >= limit) break;
    if (end - start < count) continue;
    const uint64_t position = start;
    Remove(position, position + count);
    return position;
  }
  return std::nullopt;
}

}  // namespace orin::drivers
