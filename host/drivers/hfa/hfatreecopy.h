/// Changes of an ERDAS Imagine file's tree that all show at once.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "host/drivers/hfa/hfanodecopy.h"

namespace orin::drivers {

/// What is to be different. Levels that no list of their channel names, left by a removal that did
/// not end, go in any case where an item of ours tells of them.
struct HfaTreeChanges {
  /// Factors of the levels that go from all channels, and the names of items that go.
  std::vector<unsigned> removedLevels = {};
  std::vector<std::string> removedItems = {};
  /// The nodes, which stand in the file and in no list, that become the level `level` of their
  /// channels (1-based), in the place of what is that level now.
  unsigned level = 0;
  std::map<unsigned, uint32_t> parts = {};
  /// Texts of metadata items of the file: another one for an item that is there, or a new item.
  std::map<std::string, std::string> items = {};
};

/// The tree of a file as it is after some changes, to stand elsewhere in the file. Every node is
/// copied, so that each knows its parent and its neighbours; data is copied where it changes.
///
///     before   header ──► root ──► Layer_1 ──► Layer_2 ...     all as other programs know it
///
///     after    header ─┐  root ──► Layer_1 ──► Layer_2 ...     for those that have the file open
///                      └────────────────────────────────► root' ──► Layer_1' ──► Layer_2' ...
///
/// Safe by its order: first the copy, behind the end of the file, and a sync; then the number in
/// the header, 4 bytes in one write, with which all channels change; then a sync. Until that write
/// nothing leads to the copy, from it on nothing leads to the old nodes. Both may be read as long
/// as nobody reuses their bytes, see `HfaCompactor`.
class HfaTreeCopy {
 public:
  /// \param libraryName  of a file: what is copied may be what waits in a `PatchedFile`
  /// \param fileName     the file's own name without folder, for the lists of levels
  /// \throws orin::Exception  the tree is damaged
  HfaTreeCopy(const std::string& libraryName, const std::string& fileName,
              const HfaTreeChanges& changes);

  /// Where the header keeps the number that leads to the root.
  uint32_t RootPointer() const { return rootPointer_; }
  /// The nodes with the data that is theirs alone; the root stands first.
  std::string BytesAt(uint32_t position) const;

 private:
  uint32_t rootPointer_ = 0;
  std::unique_ptr<HfaNodeCopy> root_;
};

/// Makes the changes, durably. \throws orin::Exception  the tree cannot be read or written: none is
///                                                      made
void ChangeHfaTree(const std::string& path, const HfaTreeChanges& changes);

/// Whether there is a level `factor` in the tree that no list names, beside levels that one does.
bool HasUnlistedHfaLevel(const std::string& path, unsigned factor);

}  // namespace orin::drivers
