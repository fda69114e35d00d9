// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/appender.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <string>

#include <tiff.h>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr uint64_t kClassicLimit = std::numeric_limits<uint32_t>::max();

uint64_t EvenFrom(uint64_t position) { return position + position % 2; }

/// Lays out one directory: count, entries, link, then the values that do not fit into their
/// entries.
class Layout {
 public:
  Layout(bool isBig, ByteOrder byteOrder)
      : width_(isBig ? 8 : 4), countBytes_(isBig ? 8 : 2), byteOrder_(byteOrder) {}

  uint64_t SizeOf(const std::vector<NewEntry>& entries) const {
    uint64_t size = HeadBytes(entries.size());
    for (const NewEntry& entry : entries)
      if (entry.bytes.size() > width_) size = EvenFrom(size) + entry.bytes.size();
    return size;
  }
  /// \param position  where the directory will stand
  std::vector<uint8_t> Compose(const std::vector<NewEntry>& entries, uint64_t position,
                               uint64_t next) const {
    std::vector<uint8_t> directory(SizeOf(entries));
    byteOrder_.Put(entries.size(), countBytes_, directory.data());
    uint64_t values = HeadBytes(entries.size());
    for (size_t i = 0; i < entries.size(); ++i) {
      uint8_t* field = &directory[countBytes_ + i * EntryBytes()];
      byteOrder_.Put(entries[i].tag, 2, field);
      byteOrder_.Put(entries[i].type, 2, field + 2);
      byteOrder_.Put(entries[i].count, width_, field + 4);
      std::vector<uint8_t> bytes = entries[i].bytes;
      byteOrder_.Swap(bytes, SwapBytes(entries[i].type));
      uint8_t* value = field + 4 + width_;
      if (bytes.size() > width_) {
        values = EvenFrom(values);
        byteOrder_.Put(position + values, width_, value);
        value = &directory[values];
        values += bytes.size();
      }
      std::copy(bytes.begin(), bytes.end(), value);
    }
    byteOrder_.Put(next, width_, &directory[countBytes_ + entries.size() * EntryBytes()]);
    return directory;
  }

 private:
  unsigned EntryBytes() const { return 4 + 2 * width_; }
  uint64_t HeadBytes(size_t entries) const { return countBytes_ + entries * EntryBytes() + width_; }

  unsigned width_;
  unsigned countBytes_;
  ByteOrder byteOrder_;
};

}  // namespace

NewEntry NumbersEntry(uint16_t tag, uint16_t type, const std::vector<uint64_t>& numbers) {
  const unsigned width = ElementBytes(type);
  NewEntry entry{tag, type, numbers.size(), std::vector<uint8_t>(numbers.size() * width)};
  const ByteOrder machine;
  for (size_t i = 0; i < numbers.size(); ++i)
    machine.Put(numbers[i], width, &entry.bytes[i * width]);
  return entry;
}

NewEntry TextEntry(uint16_t tag, const std::string& text) {
  return {tag, TIFF_ASCII, text.size() + 1,
          std::vector<uint8_t>(text.c_str(), text.c_str() + text.size() + 1)};
}

Appender::Appender(PositionedFile& file, bool isBig, ByteOrder byteOrder)
    : file_(file), isBig_(isBig), byteOrder_(byteOrder), end_(file.Size()) {}

uint64_t Appender::Reserve(uint64_t bytes) {
  const std::lock_guard lock(mutex_);
  const uint64_t size = file_.Size();
  if (size > end_) end_ = kept_ = size;  // the bytes of another program
  const uint64_t position = EvenFrom(end_);
  if (!isBig_ && (position > kClassicLimit || bytes > kClassicLimit - position))
    throw Exception(
        FormatString(_("%s: would pass 4 GiB, the limit of a classic TIFF; use --external, "
                       "or delete the side-car if this is one and build it again."),
                     file_.Path().c_str()),
        "host/drivers/tiff/appender", "Appender::Reserve(uint64_t)", 0);
  end_ = position + bytes;
  return position;
}

uint64_t Appender::Append(const std::vector<uint8_t>& bytes) {
  const uint64_t position = Reserve(bytes.size());
  file_.Write(position, bytes.data(), bytes.size());
  return position;
}

uint64_t Appender::AppendDirectory(std::vector<NewEntry> entries, uint64_t next) {
  std::sort(entries.begin(), entries.end(),
            [](const NewEntry& a, const NewEntry& b) { return a.tag < b.tag; });
  const Layout layout(isBig_, byteOrder_);
  const uint64_t position = Reserve(layout.SizeOf(entries));
  const std::vector<uint8_t> directory = layout.Compose(entries, position, next);
  file_.Write(position, directory.data(), directory.size());
  return position;
}

void Appender::Link(uint64_t linkPosition, uint64_t target) {
  uint8_t field[8];
  const unsigned width = isBig_ ? 8 : 4;
  byteOrder_.Put(target, width, field);
  file_.Write(linkPosition, field, width);
}

uint64_t Appender::End() const {
  const std::lock_guard lock(mutex_);
  return end_;
}

void Appender::Keep() {
  const std::lock_guard lock(mutex_);
  kept_ = end_;
}

void Appender::CutBackTo(uint64_t end) {
  const std::lock_guard lock(mutex_);
  if (end < kept_ || file_.Size() > end_) return;
  file_.Truncate(end);
  end_ = end;
}

}  // namespace orin::drivers
