/// An ERDAS Imagine file as it would be after a change of its tree.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

#include "host/drivers/common/positionedfile.h"
#include "host/drivers/hfa/hfatreecopy.h"
#include "host/drivers/hfa/libraryfile.h"
#include "host/drivers/hfa/patchedfilesystem.h"

namespace orin::drivers {

/// Shows the library, for reading, levels that are not in the file's tree yet. The file stays as it
/// is; what others change in its tree meanwhile is not seen.
class HfaView final : public ILibraryFile {
 public:
  /// \throws orin::Exception  the file cannot be opened, or its tree is damaged
  HfaView(const std::string& path, const HfaTreeChanges& changes);
  ~HfaView() override { HideFromLibrary(libraryName_); }
  HfaView(const HfaView&) = delete;
  HfaView& operator=(const HfaView&) = delete;

  /// Its last part is the file's own name.
  const std::string& LibraryName() const { return libraryName_; }

  uint64_t Size() const override { return end_ + tree_.size(); }
  size_t Read(uint64_t position, void* bytes, size_t count) override;
  size_t Write(uint64_t, const void*, size_t) override { return 0; }

 private:
  PositionedFile file_;
  uint64_t end_;  ///< of the file; there the changed tree seems to stand
  std::string tree_;
  std::string root_;          ///< the number in the header that leads to it
  uint32_t rootPointer_ = 0;  ///< where it seems to stand
  std::string libraryName_;
};

}  // namespace orin::drivers
