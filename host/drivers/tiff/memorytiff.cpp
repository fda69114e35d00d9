// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/memorytiff.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <new>
#include <utility>

#include "basic/gobs/outofmemory.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

MemoryTiff::MemoryTiff(std::endian order, std::string file)
    : file_(std::move(file)), contents_(std::make_unique<Contents>()) {
  const std::unique_ptr<TIFFOpenOptions, void (*)(TIFFOpenOptions*)> options(TIFFOpenOptionsAlloc(),
                                                                             &TIFFOpenOptionsFree);
  const auto ignore = [](TIFF*, void*, const char*, const char*, va_list) { return 1; };
  TIFFOpenOptionsSetErrorHandlerExtR(options.get(), &KeepError, contents_.get());
  TIFFOpenOptionsSetWarningHandlerExtR(options.get(), ignore, nullptr);
  tiff_.reset(TIFFClientOpenExt(file_.c_str(), order == std::endian::little ? "wl" : "wb",
                                contents_.get(), &Read, &Write, &Seek, &Close, &Size, nullptr,
                                nullptr, options.get()));
  if (!tiff_) Fail();
}

std::vector<uint8_t> MemoryTiff::StoredTile(uint32_t tile) const {
  if (contents_->wantsMemory || !contents_->error.empty() || !TIFFFlushData(Get())) Fail();
  const uint64_t offset = TIFFGetStrileOffset(Get(), tile);
  const uint64_t count = TIFFGetStrileByteCount(Get(), tile);
  const std::vector<uint8_t>& bytes = contents_->bytes;
  if (count == 0 || offset > bytes.size() || count > bytes.size() - offset) Fail();
  const auto begin = bytes.begin() + static_cast<ptrdiff_t>(offset);
  return {begin, begin + static_cast<ptrdiff_t>(count)};
}

void MemoryTiff::Fail() const {
  if (contents_->wantsMemory) ThrowOutOfMemory();
  const std::string reason =
      contents_->error.empty() ? _("the codec gave no reason") : contents_->error;
  throw Exception(
      FormatString(_("%s: a tile cannot be encoded: %s."), file_.c_str(), reason.c_str()),
      "host/drivers/tiff/memorytiff", "MemoryTiff::Fail() const", 0);
}

tmsize_t MemoryTiff::Read(thandle_t handle, void* buffer, tmsize_t size) {
  auto& contents = *static_cast<Contents*>(handle);
  const uint64_t left =
      contents.bytes.size() - std::min<uint64_t>(contents.position, contents.bytes.size());
  const uint64_t count = std::min(left, static_cast<uint64_t>(size));
  if (count > 0) std::memcpy(buffer, &contents.bytes[contents.position], count);
  contents.position += count;
  return static_cast<tmsize_t>(count);
}

tmsize_t MemoryTiff::Write(thandle_t handle, void* buffer, tmsize_t size) {
  auto& contents = *static_cast<Contents*>(handle);
  const uint64_t end = contents.position + static_cast<uint64_t>(size);
  try {
    if (end > contents.bytes.size()) contents.bytes.resize(end);
  } catch (const std::bad_alloc&) {
    contents.wantsMemory = true;
    return 0;
  }
  if (size > 0) std::memcpy(&contents.bytes[contents.position], buffer, static_cast<size_t>(size));
  contents.position = end;
  return size;
}

toff_t MemoryTiff::Seek(thandle_t handle, toff_t offset, int whence) {
  auto& contents = *static_cast<Contents*>(handle);
  const uint64_t base = whence == SEEK_SET   ? 0
                        : whence == SEEK_CUR ? contents.position
                                             : contents.bytes.size();
  return contents.position = base + offset;
}

toff_t MemoryTiff::Size(thandle_t handle) { return static_cast<Contents*>(handle)->bytes.size(); }

int MemoryTiff::Close(thandle_t) { return 0; }

int MemoryTiff::KeepError(TIFF*, void* contents, const char*, const char* format,
                          va_list arguments) {
  auto& [bytes, position, error, wantsMemory] = *static_cast<Contents*>(contents);
  char text[512];
  if (!error.empty() || std::vsnprintf(text, sizeof text, format, arguments) <= 0) return 1;
  try {
    error = text;
  } catch (const std::bad_alloc&) {
    wantsMemory = true;
  }
  while (!error.empty() && error.back() == '.') error.pop_back();
  return 1;
}

}  // namespace orin::drivers
