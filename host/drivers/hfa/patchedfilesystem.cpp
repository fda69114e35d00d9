// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/patchedfilesystem.h"

#include <cpl_vsi.h>
#include <sys/stat.h>

#include <cstring>
#include <map>
#include <mutex>
#include <string_view>

#include "host/drivers/hfa/libraryfile.h"

namespace orin::drivers {
namespace {

constexpr char kPrefix[] = "/vsiorinpatched/";

/// One opening of a file by the library.
struct Cursor {
  ILibraryFile& file;
  uint64_t position = 0;
  bool isAtEnd = false;
};

class Directory {
 public:
  static Directory& Instance() {
    static Directory directory;
    return directory;
  }
  std::string Add(ILibraryFile& file, const std::string& fileName) {
    const std::lock_guard lock(mutex_);
    const std::string name = std::to_string(++number_) + "/" + fileName;
    files_[name] = &file;
    return kPrefix + name;
  }
  void Remove(const std::string& name) {
    const std::lock_guard lock(mutex_);
    files_.erase(name.substr(std::strlen(kPrefix)));
  }
  ILibraryFile* Find(std::string_view name) {
    if (name.starts_with(kPrefix)) name.remove_prefix(std::strlen(kPrefix));
    const std::lock_guard lock(mutex_);
    const auto found = files_.find(std::string(name));
    return found == files_.end() ? nullptr : found->second;
  }

 private:
  std::mutex mutex_;
  std::map<std::string, ILibraryFile*> files_;
  unsigned number_ = 0;
};

Cursor& CursorOf(void* handle) { return *static_cast<Cursor*>(handle); }

int Stat(void*, const char* name, VSIStatBufL* status, int) {
  const ILibraryFile* file = Directory::Instance().Find(name);
  if (!file) return -1;
  std::memset(status, 0, sizeof *status);
  status->st_mode = S_IFREG;
  status->st_size = static_cast<off_t>(file->Size());
  return 0;
}

void* Open(void*, const char* name, const char* access) {
  ILibraryFile* file = access[0] == 'r' ? Directory::Instance().Find(name) : nullptr;
  return file ? new Cursor{*file} : nullptr;
}

vsi_l_offset Tell(void* handle) { return CursorOf(handle).position; }

int Seek(void* handle, vsi_l_offset offset, int origin) {
  Cursor& cursor = CursorOf(handle);
  const uint64_t base = origin == SEEK_CUR   ? cursor.position
                        : origin == SEEK_END ? cursor.file.Size()
                                             : 0;
  cursor.position = base + offset;
  cursor.isAtEnd = false;
  return 0;
}

size_t Read(void* handle, void* buffer, size_t size, size_t count) {
  Cursor& cursor = CursorOf(handle);
  if (size == 0 || count == 0) return 0;
  const size_t got = cursor.file.Read(cursor.position, buffer, size * count);
  cursor.position += got;
  cursor.isAtEnd = got < size * count;
  return got / size;
}

size_t Write(void* handle, const void* buffer, size_t size, size_t count) {
  Cursor& cursor = CursorOf(handle);
  if (size == 0 || count == 0) return 0;
  const size_t put = cursor.file.Write(cursor.position, buffer, size * count);
  cursor.position += put;
  return put / size;
}

int Eof(void* handle) { return CursorOf(handle).isAtEnd ? 1 : 0; }

int Flush(void*) { return 0; }  // deliberate: files are synced by `Commit`, in its order

int Close(void* handle) {
  delete &CursorOf(handle);
  return 0;
}

void Install() {
  static std::once_flag once;
  std::call_once(once, [] {
    VSIFilesystemPluginCallbacksStruct* callbacks = VSIAllocFilesystemPluginCallbacksStruct();
    callbacks->stat = Stat;
    callbacks->open = Open;
    callbacks->tell = Tell;
    callbacks->seek = Seek;
    callbacks->read = Read;
    callbacks->write = Write;
    callbacks->eof = Eof;
    callbacks->flush = Flush;
    callbacks->close = Close;
    VSIInstallPluginHandler(kPrefix, callbacks);
    VSIFreeFilesystemPluginCallbacksStruct(callbacks);
  });
}

}  // namespace

std::string ShowToLibrary(ILibraryFile& file, const std::string& fileName) {
  Install();
  return Directory::Instance().Add(file, fileName);
}

void HideFromLibrary(const std::string& libraryName) { Directory::Instance().Remove(libraryName); }

}  // namespace orin::drivers
