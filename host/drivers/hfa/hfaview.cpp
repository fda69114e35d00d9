// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfaview.h"

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <string_view>

namespace orin::drivers {
namespace {

/// Copies what `there`, which begins at `start`, has of the bytes from `position` on.
void Cover(uint64_t position, char* bytes, size_t count, uint64_t start, std::string_view there) {
  const uint64_t first = std::max(position, start);
  const uint64_t last = std::min(position + count, start + there.size());
  if (first < last) std::memcpy(bytes + (first - position), &there[first - start], last - first);
}

}  // namespace

HfaView::HfaView(const std::string& path, const HfaTreeChanges& changes)
    : file_(path, PositionedFile::Mode::kRead), end_(file_.Size()), root_(4, '\0') {
  const std::string fileName = std::filesystem::path(path).filename().string();
  const HfaTreeCopy copy(path, fileName, changes);
  rootPointer_ = copy.RootPointer();
  PutHfaNumber(root_, 0, static_cast<uint32_t>(end_));
  tree_ = copy.BytesAt(static_cast<uint32_t>(end_));
  libraryName_ = ShowToLibrary(*this, fileName);
}

size_t HfaView::Read(uint64_t position, void* bytes, size_t count) {
  auto* to = static_cast<char*>(bytes);
  count = static_cast<size_t>(std::min<uint64_t>(count, Size() - std::min(position, Size())));
  const size_t inFile = position < end_ ? std::min<uint64_t>(count, end_ - position) : 0;
  const size_t got = inFile > 0 ? file_.ReadUpTo(position, bytes, inFile).bytes : 0;
  if (got < inFile) return got;
  Cover(position, to, count, end_, tree_);
  Cover(position, to, count, rootPointer_, root_);
  return count;
}

}  // namespace orin::drivers
