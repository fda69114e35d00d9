/// A TIFF file in memory, for libtiff to write tiles into.
// SPDX-License-Identifier: MIT
#pragma once

#include <bit>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <tiffio.h>

namespace orin::drivers {

/// What libtiff reports stays with the object. Not for two threads at once.
class MemoryTiff {
 public:
  /// \param file  named in error texts
  MemoryTiff(std::endian order, std::string file);
  MemoryTiff(const MemoryTiff&) = delete;
  MemoryTiff& operator=(const MemoryTiff&) = delete;

  TIFF* Get() const { return tiff_.get(); }
  /// The stored bytes of a tile that was written. \throws orin::Exception  it was not
  std::vector<uint8_t> StoredTile(uint32_t tile) const;
  /// Throws "FILE: a tile cannot be encoded: REASON." with libtiff's first complaint.
  [[noreturn]] void Fail() const;

 private:
  struct Cleaner {
    void operator()(TIFF* tiff) const { TIFFCleanup(tiff); }  // no directory is wanted
  };
  struct Contents {
    std::vector<uint8_t> bytes;
    uint64_t position = 0;
    std::string error;
    bool wantsMemory = false;  ///< no exception may pass through libtiff
  };

  static tmsize_t Read(thandle_t handle, void* buffer, tmsize_t size);
  static tmsize_t Write(thandle_t handle, void* buffer, tmsize_t size);
  static toff_t Seek(thandle_t handle, toff_t offset, int whence);
  static toff_t Size(thandle_t handle);
  static int Close(thandle_t handle);
  static int KeepError(TIFF* tiff, void* contents, const char* module, const char* format,
                       va_list arguments);

  std::string file_;
  std::unique_ptr<Contents> contents_;
  std::unique_ptr<TIFF, Cleaner> tiff_;
};

}  // namespace orin::drivers
