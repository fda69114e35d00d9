// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/patchedfile.h"

#include <algorithm>
#include <cstring>
#include <exception>
#include <filesystem>
#include <utility>

#include "host/drivers/hfa/patchedfilesystem.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

PatchedFile::PatchedFile(std::string path)
    : file_(std::move(path), PositionedFile::Mode::kUpdate), end_(file_.Size()), size_(end_) {
  libraryName_ = ShowToLibrary(*this, std::filesystem::path(file_.Path()).filename().string());
}

PatchedFile::~PatchedFile() {
  HideFromLibrary(libraryName_);
  try {
    if (!isKept_ && size_ > end_) file_.Truncate(end_);
  } catch (...) {
    // deliberate: what is left behind is at the file's end, and nothing refers to it
  }
}

void PatchedFile::FailToWrite() const {
  throw Exception(FormatString(_("%s: cannot be written: %s. Free space or change the permissions, "
                                 "then run again."),
                               file_.Path().c_str(), std::strerror(error_)),
                  "host/drivers/hfa/patchedfile", "PatchedFile", 0);
}

PatchedFile::Page& PatchedFile::PageAt(uint64_t number) {
  const auto [entry, isNew] = pages_.try_emplace(number);
  if (isNew) {
    entry->second.fill(0);
    const Transfer done = file_.ReadUpTo(number * kPageBytes, entry->second.data(), kPageBytes);
    if (done.error != 0) error_ = done.error;
  }
  return entry->second;
}

bool PatchedFile::PutThrough(uint64_t position, const char* bytes, size_t count) {
  const Transfer done = file_.WriteUpTo(position, bytes, count);
  if (done.bytes > 0) size_ = std::max(size_, position + done.bytes);
  if (error_ == 0) error_ = done.error;
  return done.error == 0;
}

size_t PatchedFile::Write(uint64_t position, const void* bytes, size_t count) {
  const auto* from = static_cast<const char*>(bytes);
  size_t done = 0;
  while (done < count && position + done < end_) {
    const uint64_t at = position + done;
    const size_t inPage = at % kPageBytes;
    const size_t part = std::min({count - done, kPageBytes - inPage, size_t(end_ - at)});
    std::memcpy(PageAt(at / kPageBytes).data() + inPage, from + done, part);
    done += part;
  }
  if (done < count && !PutThrough(position + done, from + done, count - done)) return done;
  return error_ == 0 ? count : 0;
}

void PatchedFile::WriteNow(uint64_t position, const void* bytes, size_t count) {
  const auto* from = static_cast<const char*>(bytes);
  PutThrough(position, from, count);
  for (auto page = pages_.lower_bound(position / kPageBytes);
       page != pages_.end() && page->first * kPageBytes < position + count; ++page) {
    const uint64_t first = std::max(position, page->first * kPageBytes);
    const uint64_t last = std::min(position + count, (page->first + 1) * kPageBytes);
    std::memcpy(page->second.data() + first % kPageBytes, from + (first - position), last - first);
  }
}

void PatchedFile::Sync() {
  RequireWritten();
  file_.Sync();
}

size_t PatchedFile::Read(uint64_t position, void* bytes, size_t count) {
  auto* to = static_cast<char*>(bytes);
  const size_t got = file_.ReadUpTo(position, bytes, count).bytes;
  for (auto page = pages_.lower_bound(position / kPageBytes);
       page != pages_.end() && page->first * kPageBytes < position + got; ++page) {
    const uint64_t first = std::max(position, page->first * kPageBytes);
    const uint64_t last = std::min({position + got, (page->first + 1) * kPageBytes, end_});
    if (first < last)
      std::memcpy(to + (first - position), page->second.data() + first % kPageBytes, last - first);
  }
  return got;
}

void PatchedFile::RequireWritten() const {
  if (error_ != 0) FailToWrite();
}

void PatchedFile::Keep() {
  Sync();
  isKept_ = true;
}

}  // namespace orin::drivers
