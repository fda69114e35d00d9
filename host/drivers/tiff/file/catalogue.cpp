// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/file/catalogue.h"

#include <deque>
#include <map>
#include <set>
#include <utility>

#include <tiff.h>

#include "host/drivers/tiff/file/levelfactor.h"
#include "host/drivers/tiff/pagerecord.h"

namespace orin::drivers {
namespace {

constexpr size_t kMaxLevels = 1000;  // an image has a dozen; a damaged chain is cut off

bool Fits(const CatalogueEntry& image, const CatalogueEntry& level) {
  return FactorOf(image.width, image.height, level.width, level.height).has_value();
}

bool HaveSameSize(const CatalogueEntry& a, const CatalogueEntry& b) {
  return a.width == b.width && a.height == b.height;
}

}  // namespace

/// Goes through the chain once.
class Catalogue::Reader {
 public:
  Reader(const PositionedFile& file, const TiffStructure& structure, bool holdsImage)
      : file_(file), structure_(structure), holdsImage_(holdsImage) {}

  void Fill(Catalogue& catalogue) {
    for (size_t i = 0; i < structure_.directories.size(); ++i) Add(i, structure_.directories[i]);
    GiveMasksTheirLevels();
    catalogue.entries_ = std::move(entries_);
    if (!pages_.empty()) catalogue.lastPage_ = pages_.back();
    catalogue.levels_ = std::move(levels_);
    if (holdsImage_) catalogue.subLevels_ = SubLevels(catalogue.entries_[0]);
  }

 private:
  using Size = std::pair<uint32_t, uint32_t>;

  uint64_t Number(const TiffDirectory& directory, uint16_t tag) const {
    return NumberOf(file_, structure_, directory, tag, 0);
  }
  uint64_t Subfile(const TiffDirectory& directory) const;
  void Add(size_t index, const TiffDirectory& directory);
  std::optional<size_t> ImageOfLevel(const CatalogueEntry& level, const TiffDirectory& directory);
  std::optional<size_t> OwnerOfMask(size_t index, bool isReduced);
  void GiveMasksTheirLevels();
  std::vector<SubDirectory> SubLevels(const CatalogueEntry& image) const;

  const PositionedFile& file_;
  const TiffStructure& structure_;
  bool holdsImage_;
  std::vector<CatalogueEntry> entries_;
  std::vector<size_t> levels_;      // of the first image
  std::vector<size_t> pages_;       // the other images so far
  size_t section_ = 0;              // index of the last image; masks belong to what is behind it
  size_t candidates_ = 0;           // levels that fit the first image
  std::map<size_t, size_t> loose_;  // masks that look for a level, and the section of each
};

uint64_t Catalogue::Reader::Subfile(const TiffDirectory& directory) const {
  constexpr uint64_t kOldReduced = 2;  // of the older OldSubfileType tag
  if (directory.Find(TIFFTAG_SUBFILETYPE)) return Number(directory, TIFFTAG_SUBFILETYPE);
  const bool isReduced = Number(directory, TIFFTAG_OSUBFILETYPE) == kOldReduced;
  return isReduced ? uint64_t{FILETYPE_REDUCEDIMAGE} : 0;
}

void Catalogue::Reader::Add(size_t index, const TiffDirectory& directory) {
  const uint64_t subfile = Subfile(directory);
  const bool isReduced = (subfile & FILETYPE_REDUCEDIMAGE) != 0;
  CatalogueEntry entry;
  entry.width = static_cast<uint32_t>(Number(directory, TIFFTAG_IMAGEWIDTH));
  entry.height = static_cast<uint32_t>(Number(directory, TIFFTAG_IMAGELENGTH));
  entries_.push_back(entry);
  CatalogueEntry& added = entries_.back();
  if (holdsImage_ && index == 0) return;
  if ((subfile & FILETYPE_MASK) != 0) {
    added.kind = DirectoryKind::kMask;
    added.owner = OwnerOfMask(index, isReduced);
  } else if (holdsImage_ && !isReduced) {
    pages_.push_back(index);
    section_ = index;
  } else {
    added.kind = DirectoryKind::kLevel;
    added.owner = ImageOfLevel(added, directory);
    const bool isOfFirst = !holdsImage_ || added.owner == size_t{0};
    if (isOfFirst && levels_.size() < kMaxLevels) levels_.push_back(index);
  }
}

std::optional<size_t> Catalogue::Reader::ImageOfLevel(const CatalogueEntry& level,
                                                      const TiffDirectory& directory) {
  if (!holdsImage_) return std::nullopt;
  const bool fitsFirst = Fits(entries_[0], level);
  if (fitsFirst && ++candidates_ > kMaxLevels) return std::nullopt;
  if (!fitsFirst)
    return pages_.empty() || !Fits(entries_[pages_.back()], level) ? std::nullopt
                                                                   : std::optional(pages_.back());
  const bool isNamed = !pages_.empty() && PageNamedIn(file_, structure_, directory) == 1u;
  for (auto page = pages_.rbegin(); !isNamed && page != pages_.rend(); ++page)
    if (Fits(entries_[*page], level)) return *page;
  return 0;
}

/// Of a mask that stands right behind its level or, a whole one, somewhere behind its image. For
/// others the levels behind them have to be known.
std::optional<size_t> Catalogue::Reader::OwnerOfMask(size_t index, bool isReduced) {
  const CatalogueEntry& mask = entries_[index];
  if (holdsImage_ && !isReduced) {
    if (HaveSameSize(entries_[section_], mask)) return section_;
    return std::nullopt;
  }
  if (index > 0 && entries_[index - 1].kind == DirectoryKind::kLevel &&
      HaveSameSize(entries_[index - 1], mask))
    return index - 1;
  loose_[index] = section_;
  return std::nullopt;
}

void Catalogue::Reader::GiveMasksTheirLevels() {
  if (loose_.empty()) return;
  std::set<size_t> masked;
  for (const CatalogueEntry& entry : entries_)
    if (entry.kind == DirectoryKind::kMask && entry.owner) masked.insert(*entry.owner);
  std::map<std::pair<size_t, Size>, std::deque<size_t>> free;  // by section and size
  std::map<std::pair<size_t, Size>, size_t> first;
  size_t section = 0;
  for (size_t i = 0; i < entries_.size(); ++i) {
    const CatalogueEntry& entry = entries_[i];
    if (entry.kind == DirectoryKind::kImage && holdsImage_) section = i;
    if (entry.kind != DirectoryKind::kLevel) continue;
    const std::pair key(section, Size(entry.width, entry.height));
    first.emplace(key, i);
    if (!masked.contains(i)) free[key].push_back(i);
  }
  for (const auto& [mask, itsSection] : loose_) {
    const std::pair key(itsSection, Size(entries_[mask].width, entries_[mask].height));
    std::deque<size_t>& levels = free[key];
    if (!levels.empty()) {
      entries_[mask].owner = levels.front();
      levels.pop_front();
    } else if (const auto any = first.find(key); any != first.end()) {
      entries_[mask].owner = any->second;
    }
  }
}

std::vector<SubDirectory> Catalogue::Reader::SubLevels(const CatalogueEntry& image) const {
  const TiffEntry* entry = structure_.directories[0].Find(TIFFTAG_SUBIFD);
  if (!entry || entry->count > kMaxLevels) return {};
  std::vector<SubDirectory> levels;
  for (const uint64_t offset : ReadNumbers(file_, structure_, *entry)) {
    const auto directory = ReadDirectoryAt(file_, structure_, offset);
    if (!directory || (Subfile(*directory) & FILETYPE_MASK) != 0) continue;
    CatalogueEntry level;
    level.width = static_cast<uint32_t>(Number(*directory, TIFFTAG_IMAGEWIDTH));
    level.height = static_cast<uint32_t>(Number(*directory, TIFFTAG_IMAGELENGTH));
    if (Fits(image, level)) levels.push_back({offset, level.width, level.height});
  }
  return levels;
}

Catalogue::Catalogue(const PositionedFile& file, const TiffStructure& structure, bool holdsImage) {
  if (!structure.directories.empty()) Reader(file, structure, holdsImage).Fill(*this);
}

std::vector<size_t> Catalogue::MasksOf(size_t index) const {
  std::vector<size_t> masks;
  for (size_t i = 0; i < entries_.size(); ++i)
    if (entries_[i].kind == DirectoryKind::kMask && entries_[i].owner == index) masks.push_back(i);
  return masks;
}

std::optional<size_t> Catalogue::MaskOf(size_t index) const {
  const std::vector<size_t> masks = MasksOf(index);
  return masks.empty() ? std::nullopt : std::optional(masks.front());
}

}  // namespace orin::drivers
