// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tiffhandle.h"

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <new>
#include <string_view>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/drivers/common/descriptor.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

// m: no memory map, a file that shrinks must not end the process; c: strips as they are stored.
constexpr char kOpenMode[] = "rmc";

/// Keeps the first error: the later ones are its consequences.
int KeepFirst(TIFF*, void* errors, const char*, const char* format, va_list arguments) {
  auto& kept = *static_cast<std::string*>(errors);
  char text[512];
  if (!kept.empty() || std::vsnprintf(text, sizeof text, format, arguments) <= 0) return 1;
  try {
    kept = text;
  } catch (const std::bad_alloc&) {  // which may not pass through libtiff
    kept = "out of memory";          // fits without an allocation
  }
  return 1;  // handled: libtiff prints nothing
}

/// A warning is not passed on, except the one that libtiff gives for a JPEG image that does not
/// fill its tile, where the rest of the pixels would be whatever the memory held: that is an error.
int KeepIfPixelsAreMissing(TIFF* tiff, void* errors, const char* module, const char* format,
                           va_list arguments) {
  const bool isMissing = std::string_view(format).starts_with("Improper JPEG strip/tile size");
  return isMissing ? KeepFirst(tiff, errors, module, format, arguments) : 1;
}

struct OptionsDeleter {
  void operator()(TIFFOpenOptions* options) const { TIFFOpenOptionsFree(options); }
};

/// A descriptor of our own tells a file that cannot be opened from one that cannot be understood.
int OpenToRead(const std::string& path) {
  const int descriptor = OpenDescriptor(path, O_RDONLY);
  if (descriptor < 0)
    throw OpenFailure(
        FormatString(_("%s: cannot be opened: %s."), path.c_str(), std::strerror(errno)));
  return descriptor;
}

TIFF* Open(const std::string& path, std::string& errors) {
  const int descriptor = OpenToRead(path);
  const std::unique_ptr<TIFFOpenOptions, OptionsDeleter> options(TIFFOpenOptionsAlloc());
  TIFFOpenOptionsSetErrorHandlerExtR(options.get(), KeepFirst, &errors);
  TIFFOpenOptionsSetWarningHandlerExtR(options.get(), KeepIfPixelsAreMissing, &errors);
  TIFFOpenOptionsSetMaxSingleMemAlloc(options.get(), TiffHandle::kLargestAllocation);
  TIFF* tiff = TIFFFdOpenExt(descriptor, path.c_str(), kOpenMode, options.get());
  if (!tiff) close(descriptor);
  return tiff;
}

/// The tag's definition when its value is text. Of a tag that libtiff does not know, a file defines
/// the type, which may be none: it is looked for by type, so that nobody reads such a value.
const TIFFField* FindTextField(TIFF* tiff, uint32_t tag) {
  for (const TIFFDataType type : {TIFF_ASCII, TIFF_BYTE, TIFF_UNDEFINED})
    if (const TIFFField* field = TIFFFindField(tiff, tag, type)) return field;
  return nullptr;
}

}  // namespace

OpenFailure::OpenFailure(const std::string& message)
    : Exception(message, "host/drivers/tiff/tiffhandle", "TiffHandle(const std::string&)", 0) {}

void FailToRead(const std::string& path, std::string reason) {
  if (reason.starts_with(path + ": ")) reason.erase(0, path.size() + 2);  // libtiff names it too
  while (!reason.empty() && (reason.back() == '.' || reason.back() == '\n')) reason.pop_back();
  throw Exception(FormatString(_("%s: cannot be read: %s."), path.c_str(),
                               reason.empty() ? _("the file is damaged") : reason.c_str()),
                  "host/drivers/tiff/tiffhandle", "FailToRead(const std::string&, std::string)", 0);
}

TiffHandle::TiffHandle(const std::string& path)
    : path_(path), errors_(std::make_unique<std::string>()), tiff_(Open(path, *errors_)) {
  if (!tiff_) FailToRead(path_, *errors_);
  struct stat status;
  if (fstat(Descriptor(), &status) == 0) fileSize_ = static_cast<uint64_t>(status.st_size);
}

TiffHandle TiffHandle::OpenAt(const std::string& path, uint64_t directoryOffset) {
  TiffHandle handle(path);
  handle.MoveTo(directoryOffset);
  return handle;
}

void TiffHandle::MoveTo(uint64_t directoryOffset) {
  if (directoryOffset == 0 || directoryOffset == TIFFCurrentDirOffset(Get())) return;
  ClearErrors();
  if (!TIFFSetSubDirectory(Get(), directoryOffset)) FailToRead(path_, FirstError());
}

std::string TiffHandle::TextOf(uint32_t tag) const {
  const TIFFField* field = FindTextField(Get(), tag);
  if (!field) return {};
  const char* text = nullptr;
  if (!TIFFFieldPassCount(field)) return TIFFGetField(Get(), tag, &text) == 1 && text ? text : "";
  uint32_t longCount = 0;
  uint16_t shortCount = 0;
  const bool isLong = TIFFFieldReadCount(field) == TIFF_VARIABLE2;
  const int found = isLong ? TIFFGetField(Get(), tag, &longCount, &text)
                           : TIFFGetField(Get(), tag, &shortCount, &text);
  if (found != 1 || !text) return {};
  return {text, std::find(text, text + (isLong ? longCount : shortCount), '\0')};
}

}  // namespace orin::drivers
