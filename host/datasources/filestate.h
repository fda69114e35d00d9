/// What the file system tells of a file, made to tell every later change.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace orin::datasources {

struct FileState {
  uint64_t bytes = 0;
  int64_t modified = 0;  ///< nanoseconds since 1970
  int64_t changed = 0;   ///< status change time, nanoseconds since 1970
  uint64_t inode = 0;

  friend bool operator==(const FileState&, const FileState&) = default;
};

/// None for what is no regular file.
std::optional<FileState> StateOf(const std::string& path);

/// The state, such that whoever writes to the file from now on changes it. Two things would hide a
/// write: a page that a program has mapped and written to before takes further writes without a
/// trace until it is on the disk, and two writes within one tick of the system's clock get one
/// time. So the file is synced, and a tick is waited for where its last change is that young.
/// File systems in memory have no disk: there mapped pages stay unseen.
std::optional<FileState> SettledStateOf(const std::string& path);

}  // namespace orin::datasources
