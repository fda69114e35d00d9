/// The last change to a file with levels: it says how the file itself looks from then on.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <vector>

#include "host/drivers/tiff/leveldirectories.h"

namespace orin::drivers {

///   1. the file's time is set, to learn how the file system keeps it
///   2. stamps with that time go over those in the records
///   3. the file is synced: a page that somebody has mapped shows the next write to it
///   4. the time is set again. Whatever is written from here on gives the file another one
///   5. image and levels are read: what was written before the fourth step is found here
///   6. where something differs, blank stamps go over those of the second step
///
/// A kill between the fourth step and the last leaves stamps that were not verified; all that was
/// then written between the second and the fourth would go unseen.
class StampCommit {
 public:
  /// \param file  open for changes, of that structure; both outlive this object
  StampCommit(PositionedFile& file, const TiffStructure& structure)
      : file_(file), structure_(structure) {}

  /// \param level  of ours, as the file's structure has it; passed over when its record has no
  ///               place for stamps
  void Add(const StoredLevel& level);

  /// \param image       of an image beside the file; none: the image stands in the file
  /// \param companions  of an image in the file
  /// \param modified    the time to set, nanoseconds since 1970
  /// \param holds       the image is what the records say
  /// \returns whether stamps stand in the file now
  /// \throws orin::Exception  it cannot be written
  bool Run(const std::optional<model::ImageStamp>& image, uint64_t companions, int64_t modified,
           const std::function<bool()>& holds);

 private:
  bool AreAllCommitted(const std::optional<model::ImageStamp>& image, uint64_t companions) const;
  int64_t SetTime(int64_t modified);
  void Overwrite(uint64_t position, const std::string& text);
  void WriteStamps(const model::ImageStamp& image, const model::FileStamp& holder);
  bool AreLevelsWhole() const;

  PositionedFile& file_;
  const TiffStructure& structure_;
  std::vector<StoredLevel> levels_;
};

}  // namespace orin::drivers
