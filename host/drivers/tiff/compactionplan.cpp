// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/compactionplan.h"

#include <algorithm>

namespace orin::drivers {
namespace {

/// The part of a gap that can be taken: what is added begins at even positions.
ByteRange UsablePartOf(ByteRange gap) {
  const uint64_t start = gap.start + gap.start % 2;
  return {std::min(start, gap.end), gap.end};
}

uint64_t SizeOf(ByteRange range) { return range.end - range.start; }

std::vector<ByteRange> GapsOf(const ByteRanges& free) {
  std::vector<ByteRange> gaps;
  for (const auto& [start, end] : free)
    if (const ByteRange gap = UsablePartOf({start, end}); SizeOf(gap) > 0) gaps.push_back(gap);
  return gaps;
}

using Items = std::vector<const Movable*>;

Items LargestFirst(const std::vector<Movable>& items) {
  Items sorted;
  for (const Movable& item : items) sorted.push_back(&item);
  std::stable_sort(sorted.begin(), sorted.end(),
                   [](const Movable* a, const Movable* b) { return a->bytes > b->bytes; });
  return sorted;
}

/// What lies behind the gap and fits into it.
std::vector<size_t> FittingInto(ByteRange gap, const Items& largestFirst) {
  std::vector<size_t> indices;
  uint64_t left = SizeOf(gap);
  for (const Movable* item : largestFirst) {
    if (item->bytes > left || item->extents.First().start < gap.end) continue;
    left -= item->bytes;
    indices.push_back(item->index);
  }
  return indices;
}

/// What makes the gap larger by leaving.
std::vector<size_t> Behind(ByteRange gap, const std::vector<Movable>& items) {
  for (const Movable& item : items)
    if (item.extents.Holds({gap.end, gap.end + 1})) return {item.index};
  return {};
}

Move MoveOf(std::vector<size_t> indices, std::optional<ByteRange> gap) {
  std::sort(indices.begin(), indices.end());
  return {std::move(indices), gap};
}

}  // namespace

uint64_t FreeBytesBefore(const ByteRanges& free, uint64_t end) {
  uint64_t bytes = 0;
  for (const ByteRange& gap : GapsOf(free))
    if (gap.start < end) bytes += std::min(gap.end, end) - gap.start;
  return bytes;
}

std::optional<Move> NextMove(const FreeSpaceMap& map, const std::vector<Movable>& items) {
  constexpr size_t kMaxGaps = 64;  // that are tried: shorter ones do not count
  std::vector<ByteRange> gaps = GapsOf(map.free);
  const Items largestFirst = LargestFirst(items);
  for (const ByteRange& gap : gaps)
    if (auto indices = FittingInto(gap, largestFirst); !indices.empty())
      return MoveOf(std::move(indices), gap);
  std::stable_sort(gaps.begin(), gaps.end(),
                   [](ByteRange a, ByteRange b) { return SizeOf(a) > SizeOf(b); });
  gaps.resize(std::min(gaps.size(), kMaxGaps));
  for (const ByteRange& gap : gaps)
    if (auto indices = Behind(gap, items); !indices.empty())
      return MoveOf(std::move(indices), std::nullopt);
  return std::nullopt;
}

}  // namespace orin::drivers
