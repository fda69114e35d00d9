/// How a complete level gets into the file: by a directory that is added, then linked.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <set>

#include "host/drivers/tiff/pagerecord.h"
#include "host/drivers/tiff/tifflevelstore.h"

namespace orin::drivers {
namespace {

/// One of a directory's two tables: offsets or byte counts of all tiles.
struct TileTable {
  uint16_t tag;
  uint64_t TilePlace::*field;
};

/// Whether a valid channel of the level is none of those that are pending.
bool HasOtherChannels(const StoredLevel& level, const std::vector<bool>& pending) {
  const std::string& validity = level.metadata.validity;
  for (size_t i = 0; i < validity.size(); ++i)
    if (validity[i] == kValid && !pending.at(i)) return true;
  return false;
}

constexpr TileTable kTables[] = {{TIFFTAG_TILEOFFSETS, &TilePlace::offset},
                                 {TIFFTAG_TILEBYTECOUNTS, &TilePlace::count}};

}  // namespace

std::vector<uint32_t> TiffLevelStore::PlanesOf(const LevelCoding& coding,
                                               const std::vector<unsigned>& channels) const {
  if (!coding.format.planar) return {0};
  std::vector<uint32_t> planes;
  for (const unsigned channel : channels) planes.push_back(channel - 1);
  return planes;
}

std::vector<uint32_t> TiffLevelStore::CompletePlanes(const LevelBuild& build) const {
  std::vector<uint32_t> planes;
  for (uint32_t plane = 0; plane < build.Coding().Planes(); ++plane)
    if (build.IsComplete(plane)) planes.push_back(plane);
  return planes;
}

/// The record of a level before its directory is written. Channels that stay in it were computed
/// from the same data, the same way, or they do not count: a level has one record.
/// \param before  the level of ours that is in the file, or null
/// \param source  of the pending channels
model::LevelRecord TiffLevelStore::RecordFor(unsigned level, const Pending& pending,
                                             const StoredLevel* before, const LevelSource& source) {
  model::LevelRecord record;
  record.method = pending.method;
  record.level = level;
  record.sourceLevel = source.level ? source.level : settings_.usualSource;
  record.sourceBytes = source.bytes;
  record.program = ProgramName();
  record.inputs = freshness_.Inputs();
  record.inputs.channels = pending.together;
  record.image = source.image;
  record.validity =
      before ? before->metadata.validity : std::string(pending.channels.size(), kAbsent);
  const bool hasOthers = before && HasOtherChannels(*before, pending.channels);
  const char others = hasOthers ? ValidityOfOthers(*before, record) : kValid;
  for (size_t i = 0; i < pending.channels.size(); ++i)
    if (pending.channels[i]) record.validity[i] = kInvalid;
    else if (others == kAbsent || (others == kInvalid && record.validity[i] == kValid))
      record.validity[i] = others;
  return record;
}

/// What becomes of channels that stay: kValid, they are what they were; kInvalid, they are not what
/// `now` says; kAbsent, they are of another image.
char TiffLevelStore::ValidityOfOthers(const StoredLevel& before, const model::LevelRecord& now) {
  const model::LevelRecord& then = before.metadata;
  if (then.image.fingerprint != now.image.fingerprint) return kAbsent;
  const bool isSameWay = then.version == 2 && then.method == now.method &&
                         then.sourceLevel == now.sourceLevel &&
                         then.sourceBytes == now.sourceBytes &&
                         DifferenceOf(then.inputs, now.inputs) == model::StaleReason::kNone;
  return isSameWay && IsWhole(before) ? kValid : kInvalid;
}

/// Of a level that the file does not hold.
Place TiffLevelStore::NewPlace(const PixelFormat& format) const {
  const TiffStructure& structure = file_->Structure();
  if (!catalogue_) return {structure.HeadLinkPosition(), 0};
  return PlaceOfNew(structure, *catalogue_, settings_.image, format.width, format.height);
}

/// \param mask  of the level, complete; null for none
void TiffLevelStore::AddDirectory(const Pending& pending, const model::LevelRecord& record,
                                  const std::vector<uint32_t>& planes, const LevelBuild* mask) {
  const TiffStructure& structure = file_->Structure();
  const LevelBuild& build = *pending.build;
  const StoredLevel* before = Find(record.level);
  const uint64_t tiles = build.TilesPerPlane();
  std::vector<NewEntry> entries = EntriesOf(build.Coding());
  for (const TileTable& table : kTables) {
    std::vector<uint64_t> numbers;
    if (before && before->isOurs && !pending.isRecoded)  // other planes keep their tiles
      if (const TiffEntry* entry = structure.directories[before->index].Find(table.tag))
        numbers = ReadNumbers(file_->File(), structure, *entry);
    numbers.resize(tiles * build.Coding().Planes());
    for (const uint32_t plane : planes)
      std::transform(build.PlacesOf(plane), build.PlacesOf(plane) + tiles, &numbers[plane * tiles],
                     [&](const TilePlace& place) { return place.*table.field; });
    entries.push_back(NumbersEntry(table.tag, structure.isBig ? TIFF_LONG8 : TIFF_LONG, numbers));
  }
  std::string text = ComposeLevelMetadata(record);
  if (settings_.image.isInFile && catalogue_->HasPages()) text = WithPage(std::move(text), 1);
  entries.push_back(TextEntry(TIFFTAG_GDAL_METADATA, text));
  const PixelFormat& format = build.Coding().format;
  Place place = before ? PlaceOf(structure, before->index) : NewPlace(format);
  std::optional<uint64_t> strayMask;
  if (before && before->mask) {
    const TiffDirectory& there = structure.directories[*before->mask];
    if (*before->mask == before->index + 1) place.next = there.next;
    else strayMask = there.offset;
  }
  if (mask) {
    const bool isFirst = place.linkPosition == structure.HeadLinkPosition();
    place.next = file_->ToAppend().AppendDirectory(MaskEntriesOf(*mask, structure.isBig, isFirst),
                                                   place.next);
  }
  file_->Link(place, file_->ToAppend().AppendDirectory(std::move(entries), place.next));
  TidyMasks(strayMask);
}

/// Takes the mask of a level that is no more out of the chain, and has the masks of a side-car say
/// of themselves what their places ask for.
void TiffLevelStore::TidyMasks(std::optional<uint64_t> strayMask) {
  const auto& directories = file_->Structure().directories;
  for (size_t i = 1; strayMask && i < directories.size(); ++i)
    if (directories[i].offset == *strayMask) {
      file_->Link({directories[i - 1].linkPosition, 0}, directories[i].next);
      break;
    }
  if (settings_.image.isInFile) return;
  const auto changes = MaskTypeChanges(file_->File(), file_->Structure());
  for (const TypeChange& change : changes) file_->Overwrite(change.position, change.bytes);
  if (!changes.empty()) file_->Sync();
}

/// Whether finished channels are kept back, and keeps them and their mask: other programs would
/// show a level of which the rest is empty, or of other pixels. What is kept back is lost when the
/// program is killed.
bool TiffLevelStore::Waits(Pending& pending, const std::vector<unsigned>& channels,
                           const LevelSource& source) const {
  if (!pending.coding.format.planar) return false;
  std::set<unsigned> all(pending.waiting.begin(), pending.waiting.end());
  all.insert(channels.begin(), channels.end());
  pending.waiting.assign(all.begin(), all.end());
  pending.waitingSource = source;
  if (pending.build->mask) pending.waitingMask = std::move(pending.build->mask);
  return pending.waiting.size() < settings_.image.samples;
}

/// Whether storing what waits would make other programs show channels of two computations together,
/// instead of the whole level that the file holds: of those being rebuilt some are not finished.
bool TiffLevelStore::WouldMix(unsigned level, const Pending& pending) const {
  const StoredLevel* before = FindOurs(level);
  if (!before || before->metadata.validity.find(kAbsent) != std::string::npos) return false;
  const auto created = std::count(pending.channels.begin(), pending.channels.end(), true);
  return pending.waiting.size() < static_cast<size_t>(created);
}

void TiffLevelStore::StoreWaiting(unsigned level) {
  const auto entry = pending_.find(level);
  if (entry == pending_.end() || entry->second.waiting.empty()) return;
  if (WouldMix(level, entry->second)) {
    const std::shared_ptr<LevelBuild> build = entry->second.build;
    return GiveUp(level, *build);
  }
  StoreFinished(level, entry->second, {}, LevelSource(entry->second.waitingSource));
}

void TiffLevelStore::StoreAllWaitingBut(unsigned level) {
  std::vector<unsigned> levels;
  for (const auto& [other, pending] : pending_)
    if (other != level && !pending.waiting.empty()) levels.push_back(other);
  for (const unsigned other : levels) StoreWaiting(other);
}

/// Stores `channels` and those that wait, and marks them valid. What is being written of another
/// mask meanwhile stays.
void TiffLevelStore::StoreFinished(unsigned level, Pending& pending,
                                   const std::vector<unsigned>& channels,
                                   const LevelSource& source) {
  std::set<unsigned> all(channels.begin(), channels.end());
  all.insert(pending.waiting.begin(), pending.waiting.end());
  pending.waiting.clear();
  const std::vector<unsigned> finished(all.begin(), all.end());
  std::unique_ptr<LevelBuild> mask =
      std::move(pending.waitingMask ? pending.waitingMask : pending.build->mask);
  Store(level, pending, PlanesOf(pending.coding, finished), std::move(mask), source);
  MarkStored(level, finished, true);
}

/// Puts the tiles of `planes` into the level's directory; its validity is turned on by nobody here.
/// \param mask   of all channels of the level; null for none
/// \param source  they were computed from; none: what the level records stays
void TiffLevelStore::Store(unsigned level, Pending& pending, const std::vector<uint32_t>& planes,
                           std::unique_ptr<LevelBuild> mask,
                           const std::optional<LevelSource>& source) {
  const std::shared_ptr<LevelBuild> build = pending.build;
  file_->Sync();
  CatchUp();
  const StoredLevel* before = pending.isRecoded ? nullptr : FindOurs(level);
  LevelSource kept = source_;
  kept.image = before ? before->metadata.image : model::ImageRecord();
  AddDirectory(pending, RecordFor(level, pending, before, source.value_or(kept)), planes,
               mask.get());
  pending.isRecoded = false;
  Reload();
  for (const uint32_t plane : planes) build->Release(plane);
  if (!build->IsEmpty()) return;
  build->isClosed = true;
  pending_.erase(level);
}

}  // namespace orin::drivers
