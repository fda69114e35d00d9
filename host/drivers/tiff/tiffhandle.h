/// One open libtiff handle for reading, whose complaints become exceptions.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include <tiffio.h>

#include "host/services/exception.h"

namespace orin::drivers {

/// The system does not open the file, whatever is in it.
class OpenFailure : public Exception {
 public:
  explicit OpenFailure(const std::string& message);
};

/// Nothing is printed: what libtiff reports stays with the handle. Not for two threads at once.
class TiffHandle {
 public:
  /// Bytes; what a file wants more for is not read.
  static constexpr tmsize_t kLargestAllocation = tmsize_t{1} << 30;

  /// Opens `path` at one of its directories.
  /// \param directoryOffset  in bytes from the file's start; 0 is the first directory
  /// \throws orin::Exception  not a TIFF file, or the directory cannot be read; an OpenFailure when
  ///                          the file cannot be opened at all
  static TiffHandle OpenAt(const std::string& path, uint64_t directoryOffset);

  /// Goes to another directory of the main chain. On a handle's first move libtiff walks the whole
  /// chain, so that many directories are looked at through one handle.
  /// \throws orin::Exception  the directory cannot be read; the handle can still move elsewhere
  void MoveTo(uint64_t directoryOffset);

  TIFF* Get() const { return tiff_.get(); }
  const std::string& Path() const { return path_; }
  /// The file's descriptor, for positioned reads. Belongs to the handle.
  int Descriptor() const { return TIFFFileno(tiff_.get()); }
  /// Bytes that the file had when it was opened.
  uint64_t FileSize() const { return fileSize_; }

  /// Forgets what libtiff has reported so far.
  void ClearErrors() { errors_->clear(); }
  /// The first error that libtiff reported since then; empty when there was none.
  const std::string& FirstError() const { return *errors_; }

  /// Text of an ASCII tag, without what follows its first NUL; empty when it is absent or no text.
  std::string TextOf(uint32_t tag) const;

 private:
  struct Closer {
    void operator()(TIFF* tiff) const { TIFFClose(tiff); }
  };

  explicit TiffHandle(const std::string& path);

  std::string path_;
  std::unique_ptr<std::string> errors_;  // before tiff_: closing may still report
  std::unique_ptr<TIFF, Closer> tiff_;
  uint64_t fileSize_ = 0;
};

/// Throws "FILE: cannot be read: REASON."
[[noreturn]] void FailToRead(const std::string& path, std::string reason);

}  // namespace orin::drivers
