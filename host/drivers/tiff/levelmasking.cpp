/// The level store's dealings with masks: which to write with a level, which to read with it.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <utility>

#include "host/drivers/tiff/levelwriter.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/drivers/tiff/tiffmask.h"

namespace orin::drivers {
namespace {

/// False when tiles of the mask that is there cannot take the place of new ones.
bool HasTilesOf(const StoredMask& before, const LevelBuild& mask) {
  if (!before.readTile || before.places.size() != mask.TilesPerPlane()) return false;
  const PixelFormat& there = before.format;
  const PixelFormat& wanted = mask.Coding().format;
  return there.tileWidth == wanted.tileWidth && there.tileHeight == wanted.tileHeight;
}

}  // namespace

/// Whether a level of that form holds opacity, and not as it was written.
bool TiffLevelStore::BlursAlpha(const PixelFormat& level) const {
  return settings_.validity.alphaChannel != 0 && level.compression == COMPRESSION_JPEG;
}

/// Whether a level of that form is to have a mask: its image has one, or its alpha does not tell
/// what holds data.
bool TiffLevelStore::GetsMask(const PixelFormat& level) const {
  return settings_.validity.hasMask || BlursAlpha(level);
}

/// The mask that the new one joins or replaces: that of the channels that wait, else the one that
/// the level has in the file, as far as its tiles can take the place of new ones.
StoredMask TiffLevelStore::MaskBefore(unsigned level, const LevelBuild& mask) {
  StoredMask before;
  const StoredLevel* ours = FindOurs(level);
  const auto pending = pending_.find(level);
  if (pending != pending_.end() && pending->second.waitingMask)
    before = OpenAppendedMask(*pending->second.waitingMask, file_->Path(),
                              [this](const TilePlace& place) { return ReadAppended(place); });
  else if (ours && ours->mask)
    before = OpenStoredMask(file_->File(), file_->Structure(), *ours->mask);
  return HasTilesOf(before, mask) ? std::move(before) : StoredMask();
}

/// A side-car is written channel by channel: a pixel of its mask is valid when it is in any of the
/// channels of one run.
std::unique_ptr<LevelMaskWriter> TiffLevelStore::BeginMask(unsigned level,
                                                           const std::vector<unsigned>& channels,
                                                           LevelBuild& build) {
  const std::lock_guard lock(mutex_);
  const bool isWritten = build.mask && build.writers > 1;  // else who wrote it has left
  if (!GetsMask(build.Coding().format) || isWritten) return nullptr;
  build.mask = std::make_unique<LevelBuild>(MaskCodingOf(build.Coding()), build.FirstEnd());
  StoredMask before = MaskBefore(level, *build.mask);
  std::vector<unsigned>& done = maskedChannels_[level];
  const bool joins =
      !done.empty() && std::none_of(channels.begin(), channels.end(), [&](unsigned c) {
        return std::find(done.begin(), done.end(), c) != done.end();
      });
  if (!joins) done.clear();
  done.insert(done.end(), channels.begin(), channels.end());
  return std::make_unique<LevelMaskWriter>(
      *build.mask, file_->Path(), std::move(before), joins,
      [this](const std::vector<uint8_t>& bytes) { return AppendTile(bytes); });
}

/// What the level does not hold of its image's mask and alpha is taken from the image.
LevelValidity TiffLevelStore::OpenValidity(unsigned level, const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  const ImageValidity& image = settings_.validity;
  const StoredLevel* stored = Find(level);
  LevelValidity validity;
  if (!stored || !image.open) return validity;
  datasources::ValidityReaders readers;
  const bool isMasked = GetsMask(stored->format);
  bool isWhole = !isMasked || stored->mask;
  if (isMasked && stored->mask)
    readers.push_back(
        OpenTiffMask(file_->Path(), file_->Structure().directories[*stored->mask].offset));
  const unsigned alpha = BlursAlpha(stored->format) ? 0 : image.alphaChannel;
  const auto found = std::find(channels.begin(), channels.end(), alpha);
  if (alpha != 0 && stored->isOurs && stored->metadata.validity[alpha - 1] == kAbsent)
    isWhole = false;
  else if (found != channels.end())
    validity.alphaPosition = static_cast<uint32_t>(found - channels.begin());
  else if (alpha != 0)
    readers.push_back(datasources::OpaquePixelsOf(std::make_unique<LevelWriter>(
        *this, file_->Path(), level, std::vector<unsigned>{alpha}, stored->format)));
  if (!isWhole)
    readers.push_back(
        datasources::CentresOf(image.open(), level, stored->format.width, stored->format.height));
  validity.reader = datasources::AllOf(std::move(readers));
  return validity;
}

}  // namespace orin::drivers
