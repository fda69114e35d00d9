/// Where the space of replaced and removed levels goes: levels behind it move there, and the file
/// gets shorter.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <exception>
#include <utility>

#include "host/drivers/tiff/levelfile.h"
#include "host/drivers/tiff/packing.h"

namespace orin::drivers {
namespace {

/// Of the items with these indices; of all of them for none.
uint64_t BytesOf(const std::vector<size_t>& indices, const std::vector<Movable>& items) {
  uint64_t bytes = 0;
  for (const Movable& item : items)
    if (indices.empty() || std::binary_search(indices.begin(), indices.end(), item.index))
      bytes += item.bytes;
  return bytes;
}

}  // namespace

/// Who opens the file later knows its state of now.
bool LevelFile::IsAlone() {
  return file_->DoAlone([] {}) == PositionedFile::Alone::kDone;
}

void LevelFile::Join(const Joining& joining) {
  for (const auto& stretches : {joining.relinked, joining.grown}) {
    for (const Stretch& stretch : stretches)
      file_->Write(stretch.marker, ComposeMarker(stretch).data(), kMarkerBytes);
    if (!stretches.empty()) file_->Sync();
  }
}

/// One step towards a file without gaps.
/// \param evacuated  bytes that were moved to the file's end so far
/// \returns false: no more is worth while, or others have the file open
bool LevelFile::PackOnce(uint64_t& evacuated) {
  constexpr uint64_t kWorthMoving = 25;  // gaps of that part of the file
  structure_ = ParseStructure(*file_);
  const OwnSpace space = FindOwnSpace(*file_, structure_);
  const uint64_t end = space.ShortestEnd(file_->Size(), {});
  if (RoomBefore(space.free, end) <= end / kWorthMoving || !IsAlone()) return false;
  if (const Joining joining = JoinStretches(space); !joining.IsEmpty()) {
    Join(joining);
    return true;
  }
  const std::vector<Movable> items = Movables(space);
  const auto move = NextMove(space, items);
  if (!move) return false;
  if (!move->room) {
    if (end < file_->Size())  // first: the file grows no more than it must
      return file_->DoAlone([&] { Shorten(space, end); }) == PositionedFile::Alone::kDone;
    evacuated += BytesOf(move->indices, items);
    if (evacuated > kMostRounds * BytesOf({}, items)) return false;
  }
  Carry(*move, space);
  return true;
}

/// Closes the gaps between levels. What cannot be moved, for want of room on the disk, stays.
void LevelFile::Pack() {
  constexpr int kMostSteps =
      1000;  // a few for each level; a forged file may ask for no end of them
  uint64_t evacuated = 0;
  try {
    for (int step = 0; step < kMostSteps && PackOnce(evacuated); ++step) {
    }
  } catch (const std::exception&) {
    // deliberate: no level is harmed, and the next change tries again
  }
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
  Pack();
  structure_ = ParseStructure(*file_);
  const OwnSpace space = FindOwnSpace(*file_, structure_);
  const uint64_t end = space.ShortestEnd(file_->Size(), {});
  if (end < file_->Size()) file_->DoAlone([&] { Shorten(space, end); });
  mayReuse_ = false;  // somebody may have opened the file meanwhile
  StartAppending();
}

void LevelFile::GiveBackSpace(const ByteRanges& given) {
  OpenForChange();
  structure_ = ParseStructure(*file_);
  const OwnSpace space = FindOwnSpace(*file_, structure_);
  const uint64_t end = space.ShortestEnd(file_->Size(), given);
  if (end < file_->Size()) Shorten(space, end);
  mayReuse_ = false;  // somebody may still read what was removed
  StartAppending();
}

}  // namespace orin::drivers
