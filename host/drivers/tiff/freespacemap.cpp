// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/freespacemap.h"

#include <algorithm>
#include <utility>

#include "host/drivers/tiff/references.h"

namespace orin::drivers {
namespace {

/// Collects the segments of a file, from its beginning to its end.
class SegmentSearch {
 public:
  SegmentSearch(const PositionedFile& file, FreeSpaceMap& map)
      : file_(file), map_(map), size_(file.Size()) {}

  void Run();

 private:
  void SearchGap(ByteRange gap);
  void Add(Segment segment, uint64_t gapStart);
  uint64_t FirstUsedBehind(uint64_t position) const;

  const PositionedFile& file_;
  FreeSpaceMap& map_;
  uint64_t size_;
  uint64_t end_ = 0;                     ///< of the last segment found
  uint64_t budget_ = uint64_t{1} << 28;  // bytes: what is not found is lost, and does no harm
};

uint64_t SegmentSearch::FirstUsedBehind(uint64_t position) const {
  for (const auto& [start, end] : map_.used)
    if (start > position) return start;
  return size_;
}

/// Of an open segment a build was killed: what it appended reaches to the file's end, or to what
/// another program appended since. The same where the machine stopped before all was on disk.
void SegmentSearch::Add(Segment segment, uint64_t gapStart) {
  segment.start = std::max(segment.start, gapStart);
  if (segment.end == 0 || segment.end > size_) {
    segment.end = segment.end == 0 ? FirstUsedBehind(segment.marker) : size_;
    map_.unclosed.push_back(segment);
  }
  end_ = segment.end;
  map_.segments.push_back(segment);
}

void SegmentSearch::SearchGap(ByteRange gap) {
  while (true) {
    const uint64_t start = std::max(gap.start, end_);
    const auto segment = FindMarker(file_, start, gap.end, budget_);
    if (!segment) return;
    Add(*segment, start);
  }
}

void SegmentSearch::Run() {
  uint64_t gapStart = 0;
  for (const auto& [start, end] : map_.used) {
    SearchGap({gapStart, start});
    gapStart = end;
  }
  SearchGap({gapStart, size_});
}

}  // namespace

FreeSpaceMap FindFreeSpace(const PositionedFile& file, const TiffStructure& structure) {
  FreeSpaceMap map;
  References references = ReferencesIn(file, structure);
  map.used = std::move(references.extents);
  if (!references.areAllKnown) map.used.Add({0, file.Size()});  // any byte may be in use
  SegmentSearch(file, map).Run();
  for (const Segment& segment : map.segments) map.free.Add({segment.Body(), segment.end});
  map.free.Remove(map.used);
  return map;
}

bool FreeSpaceMap::IsOwn(uint64_t position) const {
  return std::any_of(segments.begin(), segments.end(), [position](const Segment& segment) {
    return position >= segment.Body() && position < segment.end;
  });
}

std::vector<Segment> FreeSpaceMap::Joined() const {
  std::vector<Segment> grown;
  for (size_t i = 0; i < segments.size();) {
    Segment joined = segments[i];
    size_t next = i + 1;
    for (; next < segments.size() && segments[next].start == joined.end; ++next)
      joined.end = segments[next].end;
    if (next > i + 1) grown.push_back(joined);
    i = next;
  }
  return grown;
}

uint64_t FreeSpaceMap::ShortestEnd(uint64_t fileSize, const ByteRanges& given) const {
  constexpr uint64_t kPadding = 1;  // other programs begin at even positions
  ByteRanges spare = given;
  for (const Segment& segment : segments) spare.Add({segment.start, segment.end});
  uint64_t end = fileSize;
  while (!spare.IsEmpty() && spare.End() <= end && end - spare.End() <= kPadding &&
         used.End() < end) {
    const ByteRange last = spare.Last();
    const uint64_t needed = used.End() + used.End() % 2;  // a segment ends at an even position
    end = used.End() <= last.start ? last.start : std::min(needed, end);
    if (end > last.start) break;
    spare.Remove(last);
  }
  return end;
}

}  // namespace orin::drivers
