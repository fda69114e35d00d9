/// How levels move inside their file: their copies are durable before links lead to them.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <exception>
#include <optional>
#include <set>
#include <utility>

#include "host/drivers/tiff/levelfile.h"
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

}  // namespace

/// A directory whose tiles were copied, not yet written.
struct LevelFile::Carried {
  size_t index = 0;
  std::vector<NewEntry> entries;
  uint64_t reserved = 0;
};

std::vector<Movable> LevelFile::Movables(const OwnSpace& space) const {
  const std::set<uint64_t> own(space.directories.begin(), space.directories.end());
  std::vector<Movable> items;
  for (size_t i = 0; i < structure_.directories.size(); ++i) {
    const TiffDirectory& directory = structure_.directories[i];
    if (!own.contains(directory.offset)) continue;
    References references = ReferencesOf(*file_, structure_, directory);
    const auto tiles = TilesOf(*file_, structure_, directory);
    if (!tiles || !references.areAllKnown) continue;
    Movable item{i, directory.offset, 0, std::move(references.extents)};
    item.extents.Add({directory.offset - kPointerBytes, directory.offset});
    item.bytes = appender_->SizeOfDirectory(EntriesOf(*file_, structure_, directory));
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
LevelFile::Carried LevelFile::CopyTiles(size_t index) {
  const TiffDirectory& directory = structure_.directories[index];
  Carried carried{index, EntriesOf(*file_, structure_, directory), 0};
  Tiles tiles = TilesOf(*file_, structure_, directory).value();
  std::vector<uint8_t> bytes;
  for (size_t i = 0; i < tiles.places.size(); ++i) {
    if (tiles.sizes[i] == 0) continue;
    bytes.resize(tiles.sizes[i]);
    file_->Read(tiles.places[i], bytes.data(), bytes.size());
    tiles.places[i] = appender_->Append(bytes);
  }
  for (NewEntry& entry : carried.entries)
    if (entry.tag == TIFFTAG_TILEOFFSETS) entry = NumbersEntry(entry.tag, entry.type, tiles.places);
  carried.reserved = appender_->ReserveDirectory(carried.entries);
  return carried;
}

/// Copies directories with their tiles, then has the chain go through the copies: one link for
/// those that follow one another. \pre nobody reads what is free
void LevelFile::Carry(const Move& move, const OwnSpace& space) {
  OwnSpace target = space;
  target.free = {};
  if (move.room) target.free.Add(*move.room);
  appender_ =
      std::make_unique<Appender>(*file_, structure_.isBig, structure_.byteOrder, std::move(target));
  const uint64_t end = appender_->End();
  try {
    std::vector<Carried> copies;
    for (const size_t index : move.indices) copies.push_back(CopyTiles(index));
    std::vector<DirectoryLink> links;
    uint64_t following = 0;                     // the copy of the directory behind
    for (size_t i = copies.size(); i-- > 0;) {  // the last one first: each tells where the next is
      const size_t index = copies[i].index;
      const bool isCopied = i + 1 < copies.size() && copies[i + 1].index == index + 1;
      following = appender_->WriteDirectory(
          std::move(copies[i].entries), isCopied ? following : structure_.directories[index].next,
          copies[i].reserved);
      if (i == 0 || copies[i - 1].index + 1 != index)
        links.push_back({PlaceOf(structure_, index).linkPosition, following});
    }
    LinkAll(links);
  } catch (const std::exception&) {
    appender_->CutBackTo(end);
    throw;
  }
}

}  // namespace orin::drivers
