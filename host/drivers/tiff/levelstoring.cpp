/// How a complete level gets into the file: by a directory that is added, then linked.
// SPDX-License-Identifier: MIT
#include <algorithm>

#include "host/drivers/tiff/tifflevelstore.h"

namespace orin::drivers {
namespace {

/// One of a directory's two tables: offsets or byte counts of all tiles.
struct TileTable {
  uint16_t tag;
  uint64_t TilePlace::*field;
};

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

/// \param before  the level of ours that is in the file, or null
/// \param image   that the pending channels were computed from. Channels computed from other data
///                are as good as not there: a level remembers one image
LevelMetadata TiffLevelStore::MetadataFor(unsigned level, const Pending& pending,
                                          const StoredLevel* before,
                                          const datasources::ImageRecord& image) const {
  LevelMetadata metadata;
  metadata.method = pending.method;
  metadata.level = level;
  metadata.sourceLevel = lastRead_ ? lastRead_ : settings_.usualSource;
  metadata.program = ProgramName();
  metadata.validity =
      before ? before->metadata.validity : std::string(pending.channels.size(), kAbsent);
  if (before && before->metadata.method != pending.method)  // it would not be true of the others
    std::replace(metadata.validity.begin(), metadata.validity.end(), kValid, kInvalid);
  for (size_t i = 0; i < pending.channels.size(); ++i)
    if (pending.channels[i]) metadata.validity[i] = kInvalid;
    else if (before && before->metadata.image.fingerprint != image.fingerprint)
      metadata.validity[i] = kAbsent;
  metadata.image = image;
  return metadata;
}

void TiffLevelStore::AddDirectory(const Pending& pending, const LevelMetadata& metadata,
                                  const std::vector<uint32_t>& planes) {
  const TiffStructure& structure = file_->Structure();
  const LevelBuild& build = *pending.build;
  const StoredLevel* before = Find(metadata.level);
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
  entries.push_back(TextEntry(TIFFTAG_GDAL_METADATA, ComposeLevelMetadata(metadata)));
  const PixelFormat& format = build.Coding().format;
  Place place =
      before ? PlaceOf(structure, before->index)
             : PlaceOfNew(file_->File(), structure, settings_.image, format.width, format.height);
  std::optional<uint64_t> strayMask;
  if (before && before->mask) {
    const TiffDirectory& mask = structure.directories[*before->mask];
    if (*before->mask == before->index + 1) place.next = mask.next;
    else strayMask = mask.offset;
  }
  if (build.mask) {
    const bool isFirst = place.linkPosition == structure.HeadLinkPosition();
    place.next = file_->ToAppend().AppendDirectory(
        MaskEntriesOf(*build.mask, structure.isBig, isFirst), place.next);
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

/// Puts the tiles of `planes` into the level's directory; its validity is turned on by nobody here.
/// \param image  that they were computed from; none: what the level remembers stays
void TiffLevelStore::Store(unsigned level, Pending& pending, const std::vector<uint32_t>& planes,
                           const std::optional<datasources::ImageRecord>& image) {
  const std::shared_ptr<LevelBuild> build = pending.build;
  file_->Sync();
  CatchUp();
  const StoredLevel* before = pending.isRecoded ? nullptr : FindOurs(level);
  const datasources::ImageRecord kept =
      before ? before->metadata.image : datasources::ImageRecord();
  AddDirectory(pending, MetadataFor(level, pending, before, image.value_or(kept)), planes);
  pending.isRecoded = false;
  Reload();
  for (const uint32_t plane : planes) build->Release(plane);
  build->mask.reset();
  if (!build->IsEmpty()) return;
  build->isClosed = true;
  pending_.erase(level);
}

}  // namespace orin::drivers
