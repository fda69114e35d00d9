/// Files in memory for a target whose code opens files by name.
// SPDX-License-Identifier: MIT
#pragma once

#include <unistd.h>

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>

namespace orin::fuzz {

/// A folder of the process, in memory where the system has such a place; removed at its end.
class ScratchFolder {
 public:
  ScratchFolder() {
    std::error_code ignored;
    const std::filesystem::path memory = "/dev/shm";
    const bool hasMemory = std::filesystem::is_directory(memory, ignored);
    folder_ = (hasMemory ? memory : std::filesystem::temp_directory_path()) /
              ("orin-fuzz-" + std::to_string(getpid()));
    std::filesystem::create_directories(folder_);
  }
  ~ScratchFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(folder_, ignored);
  }
  ScratchFolder(const ScratchFolder&) = delete;
  ScratchFolder& operator=(const ScratchFolder&) = delete;

  std::string Path(const char* name) const { return folder_ / name; }

  /// Makes the file anew with these bytes. \returns its path
  std::string Write(const char* name, const uint8_t* bytes, size_t count) const {
    std::ofstream(folder_ / name, std::ios::binary | std::ios::trunc)
        .write(reinterpret_cast<const char*>(bytes), static_cast<std::streamsize>(count));
    return Path(name);
  }
  void Remove(const char* name) const {
    std::error_code ignored;
    std::filesystem::remove(folder_ / name, ignored);
  }

 private:
  std::filesystem::path folder_;
};

}  // namespace orin::fuzz
