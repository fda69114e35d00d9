// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/packing.h"

#include <algorithm>

namespace orin::drivers {
namespace {

/// The part of a gap that can be taken: what is added begins at even positions.
ByteRange RoomIn(ByteRange gap) {
  const uint64_t start = gap.start + gap.start % 2;
  return {std::min(start, gap.end), gap.end};
}

uint64_t SizeOf(ByteRange extent) { return extent.end - extent.start; }

std::vector<ByteRange> GapsOf(const ByteRanges& free) {
  std::vector<ByteRange> gaps;
  for (const auto& [start, end] : free)
    if (const ByteRange room = RoomIn({start, end}); SizeOf(room) > 0) gaps.push_back(room);
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

/// What makes the gap larger by leaving: the level behind it; where a stretch begins there, all of
/// that stretch.
std::vector<size_t> Behind(ByteRange gap, const OwnSpace& space,
                           const std::vector<Movable>& items) {
  const auto next = std::find_if(space.stretches.begin(), space.stretches.end(),
                                 [&](const Stretch& stretch) { return stretch.start == gap.end; });
  const auto isIn = [&](uint64_t directory) {
    return directory >= next->Body() && directory < next->end;
  };
  std::vector<size_t> indices;
  for (const Movable& item : items)
    if (next != space.stretches.end() ? isIn(item.directory)
                                      : item.extents.Holds({gap.end, gap.end + 1}))
      indices.push_back(item.index);
  if (next == space.stretches.end()) return indices;
  const auto all = std::count_if(space.directories.begin(), space.directories.end(), isIn);
  return indices.size() == size_t(all) ? indices : std::vector<size_t>();
}

Move MoveOf(std::vector<size_t> indices, std::optional<ByteRange> room) {
  std::sort(indices.begin(), indices.end());
  return {std::move(indices), room};
}

}  // namespace

uint64_t RoomBefore(const ByteRanges& free, uint64_t end) {
  uint64_t bytes = 0;
  for (const ByteRange& gap : GapsOf(free))
    if (gap.start < end) bytes += std::min(gap.end, end) - gap.start;
  return bytes;
}

std::optional<Move> NextMove(const OwnSpace& space, const std::vector<Movable>& items) {
  constexpr size_t kMostGaps = 64;  // that are tried: shorter ones do not count
  std::vector<ByteRange> gaps = GapsOf(space.free);
  const Items largestFirst = LargestFirst(items);
  for (const ByteRange& gap : gaps)
    if (auto indices = FittingInto(gap, largestFirst); !indices.empty())
      return MoveOf(std::move(indices), gap);
  std::stable_sort(gaps.begin(), gaps.end(),
                   [](ByteRange a, ByteRange b) { return SizeOf(a) > SizeOf(b); });
  gaps.resize(std::min(gaps.size(), kMostGaps));
  for (const ByteRange& gap : gaps)
    if (auto indices = Behind(gap, space, items); !indices.empty())
      return MoveOf(std::move(indices), std::nullopt);
  return std::nullopt;
}

}  // namespace orin::drivers
