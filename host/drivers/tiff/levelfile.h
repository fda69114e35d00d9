/// The file that holds levels: an image with levels inside, or a side-car, perhaps not made yet.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/drivers/common/positionedfile.h"
#include "host/drivers/tiff/appender.h"
#include "host/drivers/tiff/compactor.h"
#include "host/drivers/tiff/leveldirectories.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

/// Opened for writing by the first change only. A file that is made bears the name `PATH.partial`
/// until its first directory is linked. What a build that was killed left of such a file is
/// deleted.
class LevelFile {
 public:
  /// A file that is there, and that somebody named to be changed.
  /// \throws orin::Exception  it cannot be read as TIFF
  LevelFile(std::string path, bool mayChange);
  /// A file beside an image. Where it is not there it will be made with the image's access: a
  /// classic TIFF unless it becomes big. A link in its place is read, but not written through.
  /// \throws orin::Exception  it is there and cannot be read as TIFF
  static std::unique_ptr<LevelFile> Beside(const std::string& imageFile, std::string path);

  /// The file's name, the final one.
  const std::string& Path() const { return path_; }
  bool MayChange() const { return mayChange_; }
  /// False while there is nothing under the final name.
  bool Exists() const { return isMade_; }
  /// Something was written to a file that is there.
  bool IsChanged() const { return appender_ && isMade_; }
  /// \pre Exists() or something was appended
  const PositionedFile& File() const { return *file_; }
  const TiffStructure& Structure() const { return structure_; }
  /// The file that will be made is a BigTIFF. \pre nothing was appended, and !Exists()
  void BecomeBig() {
    if (!appender_ && !isMade_) structure_.isBig = true;
  }
  /// Reads the structure again.
  void Refresh();

  /// The existing file once more, locked, to change it beside this object.
  /// \throws orin::Exception  it cannot be opened for writing, or must not be written
  std::unique_ptr<PositionedFile> OpenLocked() const;

  /// Ready to append. \throws orin::Exception  the file cannot be opened for writing, or not be
  /// made
  Appender& ToAppend();
  /// Ready to change in place. \throws orin::Exception  as `ToAppend`
  PositionedFile& ToChange();
  /// Changes bytes in place.
  void Overwrite(uint64_t position, const std::string& bytes);
  void Sync();
  /// \see PositionedFile::SetModified
  int64_t SetModified(int64_t nanoseconds);
  /// \see PositionedFile::TakeWasTouched
  bool TakeWasTouched() { return file_ && file_->TakeWasTouched(); }
  /// Makes a directory visible, durably: everything appended before is on the device first. The
  /// structure is read again.
  void Link(const Place& place, uint64_t directory);

  /// Something in the file refers to what was appended so far.
  void Keep();
  /// Gives up what was appended and not kept, everything from `end` on; a file that is not yet made
  /// goes altogether.
  void CutBackTo(uint64_t end);

  /// Whether the file holds free space of this program that is worth to be reclaimed.
  bool HasReclaimableSpace() const;
  /// Whether nothing else has the file open, in this process or another.
  bool IsAlone() const {
    return file_->DoAlone([] {}) == PositionedFile::Alone::kDone;
  }
  /// Relocates levels of this program into its free space and shortens the file by what is free at
  /// its end; not while others have the file open, which may still read levels that were replaced.
  void Reclaim();
  /// Shortens it, whoever has it open, by `given` as well, which nothing refers to any more.
  void CutOff(const ByteRanges& given);
  /// Takes the file away; it counts as not yet made afterwards.
  void Delete();
  /// Takes away what a build that was killed left of a file that is not yet made.
  void DeleteUnfinished();
  /// Makes the link at `position` point at the directory at `offset`, or at none for 0, durably.
  void Relink(uint64_t position, uint64_t offset);

 private:
  LevelFile() = default;
  void OpenForChange();
  void Make();
  void StartAppending();
  void DeclareEdited();
  Compactor CompactorOf() const;
  std::unique_ptr<PositionedFile> OpenUnfinished() const;

  std::string path_;
  std::optional<FileAccess> access_;  ///< of the image that the file stands beside
  bool mayChange_ = false;
  bool isMade_ = false;
  bool mayReuse_ = false;  ///< nobody reads what the file does not refer to
  TiffStructure structure_;
  std::unique_ptr<PositionedFile> file_;
  std::unique_ptr<Appender> appender_;  // null until the first change
};

}  // namespace orin::drivers
