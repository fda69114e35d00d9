/// Pixels of a level of an ERDAS Imagine file, written by the library where no tree leads to.
// SPDX-License-Identifier: MIT
#pragma once

#include <gdal.h>

#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/raster.h"
#include "host/drivers/hfa/hfablocks.h"
#include "host/drivers/hfa/patchedfile.h"

namespace orin::drivers {

/// The library writes them behind the end of the file; what it changes in the file's tree stays in
/// memory. What was written becomes a part that a change of the tree can make a level of the file,
/// or goes with the object. For one thread at a time.
class HfaUpdate {
 public:
  /// \param renewed  of levels whose pixels get a new place, where they are all written anew
  /// \throws orin::Exception  the file cannot be opened for writing
  explicit HfaUpdate(const std::string& path, const std::vector<HfaBlockMap>& renewed = {});
  ~HfaUpdate();
  HfaUpdate(const HfaUpdate&) = delete;
  HfaUpdate& operator=(const HfaUpdate&) = delete;

  /// Adds a level to `channels` (1-based), none of which has it.
  /// \throws orin::Exception  the file already holds a level of the same size, or it cannot be made
  void AddLevel(unsigned level, const std::vector<unsigned>& channels);
  /// The level at `position` of the channel's list.
  GDALRasterBandH LevelBand(unsigned channel, int position) const;
  /// Stores one channel of a block, and where the block ends at the level's last column or row, the
  /// surplus that the format's rounding up makes, by repetition.
  /// \param index   of the channel in the block
  /// \param width   of the level in whole pixels, rounded down
  void WriteBlock(GDALRasterBandH band, const gobs::Raster& block, unsigned index, unsigned width,
                  unsigned height);
  /// Closes the file for the library. Only `AppendPart` and `Keep` may follow.
  /// \throws orin::Exception  something could not be written
  void Finish();
  /// Appends the channel's level once more, as a node with what belongs to it. Its pixels are those
  /// that were written. \returns where it stands
  uint32_t AppendPart(unsigned channel, unsigned level);
  /// Makes the parts durable, which stay in the file from then on.
  /// \throws orin::Exception  something could not be written
  void Keep();

 private:
  void Close();

  std::string path_;
  PatchedFile file_;
  GDALDatasetH dataset_ = nullptr;
};

}  // namespace orin::drivers
