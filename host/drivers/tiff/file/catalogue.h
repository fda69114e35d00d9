/// What each directory of a TIFF file is: image, level or mask, and of which image. Decided here,
/// once for each structure that is read.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

enum class DirectoryKind {
  kImage,  ///< the file's image, or another page
  kLevel,  ///< a reduced image
  kMask    ///< which pixels of an image or level hold data
};

struct CatalogueEntry {
  DirectoryKind kind = DirectoryKind::kImage;
  uint32_t width = 0;   ///< pixels
  uint32_t height = 0;  ///< pixels
  /// Index of the image that a level was made from, or of what a mask is the mask of; none where
  /// nothing in the file fits. The levels of a side-car belong to none in it.
  std::optional<size_t> owner;
};

/// A directory outside the chain, within the image's own.
struct SubDirectory {
  uint64_t offset = 0;
  uint32_t width = 0;   ///< pixels
  uint32_t height = 0;  ///< pixels
};

/// Directories are named by their index in the chain.
///
/// A level belongs to the first image where it fits that one and either no page before the level,
/// or its record names that image; otherwise to the nearest page before it that it fits. A mask
/// belongs to what stands right before it and has its size; else a whole one to the last image
/// before it, and a reduced one to the first level of its size behind that image, those without a
/// mask before others.
class Catalogue {
 public:
  /// \param holdsImage  the first directory is an image; else all images are levels of one that is
  ///                    in another file
  Catalogue(const PositionedFile& file, const TiffStructure& structure, bool holdsImage);

  const CatalogueEntry& At(size_t index) const { return entries_[index]; }
  size_t Size() const { return entries_.size(); }
  /// The levels of the file's first image, or of the one in another file, in their order. No more
  /// than the first thousand.
  const std::vector<size_t>& Levels() const { return levels_; }
  /// The first mask of that image or level.
  std::optional<size_t> MaskOf(size_t index) const;
  /// All of them.
  std::vector<size_t> MasksOf(size_t index) const;
  /// Whether there are images behind the first one.
  bool HasPages() const { return lastPage_ != 0; }
  /// Index from which on new levels of the first image stand: behind it or, where other programs
  /// count the directories as pages, behind the last page.
  size_t NewLevelsBegin() const { return lastPage_ + 1; }
  /// Reduced images inside the first image's directory (SUBIFD) that fit it.
  const std::vector<SubDirectory>& SubLevels() const { return subLevels_; }

 private:
  class Reader;

  std::vector<CatalogueEntry> entries_;
  std::vector<size_t> levels_;
  std::vector<SubDirectory> subLevels_;
  size_t lastPage_ = 0;  ///< its index; 0 where there is none
};

}  // namespace orin::drivers
