// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/appender.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <string>
#include <utility>

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

  /// The same whatever the order of the entries.
  uint64_t SizeOf(const std::vector<NewEntry>& entries) const {
    uint64_t size = HeadBytes(entries.size());
    for (const NewEntry& entry : entries)
      if (entry.bytes.size() > width_) size += EvenFrom(entry.bytes.size());
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

Appender::Appender(PositionedFile& file, bool isBig, ByteOrder byteOrder, FreeSpaceMap map)
    : file_(file), isBig_(isBig), byteOrder_(byteOrder), end_(file.Size()), map_(std::move(map)) {}

void Appender::RequireBelowLimit(uint64_t position, uint64_t bytes) const {
  if (isBig_ || (position <= kClassicLimit && bytes <= kClassicLimit - position)) return;
  throw Exception(
      FormatString(_("%s: would pass 4 GiB, the limit of a classic TIFF; use --external, "
                     "or delete the side-car if this is one and build it again."),
                   file_.Path().c_str()),
      "host/drivers/tiff/appender", "Appender::Reserve(uint64_t)", 0);
}

bool Appender::HasOpenSegment() const {
  return !map_.segments.empty() && map_.segments.back().end == 0;
}

void Appender::EndSegment() {
  if (!HasOpenSegment()) return;
  map_.segments.back().end = end_;
  map_.unclosed.push_back(map_.segments.back());
}

/// Bytes of another program end the segment.
void Appender::NoticeOthers() {
  const uint64_t size = file_.Size();
  if (size <= end_) return;
  EndSegment();
  end_ = kept_ = size;
}

void Appender::BeginSegment(uint64_t bytes) {
  if (HasOpenSegment()) return;
  const Segment segment = SegmentAt(end_);
  RequireBelowLimit(segment.Body(), bytes);
  map_.segments.push_back(segment);
  end_ = segment.Body();
  file_.Write(segment.marker, ComposeMarker(segment).data(), kMarkerBytes);
}

uint64_t Appender::Reserve(uint64_t bytes, Taking take) {
  const std::lock_guard lock(mutex_);
  NoticeOthers();
  if (const auto position = take ? (map_.free.*take)(bytes) : std::nullopt) {
    taken_.Add({*position, *position + bytes});
    return *position;
  }
  BeginSegment(bytes);
  const uint64_t position = EvenFrom(end_);
  RequireBelowLimit(position, bytes);
  end_ = position + bytes;
  return position;
}

uint64_t Appender::Append(const std::vector<uint8_t>& bytes) {
  const uint64_t position = Reserve(bytes.size(), &ByteRanges::Take);
  file_.Write(position, bytes.data(), bytes.size());
  return position;
}

uint64_t Appender::SizeOfDirectory(const std::vector<NewEntry>& entries) const {
  return Layout(isBig_, byteOrder_).SizeOf(entries);
}

/// In the shortest gap: a longer one may hold a tile.
uint64_t Appender::ReserveDirectory(const std::vector<NewEntry>& entries) {
  return Reserve(SizeOfDirectory(entries), &ByteRanges::TakeFromShortest);
}

uint64_t Appender::WriteDirectory(std::vector<NewEntry> entries, uint64_t next, uint64_t reserved) {
  std::sort(entries.begin(), entries.end(),
            [](const NewEntry& a, const NewEntry& b) { return a.tag < b.tag; });
  const auto directory = Layout(isBig_, byteOrder_).Compose(entries, reserved, next);
  file_.Write(reserved, directory.data(), directory.size());
  return reserved;
}

uint64_t Appender::AppendDirectory(std::vector<NewEntry> entries, uint64_t next) {
  const uint64_t reserved = ReserveDirectory(entries);
  return WriteDirectory(std::move(entries), next, reserved);
}

/// What is appended begins at even positions: so a segment has room for the same in any order.
void Appender::PadSegment() {
  if (!HasOpenSegment() || end_ == EvenFrom(end_) || file_.Size() > end_) return;
  const uint8_t padding = 0;
  file_.Write(end_++, &padding, 1);
}

void Appender::Close() {
  const std::lock_guard lock(mutex_);
  PadSegment();
  EndSegment();
  for (const Segment& segment : map_.unclosed)
    file_.Write(segment.marker, ComposeMarker(segment).data(), kMarkerBytes);
  map_.unclosed.clear();
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
  taken_ = {};
}

void Appender::CutBackTo(uint64_t end) {
  const std::lock_guard lock(mutex_);
  for (const auto& [start, stop] : taken_) map_.free.Add({start, stop});
  taken_ = {};
  if (end < kept_ || file_.Size() > end_) return;
  file_.Truncate(end);
  end_ = end;
  const auto isGone = [end](const Segment& segment) { return segment.start >= end; };
  std::erase_if(map_.segments, isGone);
  std::erase_if(map_.unclosed, isGone);
  if (map_.segments.empty() || map_.segments.back().end <= end) return;
  const Segment cut = map_.segments.back();  // goes on where it was cut
  std::erase_if(map_.unclosed, [&](const Segment& s) { return s.marker == cut.marker; });
  map_.segments.back().end = 0;
}

}  // namespace orin::drivers
