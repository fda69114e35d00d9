/// Where the space of replaced and removed levels goes: levels behind it move there, and the file
/// gets shorter.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <utility>

#include "host/drivers/tiff/levelfile.h"

namespace orin::drivers {
namespace {

/// True when nothing of the directory is lost by writing its entries anew.
bool IsWhole(const TiffDirectory& directory, const TiffStructure& structure) {
  const unsigned countBytes = structure.isBig ? 8 : 2;
  const unsigned entryBytes = structure.isBig ? 20 : 12;
  return directory.linkPosition ==
         directory.offset + countBytes + directory.entries.size() * entryBytes;
}

std::vector<uint8_t> Bytes(const PositionedFile& file, uint64_t position, uint64_t count) {
  std::vector<uint8_t> bytes(count);
  file.Read(position, bytes.data(), bytes.size());
  return bytes;
}

}  // namespace

/// Copies directory `index` to a place before `end`, and its tiles, as many as fit, to places
/// before those that they have. \returns false: no room, or it cannot be moved
bool LevelFile::MoveDown(size_t index, uint64_t end) {
  const TiffDirectory& directory = structure_.directories[index];
  const TiffEntry* offsets = directory.Find(TIFFTAG_TILEOFFSETS);
  const TiffEntry* counts = directory.Find(TIFFTAG_TILEBYTECOUNTS);
  if (!offsets || !counts || !IsWhole(directory, structure_)) return false;
  std::vector<uint64_t> places = ReadNumbers(*file_, structure_, *offsets);
  const std::vector<uint64_t> sizes = ReadNumbers(*file_, structure_, *counts);
  if (places.size() != sizes.size()) return false;
  std::vector<NewEntry> entries;
  for (const TiffEntry& entry : directory.entries)
    entries.push_back({entry.tag, entry.type, entry.count, ReadBytes(*file_, structure_, entry)});
  const auto reserved = appender_->ReserveDirectoryBelow(entries, end);
  if (!reserved) return false;
  bool isLower = *reserved < directory.offset;
  for (size_t i = 0; i < places.size(); ++i) {
    if (sizes[i] == 0) continue;
    const auto lower = appender_->AppendBelow(Bytes(*file_, places[i], sizes[i]), places[i]);
    isLower = isLower || lower;
    places[i] = lower.value_or(places[i]);
  }
  if (!isLower) return false;
  for (NewEntry& entry : entries)
    if (entry.tag == TIFFTAG_TILEOFFSETS) entry = NumbersEntry(entry.tag, entry.type, places);
  const Place place = PlaceOf(structure_, index);
  Link(place, appender_->WriteDirectory(std::move(entries), place.next, *reserved));
  return true;
}

/// Moves the directories of this program, the first ones in the file first.
/// \pre nobody reads what is free. \returns false: nothing could be moved
bool LevelFile::MoveDown() {
  mayReuse_ = true;
  StartAppending();
  const OwnSpace space = FindOwnSpace(*file_, structure_);
  std::vector<uint64_t> own = space.directories;
  std::sort(own.begin(), own.end());  // as they were built: so they fit where others of them were
  bool isMoved = false;
  for (const uint64_t offset : own) {
    const auto& all = structure_.directories;
    const auto found = std::find_if(all.begin(), all.end(),
                                    [&](const auto& entry) { return entry.offset == offset; });
    if (found == all.end()) continue;
    const bool isLower = MoveDown(static_cast<size_t>(found - all.begin()), space.used.End());
    isMoved = isMoved || isLower;
  }
  return isMoved;
}

void LevelFile::Shorten(const OwnSpace& space, uint64_t end) {
  for (Stretch stretch : space.stretches)
    if (stretch.start < end && stretch.end > end) {
      stretch.end = end;
      file_->Write(stretch.marker, ComposeMarker(stretch).data(), kMarkerBytes);
    }
  file_->Sync();  // first: what is cut off must be nobody's before it may become another's
  file_->Truncate(end);
  file_->Sync();
}

void LevelFile::GiveBackSpace() {
  if (!appender_ || !isMade_) return;
  constexpr uint64_t kWorthMoving = 50;  // a fiftieth of the file
  constexpr int kMostPasses = 4;         // what one pass leaves room for, the next one moves
  const auto isAlone = [this] { return file_->DoAlone([] {}) == PositionedFile::Alone::kDone; };
  structure_ = ParseStructure(*file_);
  OwnSpace space = FindOwnSpace(*file_, structure_);
  for (int pass = 0; pass < kMostPasses; ++pass) {
    if (space.free.Size() < file_->Size() / kWorthMoving || !isAlone() || !MoveDown()) break;
    space = FindOwnSpace(*file_, structure_);
  }
  const uint64_t end = space.ShortestEnd(file_->Size(), {});
  if (end < file_->Size()) file_->DoAlone([&] { Shorten(space, end); });
  mayReuse_ = false;  // somebody may have opened the file meanwhile
  StartAppending();
}

void LevelFile::GiveBackSpace(const ExtentSet& given) {
  OpenForChange();
  structure_ = ParseStructure(*file_);
  const OwnSpace space = FindOwnSpace(*file_, structure_);
  const uint64_t end = space.ShortestEnd(file_->Size(), given);
  if (end < file_->Size()) Shorten(space, end);
  mayReuse_ = false;  // somebody may still read what was removed
  StartAppending();
}

}  // namespace orin::drivers
