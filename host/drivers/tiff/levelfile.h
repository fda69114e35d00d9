/// The file that holds levels: an image with levels inside, or a side-car, perhaps not made yet.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "host/drivers/tiff/appender.h"
#include "host/drivers/tiff/leveldirectories.h"
#include "host/drivers/tiff/positionedfile.h"
#include "host/drivers/tiff/structure.h"

namespace orin::drivers {

/// Opened for writing by the first change only. A file that is made bears the name `PATH.partial`
/// until its first directory is linked.
class LevelFile {
 public:
  /// A file that is there. \throws orin::Exception  it cannot be read as TIFF
  LevelFile(std::string path, bool mayChange);
  /// A file to be made. \param isBig  as BigTIFF
  static std::unique_ptr<LevelFile> NotYetMade(std::string path, bool isBig);

  /// The file's name, the final one.
  const std::string& Path() const { return path_; }
  bool MayChange() const { return mayChange_; }
  /// False while there is nothing under the final name.
  bool Exists() const { return isMade_; }
  /// \pre Exists() or something was appended
  const PositionedFile& File() const { return *file_; }
  const TiffStructure& Structure() const { return structure_; }
  /// Reads the structure again.
  void Refresh();

  /// Ready to append. \throws orin::Exception  the file cannot be opened for writing, or not be
  /// made
  Appender& ToAppend();
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
  /// Gives up everything from `end` on unless some of it is kept; a file that is not yet made goes
  /// altogether.
  void CutBackTo(uint64_t end);

 private:
  LevelFile() = default;
  void OpenForChange();
  void Make();
  void DeclareEdited();

  std::string path_;
  bool mayChange_ = false;
  bool isMade_ = false;
  TiffStructure structure_;
  std::unique_ptr<PositionedFile> file_;
  std::unique_ptr<Appender> appender_;  // null until the first change
};

}  // namespace orin::drivers
