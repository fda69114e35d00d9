/// Who may read and write a file: what a file made beside an image has in common with the image.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include <sys/types.h>

namespace orin::drivers {

/// Mode, group and access list of a file.
class FileAccess {
 public:
  /// That of the file at `path`. Where there is none, it is what this process gives to new files.
  static FileAccess Of(const std::string& path);

  /// The mode to make a file with, until ApplyTo: nobody else may open it meanwhile.
  mode_t ModeToBeginWith() const;

  /// Whether the owner of another file, which belongs to `group`, may read what this one holds.
  bool LetsRead(uid_t user, gid_t group) const;
  /// Gives a file that this process has made, and that holds nothing yet, the same access. Its
  /// owner may always read and write it, to resume work. Where the group or the list cannot be set,
  /// the group has no access.
  void ApplyTo(int descriptor) const;

 private:
  bool isKnown_ = false;
  mode_t mode_ = 0;  ///< permission bits
  uid_t owner_ = 0;
  gid_t group_ = 0;
  std::vector<char> list_;  ///< POSIX access list; empty: none
};

}  // namespace orin::drivers
