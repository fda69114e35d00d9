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
  if (!before.pixels || before.places.size() != mask.TilesPerPlane()) return false;
  const PixelFormat& there = before.pixels->Format();
  const PixelFormat& wanted = mask.Coding().format;
  return there.tileWidth == wanted.tileWidth && there.tileHeight == wanted.tileHeight;
}

}  // namespace

/// A side-car is written channel by channel: a pixel of its mask is valid when it is in any of the
/// channels of one run.
std::unique_ptr<LevelMaskWriter> TiffLevelStore::BeginMask(unsigned level,
                                                           const std::vector<unsigned>& channels,
                                                           LevelBuild& build) {
  const std::lock_guard lock(mutex_);
  if (!settings_.validity.hasMask || build.mask) return nullptr;
  const StoredLevel* ours = FindOurs(level);
  StoredMask before;
  if (ours && ours->mask) before = OpenStoredMask(file_->File(), file_->Structure(), *ours->mask);
  build.mask = std::make_unique<LevelBuild>(MaskCodingOf(build.Coding()), build.FirstEnd());
  if (!HasTilesOf(before, *build.mask)) before = {};
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
  bool isWhole = true;
  if (image.hasMask && stored->mask)
    readers.push_back(
        OpenTiffMask(file_->Path(), file_->Structure().directories[*stored->mask].offset));
  else if (image.hasMask) isWhole = false;
  const unsigned alpha = image.alphaChannel;
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
