// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/compactor.h"

#include <algorithm>
#include <exception>
#include <optional>
#include <utility>

#include "host/drivers/tiff/leveldirectories.h"
#include "host/drivers/tiff/references.h"

namespace orin::drivers {
namespace {

/// Tiles of a directory, those with bytes in the file.
struct Tiles {
  std::vector<uint64_t> places;
  std::vector<uint64_t> sizes;
};

/// None where a copy would lack something: entries that are not understood, pixels in no tiles,
/// tiles that share bytes or lie behind the file's end.
std::optional<Tiles> TilesOf(const PositionedFile& file, const TiffStructure& structure,
                             const TiffDirectory& directory) {
  const unsigned countBytes = structure.isBig ? 8 : 2;
  const unsigned entryBytes = structure.isBig ? 20 : 12;
  const bool isWhole = directory.linkPosition ==
                       directory.offset + countBytes + directory.entries.size() * entryBytes;
  const TiffEntry* offsets = directory.Find(TIFFTAG_TILEOFFSETS);
  const TiffEntry* counts = directory.Find(TIFFTAG_TILEBYTECOUNTS);
  if (!isWhole || !offsets || !counts) return std::nullopt;
  Tiles tiles{ReadNumbers(file, structure, *offsets), ReadNumbers(file, structure, *counts)};
  if (tiles.places.size() != tiles.sizes.size()) return std::nullopt;
  const uint64_t end = file.Size();
  uint64_t left = end;
  for (size_t i = 0; i < tiles.places.size(); ++i) {
    if (tiles.sizes[i] > left || tiles.places[i] > end - tiles.sizes[i]) return std::nullopt;
    left -= tiles.sizes[i];
  }
  return tiles;
}

std::vector<NewEntry> EntriesOf(const PositionedFile& file, const TiffStructure& structure,
                                const TiffDirectory& directory) {
  std::vector<NewEntry> entries;
  for (const TiffEntry& entry : directory.entries)
    entries.push_back({entry.tag, entry.type, entry.count, ReadBytes(file, structure, entry)});
  return entries;
}

uint64_t EvenFrom(uint64_t bytes) { return bytes + bytes % 2; }

/// Of the items with these indices; of all of them for none.
uint64_t BytesOf(const std::vector<size_t>& indices, const std::vector<Movable>& items) {
  uint64_t bytes = 0;
  for (const Movable& item : items)
    if (indices.empty() || std::binary_search(indices.begin(), indices.end(), item.index))
      bytes += item.bytes;
  return bytes;
}

/// Segments that make the bytes of removed levels of other programs this program's, so that they
/// can be reused and are found again. Between two parts of such a level stand directories that were
/// replaced.
std::vector<Segment> SegmentsIn(const ByteRanges& given, const FreeSpaceMap& map) {
  constexpr uint64_t kMaxBetween = 1 << 16;  // bytes
  ByteRanges orphaned = given;
  uint64_t end = 0;
  for (const auto& [start, stop] : given) {
    if (end != 0 && start - end <= kMaxBetween) orphaned.Add({end, start});
    end = stop;
  }
  orphaned.Remove(map.used);
  for (const Segment& segment : map.segments) orphaned.Remove({segment.start, segment.end});
  std::vector<Segment> segments;
  for (const auto& [start, stop] : orphaned)
    if (const Segment segment{start, MarkerBehind(start), stop}; segment.Body() <= stop)
      segments.push_back(segment);
  return segments;
}

}  // namespace

/// A directory whose tiles were copied, not yet written.
struct Compactor::Copy {
  size_t index = 0;
  std::vector<NewEntry> entries;
  uint64_t reserved = 0;
};

void Compactor::Parse() {
  structure_ = ParseStructure(file_);
  map_ = FindFreeSpace(file_, structure_);
}

/// Programs that open the file later know its state of now.
bool Compactor::IsAlone() {
  return file_.DoAlone([] {}) == PositionedFile::Alone::kDone;
}

bool Compactor::HasGaps() const {
  constexpr uint64_t kWorthMoving = 25;  // gaps of that part of the file
  const uint64_t end = ShortestEnd();
  return FreeBytesBefore(map_.free, end) > end / kWorthMoving;
}

bool Compactor::IsWorthwhile() {
  Parse();
  return ShortestEnd() < file_.Size() || HasGaps();
}

void Compactor::WriteMarkers(const std::vector<Segment>& segments) {
  for (const Segment& segment : segments)
    file_.Write(segment.marker, ComposeMarker(segment).data(), kMarkerBytes);
  if (!segments.empty()) file_.Sync();
}

std::vector<Movable> Compactor::Movables() const {
  const Appender sizes(file_, structure_.isBig, structure_.byteOrder);
  std::vector<Movable> items;
  for (size_t i = firstMovable_; i < structure_.directories.size(); ++i) {
    const TiffDirectory& directory = structure_.directories[i];
    if (!map_.IsOwn(directory.offset)) continue;
    References references = ReferencesOf(file_, structure_, directory);
    const auto tiles = TilesOf(file_, structure_, directory);
    if (!tiles || !references.areAllKnown) continue;
    Movable item{i, sizes.SizeOfDirectory(EntriesOf(file_, structure_, directory)),
                 std::move(references.extents)};
    uint64_t tileBytes = 0;
    for (const uint64_t size : tiles->sizes) {
      tileBytes += size;
      item.bytes += EvenFrom(size);
    }
    if (tileBytes < item.extents.Size()) items.push_back(std::move(item));  // no tiles share bytes
  }
  return items;
}

/// Copies the tiles of a directory. \pre it is one of the Movables
Compactor::Copy Compactor::CopyTiles(Appender& appender, size_t index) {
  const TiffDirectory& directory = structure_.directories[index];
  Copy copy{index, EntriesOf(file_, structure_, directory), 0};
  Tiles tiles = TilesOf(file_, structure_, directory).value();
  std::vector<uint8_t> bytes;
  for (size_t i = 0; i < tiles.places.size(); ++i) {
    if (tiles.sizes[i] == 0) continue;
    bytes.resize(tiles.sizes[i]);
    file_.Read(tiles.places[i], bytes.data(), bytes.size());
    tiles.places[i] = appender.Append(bytes);
  }
  for (NewEntry& entry : copy.entries)
    if (entry.tag == TIFFTAG_TILEOFFSETS) entry = NumbersEntry(entry.tag, entry.type, tiles.places);
  copy.reserved = appender.ReserveDirectory(copy.entries);
  return copy;
}

/// Copies directories with their tiles, then has the chain go through the copies: one link for
/// those that follow one another. \pre nobody reads what is free
void Compactor::Relocate(const Move& move) {
  FreeSpaceMap target = map_;
  target.free = {};
  if (move.gap) target.free.Add(*move.gap);
  Appender appender(file_, structure_.isBig, structure_.byteOrder, std::move(target));
  const uint64_t end = appender.End();
  try {
    std::vector<Copy> copies;
    for (const size_t index : move.indices) copies.push_back(CopyTiles(appender, index));
    std::vector<std::pair<uint64_t, uint64_t>> links;  // position, target
    uint64_t following = 0;                            // the copy of the directory behind
    for (size_t i = copies.size(); i-- > 0;) {  // the last one first: each tells where the next is
      const size_t index = copies[i].index;
      const bool isCopied = i + 1 < copies.size() && copies[i + 1].index == index + 1;
      following = appender.WriteDirectory(std::move(copies[i].entries),
                                          isCopied ? following : structure_.directories[index].next,
                                          copies[i].reserved);
      if (i == 0 || copies[i - 1].index + 1 != index)
        links.emplace_back(PlaceOf(structure_, index).linkPosition, following);
    }
    appender.Close();
    file_.Sync();
    appender.Keep();  // first: a link that fails half-way may point there already
    for (const auto& [position, copied] : links) appender.Link(position, copied);
    file_.Sync();
  } catch (...) {
    appender.CutBackTo(end);
    throw;
  }
}

/// What is cut off becomes a segment of its own first, so that it is found again when the program
/// is stopped before the cut, and is nobody's after it:
///
///   before      | M used  free free free |
///   1, synced   | M used  M2 free free   |    M2 lies in the segment of M and means nothing
///   2, synced   | M used || M2 free free |    M ends where M2 begins
///   3, synced   | M used |
void Compactor::Shorten(uint64_t end) {
  std::vector<Segment> cut;
  std::vector<Segment> rest;
  for (Segment segment : map_.segments) {
    if (segment.start >= end || segment.end <= end) continue;
    const Segment behind{end, MarkerBehind(end), segment.end};
    if (behind.marker < behind.end && behind.Body() <= behind.end) rest.push_back(behind);
    segment.end = end;
    cut.push_back(segment);
  }
  WriteMarkers(rest);
  WriteMarkers(cut);
  file_.Truncate(end);
  file_.Sync();
}

/// One step towards a file without gaps.
/// \param evacuated  bytes that were relocated to the file's end so far
/// \returns false: no more is worth while, or others have the file open
bool Compactor::TakeStep(uint64_t& evacuated) {
  Parse();
  if (!HasGaps() || !IsAlone()) return false;
  WriteMarkers(std::exchange(map_.unclosed, {}));
  if (const std::vector<Segment> joined = map_.Joined(); !joined.empty()) {
    WriteMarkers(joined);
    return true;
  }
  const std::vector<Movable> items = Movables();
  const auto move = NextMove(map_, items);
  if (!move) return false;
  if (!move->gap) {
    if (const uint64_t end = ShortestEnd();
        end < file_.Size())  // the file grows no more than it must
      return file_.DoAlone([&] { Shorten(end); }) == PositionedFile::Alone::kDone;
    evacuated += BytesOf(move->indices, items);
    if (evacuated > kMaxRounds * BytesOf({}, items)) return false;
  }
  Relocate(*move);
  return true;
}

void Compactor::Compact() {
  constexpr int kMaxSteps = 1000;  // a few for each level; a forged file may ask for no end of them
  uint64_t evacuated = 0;
  try {
    for (int step = 0; step < kMaxSteps && TakeStep(evacuated); ++step) {
    }
  } catch (...) {
    // deliberate: no level is harmed, and the next change tries again
  }
  Parse();
  if (const uint64_t end = ShortestEnd(); end < file_.Size()) file_.DoAlone([&] { Shorten(end); });
}

void Compactor::CutOff(const ByteRanges& given) {
  Parse();
  if (IsAlone()) WriteMarkers(SegmentsIn(given, map_));
  Parse();
  if (const uint64_t end = map_.ShortestEnd(file_.Size(), given); end < file_.Size()) Shorten(end);
}

}  // namespace orin::drivers
