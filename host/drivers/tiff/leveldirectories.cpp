// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/leveldirectories.h"

#include <utility>

#include "host/drivers/tiff/file/levelfactor.h"
#include "host/model/levelsize.h"
#include "host/services/exception.h"

namespace orin::drivers {
namespace {

void ReadMetadata(const PositionedFile& file, const TiffStructure& structure,
                  const TiffDirectory& directory, StoredLevel& stored) {
  const TiffEntry* entry = directory.Find(TIFFTAG_GDAL_METADATA);
  constexpr uint64_t kMostBytes = 1 << 20;  // ours takes a few hundred
  if (!entry || entry->bytes > kMostBytes) return;
  const std::vector<uint8_t> bytes = ReadBytes(file, structure, *entry);
  stored.metadata = ParseLevelMetadata(std::string(bytes.begin(), bytes.end()));
  const auto positionOf = [&](uint64_t at) { return at == 0 ? 0 : entry->position + at; };
  stored.validityPosition = positionOf(stored.metadata.validityAt);
  stored.imagePosition = positionOf(stored.metadata.imageAt);
  stored.contentPosition = positionOf(stored.metadata.contentAt);
}

/// Whether a level of ours says so truly: one of a copied or resized image may not.
bool IsOurs(const StoredLevel& stored, const ImageShape& image) {
  const unsigned level = stored.metadata.level;
  return level >= 2 && stored.metadata.validity.size() == image.samples &&
         model::LevelSizeOf(image.width, image.height, level) ==
             model::LevelSize{stored.format.width, stored.format.height};
}

/// The level that `directory` holds, if it is one of this image.
/// \param factor  of its size
/// \param handle  of the file, opened when it is needed
std::optional<StoredLevel> LevelAt(const PositionedFile& file, const TiffStructure& structure,
                                   const ImageShape& image, const TiffDirectory& directory,
                                   unsigned factor, std::optional<TiffHandle>& handle) {
  StoredLevel stored;
  try {
    if (!handle) handle = TiffHandle::OpenAt(file.Path(), 0);
    handle->MoveTo(directory.offset);
    stored.format = FormatOf(*handle);
  } catch (const OpenFailure&) {
    throw;  // says nothing of the directory, which must not be taken for none
  } catch (const Exception&) {
    return std::nullopt;  // deliberate: what cannot be read is no level, and the rest of the file
                          // is fine
  }
  if (stored.format.samplesPerPixel != image.samples || stored.format.type != image.type)
    return std::nullopt;
  ReadMetadata(file, structure, directory, stored);
  stored.isOurs = IsOurs(stored, image);
  stored.level = stored.isOurs ? stored.metadata.level : factor;
  return stored;
}

}  // namespace

std::vector<StoredLevel> FindLevels(const PositionedFile& file, const TiffStructure& structure,
                                    const Catalogue& catalogue, const ImageShape& image) {
  std::vector<StoredLevel> levels;
  std::optional<TiffHandle> handle;
  for (const size_t index : catalogue.Levels()) {
    const CatalogueEntry& entry = catalogue.At(index);
    const auto factor = FactorOf(image.width, image.height, entry.width, entry.height);
    if (!factor) continue;
    auto stored = LevelAt(file, structure, image, structure.directories[index], *factor, handle);
    if (!stored) continue;
    stored->index = index;
    stored->mask = catalogue.MaskOf(index);
    const bool isMaskApart = stored->mask && *stored->mask != index + 1;
    if (stored->isOurs && isMaskApart) stored->mask.reset();  // ours stand right behind
    levels.push_back(std::move(*stored));
  }
  return levels;
}

std::vector<StoredLevel> FindSubLevels(const PositionedFile& file, const TiffStructure& structure,
                                       const Catalogue& catalogue, const ImageShape& image) {
  std::vector<StoredLevel> levels;
  std::optional<TiffHandle> handle;
  for (const SubDirectory& sub : catalogue.SubLevels()) {
    const auto factor = FactorOf(image.width, image.height, sub.width, sub.height);
    const auto directory = ReadDirectoryAt(file, structure, sub.offset);
    if (!factor || !directory) continue;
    if (auto stored = LevelAt(file, structure, image, *directory, *factor, handle))
      levels.push_back(std::move(*stored));
  }
  return levels;
}

Place PlaceOf(const TiffStructure& structure, size_t index) {
  const auto& directories = structure.directories;
  return {index == 0 ? structure.HeadLinkPosition() : directories[index - 1].linkPosition,
          directories[index].next};
}

Place PlaceOfNew(const TiffStructure& structure, const Catalogue& catalogue,
                 const ImageShape& image, uint32_t width, uint32_t height) {
  const auto& directories = structure.directories;
  // Behind the last page that is known there may be more, and a level would not be found again.
  const size_t begin = structure.isBroken ? 1 : catalogue.NewLevelsBegin();
  size_t index = image.isInFile ? begin : 0;
  for (; index < directories.size(); ++index) {
    const CatalogueEntry& entry = catalogue.At(index);
    if (image.isInFile && entry.kind == DirectoryKind::kImage) break;
    const bool isSmaller = uint64_t{entry.width} * entry.height < uint64_t{width} * height;
    if (entry.kind == DirectoryKind::kLevel && isSmaller) break;
  }
  if (index == 0)
    return {structure.HeadLinkPosition(), directories.empty() ? 0 : directories[0].offset};
  return {directories[index - 1].linkPosition, directories[index - 1].next};
}

}  // namespace orin::drivers
