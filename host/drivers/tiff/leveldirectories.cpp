// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/leveldirectories.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "host/model/levelsize.h"
#include "host/services/exception.h"

namespace orin::drivers {
namespace {

constexpr size_t kMostCandidates = 1000;  // an image has a dozen levels; a damaged chain is cut off

struct Range {
  uint64_t low;
  uint64_t high;
};

/// The factors that turn `size` into `levelSize`, rounding down or up.
Range FactorsOf(uint32_t size, uint32_t levelSize) {
  const uint64_t low =
      uint64_t{size} / (uint64_t{levelSize} + 1) + 1;  // rounding down gives levelSize
  if (levelSize <= 1) return {low, std::numeric_limits<uint32_t>::max()};
  const uint64_t below = levelSize - 1;
  return {low, (size + below - 1) / below - 1};  // rounding up still gives levelSize
}

uint32_t Size(const PositionedFile& file, const TiffStructure& structure,
              const TiffDirectory& directory, uint16_t tag) {
  return static_cast<uint32_t>(NumberOf(file, structure, directory, tag, 0));
}

uint64_t Subfile(const PositionedFile& file, const TiffStructure& structure,
                 const TiffDirectory& directory) {
  constexpr uint64_t kOldReduced = 2;  // of the older OldSubfileType tag
  const bool isOldReduced =
      !directory.Find(TIFFTAG_SUBFILETYPE) &&
      NumberOf(file, structure, directory, TIFFTAG_OSUBFILETYPE, 0) == kOldReduced;
  return isOldReduced ? uint64_t{FILETYPE_REDUCEDIMAGE}
                      : NumberOf(file, structure, directory, TIFFTAG_SUBFILETYPE, 0);
}

bool IsMask(uint64_t subfile) { return (subfile & FILETYPE_MASK) != 0; }
bool IsReduced(uint64_t subfile) { return (subfile & FILETYPE_REDUCEDIMAGE) != 0; }

void ReadMetadata(const PositionedFile& file, const TiffStructure& structure,
                  const TiffDirectory& directory, StoredLevel& stored) {
  const TiffEntry* entry = directory.Find(TIFFTAG_GDAL_METADATA);
  constexpr uint64_t kMostBytes = 1 << 20;  // ours takes a few hundred
  if (!entry || entry->bytes > kMostBytes) return;
  const std::vector<uint8_t> bytes = ReadBytes(file, structure, *entry);
  stored.metadata = ParseLevelMetadata(std::string(bytes.begin(), bytes.end()));
  stored.validityPosition = entry->position + stored.metadata.validityAt;
  stored.imagePosition = entry->position + stored.metadata.imageAt;
}

/// Whether a level of ours says so truly: one of a copied or resized image may not.
bool IsOurs(const StoredLevel& stored, const ImageShape& image) {
  const unsigned level = stored.metadata.level;
  return level >= 2 && stored.metadata.validity.size() == image.samples &&
         model::LevelSizeOf(image.width, image.height, level) ==
             model::LevelSize{stored.format.width, stored.format.height};
}

/// The level that directory `index` holds, if it is one of this image.
/// \param factor  of its size
/// \param handle  of the file, opened when it is needed
std::optional<StoredLevel> LevelAt(const PositionedFile& file, const TiffStructure& structure,
                                   const ImageShape& image, size_t index, unsigned factor,
                                   std::optional<TiffHandle>& handle) {
  StoredLevel stored;
  stored.index = index;
  const TiffDirectory& directory = structure.directories[index];
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

std::optional<unsigned> FactorOf(uint32_t width, uint32_t height, uint32_t levelWidth,
                                 uint32_t levelHeight) {
  if (levelWidth == 0 || levelHeight == 0 || levelWidth > width || levelHeight > height)
    return std::nullopt;
  const Range x = FactorsOf(width, levelWidth);
  const Range y = FactorsOf(height, levelHeight);
  const uint64_t low = std::max<uint64_t>({x.low, y.low, 2});
  const uint64_t high = std::min(x.high, y.high);
  if (low > high) return std::nullopt;
  const double ratio = width >= height ? double(width) / levelWidth : double(height) / levelHeight;
  std::optional<unsigned> best;
  for (uint64_t power = 2; power <= high; power *= 2)
    if (power >= low && (!best || std::abs(double(power) - ratio) < std::abs(*best - ratio)))
      best = static_cast<unsigned>(power);
  if (best) return best;
  return static_cast<unsigned>(
      std::clamp<uint64_t>(static_cast<uint64_t>(std::llround(ratio)), low, high));
}

std::vector<StoredLevel> FindLevels(const PositionedFile& file, const TiffStructure& structure,
                                    const ImageShape& image) {
  std::vector<StoredLevel> levels;
  std::vector<std::pair<uint32_t, uint32_t>> otherImages;
  std::optional<TiffHandle> handle;
  size_t candidates = 0;
  for (size_t i = image.isInFile ? 1 : 0; i < structure.directories.size(); ++i) {
    const TiffDirectory& directory = structure.directories[i];
    const uint64_t subfile = Subfile(file, structure, directory);
    const uint32_t width = Size(file, structure, directory, TIFFTAG_IMAGEWIDTH);
    const uint32_t height = Size(file, structure, directory, TIFFTAG_IMAGELENGTH);
    if (IsMask(subfile)) continue;
    if (image.isInFile && !IsReduced(subfile)) {
      otherImages.emplace_back(width, height);
      continue;
    }
    const auto factor = FactorOf(image.width, image.height, width, height);
    if (!factor) continue;
    if (++candidates > kMostCandidates) break;
    const bool belongsToOther =
        std::any_of(otherImages.begin(), otherImages.end(), [&](const auto& other) {
          return FactorOf(other.first, other.second, width, height).has_value();
        });
    if (belongsToOther) continue;
    if (auto stored = LevelAt(file, structure, image, i, *factor, handle))
      levels.push_back(std::move(*stored));
  }
  return levels;
}

Place PlaceOf(const TiffStructure& structure, size_t index) {
  const auto& directories = structure.directories;
  return {index == 0 ? structure.HeadLinkPosition() : directories[index - 1].linkPosition,
          directories[index].next};
}

Place PlaceOfNew(const PositionedFile& file, const TiffStructure& structure,
                 const ImageShape& image, uint32_t width, uint32_t height) {
  const auto& directories = structure.directories;
  size_t index = image.isInFile ? 1 : 0;
  for (; index < directories.size(); ++index) {
    const uint64_t subfile = Subfile(file, structure, directories[index]);
    if (IsMask(subfile)) continue;  // of the image or of the level before it
    if (image.isInFile && !IsReduced(subfile)) break;
    const uint64_t area = uint64_t{Size(file, structure, directories[index], TIFFTAG_IMAGEWIDTH)} *
                          Size(file, structure, directories[index], TIFFTAG_IMAGELENGTH);
    if (area < uint64_t{width} * height) break;
  }
  if (index == 0)
    return {structure.HeadLinkPosition(), directories.empty() ? 0 : directories[0].offset};
  return {directories[index - 1].linkPosition, directories[index - 1].next};
}

}  // namespace orin::drivers
