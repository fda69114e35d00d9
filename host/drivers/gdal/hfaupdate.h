/// One change of an ERDAS Imagine file: done as a whole, or not at all.
// SPDX-License-Identifier: MIT
#pragma once

#include <gdal.h>

#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/raster.h"
#include "host/drivers/gdal/patchedfile.h"

namespace orin::drivers {

/// Nothing that was there before changes until `Commit`; without it the file stays, or becomes
/// again, what it was. For one thread at a time.
class HfaUpdate {
 public:
  /// \param overwrites  kDirect for writing over the pixels of levels that are there
  /// \throws orin::Exception  the file cannot be opened for writing
  HfaUpdate(const std::string& path, PatchedFile::Overwrites overwrites);
  ~HfaUpdate();
  HfaUpdate(const HfaUpdate&) = delete;
  HfaUpdate& operator=(const HfaUpdate&) = delete;

  /// Sets a metadata item of the file.
  void SetItem(const std::string& key, const std::string& text);
  /// Adds a level to `channels` (1-based), none of which has it.
  /// \throws orin::Exception  the file already holds a level of the same size, or it cannot be made
  void AddLevel(unsigned level, const std::vector<unsigned>& channels);
  /// Takes all levels of all channels out of the file, and the items of those names.
  /// \throws orin::Exception  they cannot be removed
  void RemoveLevels(const std::vector<std::string>& keys);
  /// The level at `position` of the channel's list.
  GDALRasterBandH LevelBand(unsigned channel, int position) const;
  /// Stores one channel of a block, and where the block ends at the level's last column or row, the
  /// surplus that the format's rounding up makes, by repetition.
  /// \param index   of the channel in the block
  /// \param width   of the level in whole pixels, rounded down
  void WriteBlock(GDALRasterBandH band, const gobs::Raster& block, unsigned index, unsigned width,
                  unsigned height);
  /// Closes the file and makes everything durable. Nothing else may follow.
  /// \throws orin::Exception  something could not be written
  void Commit();

 private:
  void Close();
  void TakeOut(const std::string& key);

  std::string path_;
  PatchedFile file_;
  GDALDatasetH dataset_ = nullptr;
  std::vector<std::string> removedItems_;
};

}  // namespace orin::drivers
