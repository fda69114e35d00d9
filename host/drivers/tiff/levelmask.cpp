// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelmask.h"

#include <algorithm>
#include <utility>

#include <tiff.h>

#include "basic/gobs/mask/mask.h"

namespace orin::drivers {
namespace {

constexpr uint8_t kUnknown = 2;

uint64_t SubfileOf(const PositionedFile& file, const TiffStructure& structure, size_t index) {
  return NumberOf(file, structure, structure.directories[index], TIFFTAG_SUBFILETYPE, 0);
}

}  // namespace

ImageValidity ValidityOf(datasources::IRasterSource& image) {
  using namespace datasources;
  const unsigned alpha = image.AlphaChannel();
  if (!image.HasMask() && alpha == 0) return {};
  return {image.HasMask(), alpha, [&image, alpha] {
            ValidityReaders readers;
            readers.push_back(image.OpenMask());
            if (alpha != 0) readers.push_back(OpaquePixelsOf(image.OpenReader({alpha})));
            return AllOf(std::move(readers));
          }};
}

LevelCoding MaskCodingOf(const LevelCoding& level) {
  LevelCoding coding;
  PixelFormat& format = coding.format;
  format.width = level.format.width;
  format.height = level.format.height;
  format.tileWidth = level.format.tileWidth;
  format.tileHeight = level.format.tileHeight;
  format.tiled = true;
  format.samplesPerPixel = 1;
  format.type = gobs::eDT_BIT;
  format.bitsPerSample = 1;
  format.sampleFormat = SAMPLEFORMAT_UINT;
  format.compression = COMPRESSION_ADOBE_DEFLATE;
  format.photometric = PHOTOMETRIC_MASK;
  coding.byteOrder = level.byteOrder;
  coding.subfileType = FILETYPE_REDUCEDIMAGE | FILETYPE_MASK;
  return coding;
}

std::vector<NewEntry> MaskEntriesOf(const LevelBuild& mask, bool isBig, bool isFirst) {
  LevelCoding coding = mask.Coding();
  if (isFirst) coding.subfileType = FILETYPE_MASK;
  std::vector<NewEntry> entries = EntriesOf(coding);
  std::vector<uint64_t> offsets, counts;
  for (uint64_t tile = 0; tile < mask.TilesPerPlane(); ++tile) {
    offsets.push_back(mask.PlacesOf(0)[tile].offset);
    counts.push_back(mask.PlacesOf(0)[tile].count);
  }
  const uint16_t type = isBig ? TIFF_LONG8 : TIFF_LONG;
  entries.push_back(NumbersEntry(TIFFTAG_TILEOFFSETS, type, offsets));
  entries.push_back(NumbersEntry(TIFFTAG_TILEBYTECOUNTS, type, counts));
  return entries;
}

std::vector<TypeChange> MaskTypeChanges(const PositionedFile& file,
                                        const TiffStructure& structure) {
  std::vector<TypeChange> changes;
  for (size_t i = 1; i < structure.directories.size(); ++i) {
    const TiffEntry* entry = structure.directories[i].Find(TIFFTAG_SUBFILETYPE);
    const uint64_t now = SubfileOf(file, structure, i);
    if (!entry || entry->type != TIFF_LONG || (now & FILETYPE_MASK) == 0) continue;
    const uint64_t wanted =
        i == 1 ? uint64_t{FILETYPE_MASK} : uint64_t{FILETYPE_MASK | FILETYPE_REDUCEDIMAGE};
    if (now == wanted) continue;
    TypeChange change{entry->position, std::string(4, '\0')};
    structure.byteOrder.Put(wanted, 4, reinterpret_cast<uint8_t*>(change.bytes.data()));
    changes.push_back(std::move(change));
  }
  return changes;
}

StoredMask OpenStoredMask(const PositionedFile& file, const TiffStructure& structure,
                          size_t index) {
  const TiffDirectory& directory = structure.directories[index];
  StoredMask mask;
  const auto pixels =
      std::make_shared<PixelReader>(file.Path(), directory.offset, std::vector<unsigned>{1});
  mask.readTile = [pixels](uint32_t tile, uint8_t* bits) { pixels->ReadTile(tile, bits); };
  mask.format = pixels->Format();
  const auto numbers = [&](uint16_t tag) {
    const TiffEntry* entry = directory.Find(tag);
    return entry ? ReadNumbers(file, structure, *entry) : std::vector<uint64_t>();
  };
  const std::vector<uint64_t> offsets = numbers(TIFFTAG_TILEOFFSETS);
  const std::vector<uint64_t> counts = numbers(TIFFTAG_TILEBYTECOUNTS);
  for (size_t i = 0; i < std::min(offsets.size(), counts.size()); ++i)
    mask.places.push_back({offsets[i], counts[i]});
  return mask;
}

StoredMask OpenAppendedMask(const LevelBuild& mask, const std::string& file,
                            std::function<std::vector<uint8_t>(const TilePlace&)> read) {
  StoredMask appended;
  appended.format = mask.Coding().format;
  appended.places.assign(mask.PlacesOf(0), mask.PlacesOf(0) + mask.TilesPerPlane());
  const TileEncoder encoder(mask.Coding(), file);
  appended.readTile = [=, places = appended.places](uint32_t tile, uint8_t* bits) {
    const std::vector<uint8_t> samples = encoder.Decode(read(places[tile]), 0);
    std::copy(samples.begin(), samples.end(), bits);
  };
  return appended;
}

LevelMaskWriter::LevelMaskWriter(LevelBuild& build, std::string file, StoredMask before, bool joins,
                                 Append append)
    : build_(build),
      encoder_(build.Coding(), std::move(file)),
      before_(std::move(before)),
      joins_(joins),
      append_(std::move(append)) {}

void LevelMaskWriter::Write(const gobs::Raster& block) {
  const PixelFormat& format = build_.Coding().format;
  const uint32_t right = block.x + block.width;
  const uint32_t bottom = block.y + block.height;
  for (uint32_t tileY = block.y / format.tileHeight * format.tileHeight; tileY < bottom;
       tileY += format.tileHeight)
    for (uint32_t tileX = block.x / format.tileWidth * format.tileWidth; tileX < right;
         tileX += format.tileWidth) {
      const uint64_t number =
          tileY / format.tileHeight * format.TilesAcross() + tileX / format.tileWidth;
      auto open = tiles_.find(number);
      if (open == tiles_.end()) {
        build_.Forget(number);
        open = tiles_.emplace(number, MakeTile(tileX, tileY)).first;
      }
      const uint32_t endY = std::min(bottom, tileY + format.tileHeight);
      const uint32_t endX = std::min(right, tileX + format.tileWidth);
      const uint32_t x = std::max(block.x, tileX);
      for (uint32_t y = std::max(block.y, tileY); y < endY; ++y)
        Take(*block.validity, {int64_t{x} - block.x, int64_t{y} - block.y}, endX - x,
             uint64_t{y - tileY} * format.tileWidth + (x - tileX), open->second);
      if (open->second.missing > 0) continue;
      Finish(number, open->second.bits);
      tiles_.erase(open);
    }
}

/// Takes `count` pixels of a line. \param from  the first, in the mask. \param to  in the tile
void LevelMaskWriter::Take(const gobs::Mask& mask, std::pair<int64_t, int64_t> from, uint32_t count,
                           uint64_t to, OpenTile& tile) {
  const gobs::MaskBits isValid{mask.begin, LayoutOf(mask)};
  for (uint32_t i = 0; i < count; ++i) {
    uint8_t& bit = tile.bits[to + i];
    tile.missing -= bit == kUnknown ? 1 : 0;
    bit = isValid(from.first + i, from.second) ? 1 : 0;
  }
}

LevelMaskWriter::OpenTile LevelMaskWriter::MakeTile(uint32_t tileX, uint32_t tileY) const {
  const PixelFormat& format = build_.Coding().format;
  const uint32_t width = std::min(format.tileWidth, format.width - tileX);
  const uint32_t height = std::min(format.tileHeight, format.height - tileY);
  OpenTile tile{std::vector<uint8_t>(build_.Coding().TileBytes()), uint64_t{width} * height};
  for (uint32_t row = 0; row < height; ++row)
    std::fill_n(tile.bits.begin() + int64_t{row} * format.tileWidth, width, kUnknown);
  return tile;
}

void LevelMaskWriter::Finish(uint64_t tile, std::vector<uint8_t>& bits) {
  if (before_.readTile) {
    std::vector<uint8_t> stored(bits.size());
    before_.readTile(static_cast<uint32_t>(tile), stored.data());
    if (joins_)
      std::transform(bits.begin(), bits.end(), stored.begin(), bits.begin(),
                     [](uint8_t a, uint8_t b) { return static_cast<uint8_t>(a | b); });
    if (bits == stored) {
      build_.Record(tile, before_.places[tile]);
      return;
    }
  }
  build_.Record(tile, append_(encoder_.Encode(bits, 0)));
}

}  // namespace orin::drivers
