/// One change of an ERDAS Imagine file: done as a whole, or not at all.
// SPDX-License-Identifier: MIT
#pragma once

#include <gdal.h>

#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/raster.h"
#include "host/drivers/gdal/hfablocks.h"
#include "host/drivers/gdal/patchedfile.h"

namespace orin::drivers {

/// Nothing that was there before changes until `Commit`; without it the file stays, or becomes
/// again, what it was. For one thread at a time.
class HfaUpdate {
 public:
  /// \param renewed  of levels whose pixels get a new place, where they are all written anew
  /// \throws orin::Exception  the file cannot be opened for writing
  explicit HfaUpdate(const std::string& path, const std::vector<HfaBlockMap>& renewed = {});
  ~HfaUpdate();
  HfaUpdate(const HfaUpdate&) = delete;
  HfaUpdate& operator=(const HfaUpdate&) = delete;

  /// Sets a metadata item of the file.
  void SetItem(const std::string& key, const std::string& text);
  /// Adds a level to `channels` (1-based), none of which has it.
  /// \throws orin::Exception  the file already holds a level of the same size, or it cannot be made
  void AddLevel(unsigned level, const std::vector<unsigned>& channels);
  /// Puts another text of the same length into the item, at once and durably, before everything
  /// else. \throws orin::Exception  there is no such item, or it cannot be written
  void OverwriteItem(const std::string& key, const std::string& text);
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

  std::string path_;
  PatchedFile file_;
  GDALDatasetH dataset_ = nullptr;
};

}  // namespace orin::drivers
