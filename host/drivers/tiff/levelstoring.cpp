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
LevelMetadata TiffLevelStore::MetadataFor(unsigned level, const Pending& pending,
                                          const StoredLevel* before) const {
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
  return metadata;
}

void TiffLevelStore::AddDirectory(unsigned level, const LevelMetadata& metadata,
                                  const LevelBuild& build, const std::vector<uint32_t>& planes) {
  const TiffStructure& structure = file_->Structure();
  const StoredLevel* before = Find(level);
  const uint64_t tiles = build.TilesPerPlane();
  std::vector<NewEntry> entries = EntriesOf(build.Coding());
  for (const TileTable& table : kTables) {
    std::vector<uint64_t> numbers;
    if (before && before->isOurs)  // other planes keep their tiles
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
  const Place place =
      before ? PlaceOf(structure, before->index)
             : PlaceOfNew(file_->File(), structure, settings_.image, format.width, format.height);
  file_->Link(place, file_->ToAppend().AppendDirectory(std::move(entries), place.next));
}

/// Puts the tiles of `planes` into the level's directory; its validity is turned on by nobody here.
void TiffLevelStore::Store(unsigned level, Pending& pending, const std::vector<uint32_t>& planes) {
  const std::shared_ptr<LevelBuild> build = pending.build;
  file_->Sync();
  CatchUp();
  AddDirectory(level, MetadataFor(level, pending, FindOurs(level)), *build, planes);
  Reload();
  for (const uint32_t plane : planes) build->Release(plane);
  if (!build->IsEmpty()) return;
  build->isClosed = true;
  pending_.erase(level);
}

}  // namespace orin::drivers
