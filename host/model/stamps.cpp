// SPDX-License-Identifier: MIT
#include "host/model/stamps.h"

#include <charconv>
#include <cinttypes>

#include "host/services/text.h"

namespace orin::model {
namespace {

/// Takes numbers of fixed width off the front of a text, with a blank between two of them.
class FixedColumns {
 public:
  explicit FixedColumns(std::string_view text) : rest_(text) {}

  template <class T>
  T Take(size_t width, int base = 10) {
    if (isFirst_) isFirst_ = false;
    else if (!TakeBlank()) return Fail<T>();
    if (rest_.size() < width) return Fail<T>();
    std::string_view column = rest_.substr(0, width);
    rest_.remove_prefix(width);
    if (column.front() == '+') column.remove_prefix(1);
    T number = 0;
    const char* const stop = column.data() + column.size();
    const auto [end, error] = std::from_chars(column.data(), stop, number, base);
    return error == std::errc() && end == stop ? number : Fail<T>();
  }
  /// Every column was a number, and nothing is left.
  bool IsWhole() const { return !hasFailed_ && rest_.empty(); }

 private:
  bool TakeBlank() {
    if (!rest_.starts_with(' ')) return false;
    rest_.remove_prefix(1);
    return true;
  }
  template <class T>
  T Fail() {
    hasFailed_ = true;
    return 0;
  }

  std::string_view rest_;
  bool isFirst_ = true;
  bool hasFailed_ = false;
};

}  // namespace

bool IsUnchanged(const ImageStamp& recorded, const ImageStamp& now) {
  if (recorded.IsBlank()) return false;
  const bool isShort = recorded.changed == 0 && recorded.inode == 0;
  return recorded == (isShort ? now.InImage() : now);
}

std::string TextOf(const FileStamp& stamp) {
  return FormatString("%020" PRIu64 " %+020" PRId64, stamp.bytes, stamp.modified);
}

std::string ComposeImageStamp(const ImageStamp& stamp) {
  return TextOf(stamp.File()) + FormatString(" %016" PRIx64 " %+020" PRId64 " %016" PRIx64,
                                             stamp.companions, stamp.changed, stamp.inode);
}

std::optional<FileStamp> ParseFileStamp(std::string_view text) {
  FixedColumns columns(text);
  FileStamp stamp;
  stamp.bytes = columns.Take<uint64_t>(20);
  stamp.modified = columns.Take<int64_t>(20);
  return columns.IsWhole() ? std::optional(stamp) : std::nullopt;
}

std::optional<ImageStamp> ParseImageStamp(std::string_view text) {
  FixedColumns columns(text);
  ImageStamp stamp;
  stamp.bytes = columns.Take<uint64_t>(20);
  stamp.modified = columns.Take<int64_t>(20);
  stamp.companions = columns.Take<uint64_t>(16, 16);
  stamp.changed = columns.Take<int64_t>(20);
  stamp.inode = columns.Take<uint64_t>(16, 16);
  return columns.IsWhole() ? std::optional(stamp) : std::nullopt;
}

}  // namespace orin::model
