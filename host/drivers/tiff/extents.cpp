// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/extents.h"

#include <algorithm>

namespace orin::drivers {

void ExtentSet::Add(Extent extent) {
  if (extent.start >= extent.end) return;
  tooLarge_ = UINT64_MAX;
  auto at = extents_.upper_bound(extent.start);
  if (at != extents_.begin() && std::prev(at)->second >= extent.start) --at;
  while (at != extents_.end() && at->first <= extent.end) {
    extent.start = std::min(extent.start, at->first);
    extent.end = std::max(extent.end, at->second);
    at = extents_.erase(at);
  }
  extents_.emplace(extent.start, extent.end);
}

void ExtentSet::Remove(Extent extent) {
  if (extent.start >= extent.end) return;
  auto at = extents_.upper_bound(extent.start);
  if (at != extents_.begin() && std::prev(at)->second > extent.start) --at;
  while (at != extents_.end() && at->first < extent.end) {
    const Extent old{at->first, at->second};
    at = extents_.erase(at);
    if (old.start < extent.start) extents_.emplace(old.start, extent.start);
    if (old.end > extent.end) at = extents_.emplace(extent.end, old.end).first;
  }
}

void ExtentSet::Remove(const ExtentSet& others) {
  for (const auto& [start, end] : others) Remove({start, end});
}

bool ExtentSet::Holds(Extent extent) const {
  if (extent.start >= extent.end) return true;
  const auto at = extents_.upper_bound(extent.start);
  return at != extents_.begin() && std::prev(at)->second >= extent.end;
}

uint64_t ExtentSet::Size() const {
  uint64_t bytes = 0;
  for (const auto& [start, end] : extents_) bytes += end - start;
  return bytes;
}

std::optional<uint64_t> ExtentSet::TakeFrom(Iterator at, uint64_t bytes) {
  const uint64_t position = at->first + at->first % 2;
  if (position >= at->second || bytes > at->second - position) return std::nullopt;
  Remove({position, position + bytes});
  return position;
}

std::optional<uint64_t> ExtentSet::Take(uint64_t bytes) {
  if (bytes == 0 || bytes >= tooLarge_) return std::nullopt;
  const auto first = extents_.lower_bound(next_);
  std::optional<uint64_t> position;
  for (auto at = first; at != extents_.end() && !position;) position = TakeFrom(at++, bytes);
  for (auto at = extents_.begin(); at != first && !position;) position = TakeFrom(at++, bytes);
  if (position) next_ = *position + bytes;
  else tooLarge_ = bytes;
  return position;
}

std::optional<uint64_t> ExtentSet::TakeFromShortest(uint64_t bytes) {
  if (bytes == 0 || bytes >= tooLarge_) return std::nullopt;
  Iterator shortest = extents_.end();
  const auto room = [](Iterator at) { return at->second - at->first - at->first % 2; };
  for (auto at = extents_.begin(); at != extents_.end(); ++at)
    if (room(at) >= bytes && (shortest == extents_.end() || room(at) < room(shortest)))
      shortest = at;
  if (shortest == extents_.end()) return std::nullopt;
  return TakeFrom(shortest, bytes);
}

}  // namespace orin::drivers
