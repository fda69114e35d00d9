/// Looks, before a level is made, whether the file and its file system can take it.
// SPDX-License-Identifier: MIT
#include <utility>

#include "host/datasources/levelroom.h"
#include "host/drivers/tiff/levelmask.h"
#include "host/drivers/tiff/storedsize.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/model/levelsize.h"
#include "host/services/text.h"

namespace orin::drivers {

using datasources::BigTiff;
using datasources::LevelRoom;

/// The most that a level of `planes` planes takes, with its mask where it gets one.
uint64_t TiffLevelStore::MostBytesWithMask(const LevelCoding& level, uint32_t planes,
                                           bool isBig) const {
  uint64_t bytes = MostBytesOf(level, planes, isBig);
  if (GetsMask(level.format)) bytes += MostBytesOf(MaskCodingOf(level), 1, isBig);
  return bytes;
}

/// What the user wishes, else whether the usual pyramids and this level could pass the limit.
bool TiffLevelStore::BecomesBig(const LevelCoding& level) const {
  constexpr uint64_t kSaferBytes = uint64_t{1} << 31;
  const BigTiff wish = options_.bigTiff;
  if (wish == BigTiff::kYes || wish == BigTiff::kNo) return wish == BigTiff::kYes;
  const ImageShape& image = settings_.image;
  uint64_t most = MostBytesOfPyramids(image.width, image.height, level) +
                  MostBytesWithMask(level, level.Planes(), true);
  if (GetsMask(level.format))
    most += MostBytesOfPyramids(image.width, image.height, MaskCodingOf(level));
  return most > (wish == BigTiff::kIfSafer ? kSaferBytes : kClassicBytes);
}

/// A stored level of ours keeps its form unless the user's options are to give it another.
TiffLevelStore::Pending TiffLevelStore::PendingFor(unsigned level) const {
  Pending pending;
  pending.channels.resize(settings_.image.samples);
  const StoredLevel* ours = FindOurs(level);
  if (!ours || options_.SayCoding())
    pending.coding = CodingOfLevel(settings_.coding, level, file_->Path(), options_);
  if (!ours) return pending;
  LevelCoding stored = CodingOfStored(*ours);
  const bool isOther = !HaveSameForm(stored, pending.coding);
  pending.isRecoded = isOther && options_.restores && options_.SayCoding();
  if (isOther && !pending.isRecoded) pending.coding = std::move(stored);
  return pending;
}

/// Explains why the file cannot grow by `most` bytes. \pre it is a classic TIFF
void TiffLevelStore::ExplainLimit(LevelRoom& room) const {
  const char* name = file_->Path().c_str();
  if (settings_.place == datasources::LevelPlace::kInternal) {
    room.obstacle = FormatString(
        _("%s: could pass 4 GiB, the limit of a classic TIFF, with the levels inside."), name);
    room.advice = _("Use --external: the levels then go to a file beside it.");
  } else if (file_->Exists()) {
    room.obstacle = FormatString(
        _("%s: could pass 4 GiB, the limit of a classic TIFF, with more levels."), name);
    room.advice =
        _("Delete the side-car, or move it away, and run again: the new one has no such limit.");
  } else {
    room.obstacle = FormatString(_("%s: could pass 4 GiB, the limit that BIGTIFF=NO sets."), name);
    room.advice = _("Leave that option out.");
  }
}

void TiffLevelStore::SetOptions(const datasources::LevelOptions& options) {
  const std::lock_guard lock(mutex_);
  options_ = options;
}

std::vector<unsigned> TiffLevelStore::StoredOtherwise() const {
  const std::lock_guard lock(mutex_);
  std::vector<unsigned> levels;
  for (const StoredLevel& stored : levels_) {
    if (!options_.SayCoding() || Find(stored.level) != &stored) continue;
    const LevelCoding asked =
        CodingOfLevel(settings_.coding, stored.level, file_->Path(), options_);
    if (!HasFormAskedFor(CodingOfStored(stored), asked, options_)) levels.push_back(stored.level);
  }
  return levels;
}

LevelRoom TiffLevelStore::RoomFor(const std::vector<unsigned>& levels,
                                  const std::vector<unsigned>& channels) const {
  const std::lock_guard lock(mutex_);
  return RoomOf(levels, channels);
}

LevelRoom TiffLevelStore::RoomOf(const std::vector<unsigned>& levels,
                                 const std::vector<unsigned>& channels) const {
  LevelRoom room;
  uint64_t most = 0;
  const TiffStructure& structure = file_->Structure();
  for (const unsigned level : levels) {
    const ImageShape& image = settings_.image;
    if (model::LevelSizeOf(image.width, image.height, level).IsEmpty()) continue;
    const LevelCoding coding = PendingFor(level).coding;
    room.blursAlpha = room.blursAlpha || BlursAlpha(coding.format);
    const auto planes = static_cast<uint32_t>(PlanesOf(coding, channels).size());
    most += MostBytesWithMask(coding, planes, structure.isBig);
  }
  if (most == 0) return room;
  room.file = file_->Path();
  room.bytes = most;
  const bool mayBecomeBig = !file_->Exists() && options_.bigTiff != BigTiff::kNo;
  const uint64_t end = file_->Exists() ? file_->File().Size() : structure.HeaderBytes();
  if (!structure.isBig && !mayBecomeBig && end + most > kClassicBytes) ExplainLimit(room);
  return room;
}

/// Makes sure, or throws; a file not yet made becomes a BigTIFF where that is needed.
void TiffLevelStore::RequireRoomFor(unsigned level, const std::vector<unsigned>& channels) {
  datasources::RequireRoom(RoomOf({level}, channels));
  if (!file_->Exists() && BecomesBig(PendingFor(level).coding)) file_->BecomeBig();
}

}  // namespace orin::drivers
