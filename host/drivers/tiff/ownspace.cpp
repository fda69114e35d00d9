// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/ownspace.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <iterator>
#include <map>
#include <set>

namespace orin::drivers {
namespace {

constexpr std::array<uint8_t, 16> kMagic = {'O', 'r', 'i', 'n', ' ', 'l',  'e',  'v',
                                            'e', 'l', 's', 0,   1,   '\r', '\n', 26};
constexpr ByteOrder kOrder{std::endian::little};  // of markers and pointers, in every file

uint64_t AlignedToMarker(uint64_t position) {
  return (position + kMarkerBytes - 1) / kMarkerBytes * kMarkerBytes;
}

/// FNV-1a.
uint64_t ChecksumOf(const uint8_t* bytes, size_t count) {
  uint64_t sum = 14695981039346656037u;
  for (size_t i = 0; i < count; ++i) sum = (sum ^ bytes[i]) * 1099511628211u;
  return sum;
}

uint64_t PointerCheck(uint64_t marker, uint64_t directory) {
  std::array<uint8_t, 32> bytes{};
  std::copy(kMagic.begin(), kMagic.end(), bytes.begin());
  kOrder.Put(marker, 8, &bytes[16]);
  kOrder.Put(directory, 8, &bytes[24]);
  return ChecksumOf(bytes.data(), bytes.size());
}

/// The marker that the pointer in front of a directory names; none when there is no pointer.
std::optional<uint64_t> ReadPointer(const PositionedFile& file, uint64_t directory) {
  std::array<uint8_t, kPointerBytes> bytes;
  if (directory < kPointerBytes || directory > file.Size()) return std::nullopt;
  file.Read(directory - kPointerBytes, bytes.data(), bytes.size());
  const uint64_t marker = kOrder.Number(bytes.data(), 8);
  if (kOrder.Number(&bytes[8], 8) != PointerCheck(marker, directory)) return std::nullopt;
  return marker;
}

/// Collects stretches from where they are named.
class Finder {
 public:
  Finder(const PositionedFile& file, const TiffStructure& structure)
      : file_(file), structure_(structure), size_(file.Size()) {}

  OwnSpace Find();

 private:
  void FollowBack(uint64_t marker);
  void FollowOn();
  void FollowTail();
  std::optional<Stretch> NextTo(uint64_t end) const;
  /// False also where the machine stopped before everything was on disk.
  bool IsClosed(const Stretch& stretch) const { return stretch.end != 0 && stretch.end <= size_; }
  bool AreApart() const;

  const PositionedFile& file_;
  const TiffStructure& structure_;
  uint64_t size_;
  std::map<uint64_t, Stretch> found_;  // by marker
  OwnSpace space_;
};

/// The closed stretches from this one on back.
void Finder::FollowBack(uint64_t marker) {
  while (marker != 0 && !found_.contains(marker)) {
    const auto stretch = ReadMarker(file_, marker);
    if (!stretch) return;
    if (IsClosed(*stretch)) found_.emplace(marker, *stretch);
    marker = stretch->previous;
  }
}

/// The stretch that begins where another thing ends.
std::optional<Stretch> Finder::NextTo(uint64_t end) const {
  const auto next = ReadMarker(file_, AlignedToMarker(end));
  return next && next->start == end ? next : std::nullopt;
}

/// The closed stretches that begin where those found end.
void Finder::FollowOn() {
  for (auto at = found_.begin(); at != found_.end(); ++at) {
    const auto next = NextTo(at->second.end);
    if (next && IsClosed(*next)) found_.emplace(next->marker, *next);
  }
}

/// What a build that was killed left at the file's end.
void Finder::FollowTail() {
  uint64_t end = space_.used.End();
  for (const auto& [marker, stretch] : found_) end = std::max(end, stretch.end);
  while (auto next = NextTo(end)) {
    if (!IsClosed(*next)) {
      next->end = size_;
      space_.unclosed.push_back(*next);
    }
    found_.emplace(next->marker, *next);
    end = next->end;
  }
}

bool Finder::AreApart() const {
  uint64_t end = 0;
  return std::all_of(found_.begin(), found_.end(), [&](const auto& entry) {
    const bool isApart = entry.second.start >= end;
    end = entry.second.end;
    return isApart;
  });
}

OwnSpace Finder::Find() {
  References references = ReferencesIn(file_, structure_);
  space_.used = std::move(references.extents);
  if (!references.areAllKnown) return std::move(space_);
  for (const TiffDirectory& directory : structure_.directories)
    if (const auto marker = ReadPointer(file_, directory.offset)) {
      space_.used.Add({directory.offset - kPointerBytes, directory.offset});
      FollowBack(*marker);
    }
  FollowOn();
  FollowTail();
  if (!AreApart()) {
    space_.unclosed.clear();
    return std::move(space_);
  }
  for (const auto& [marker, stretch] : found_) {
    space_.stretches.push_back(stretch);
    space_.free.Add({stretch.Body(), stretch.end});
  }
  space_.free.Remove(space_.used);
  const auto isOwn = [&](uint64_t offset) {
    return std::any_of(space_.stretches.begin(), space_.stretches.end(),
                       [&](const Stretch& s) { return offset >= s.Body() && offset < s.end; });
  };
  for (const TiffDirectory& directory : structure_.directories)
    if (isOwn(directory.offset)) space_.directories.push_back(directory.offset);
  return std::move(space_);
}

}  // namespace

OwnSpace FindOwnSpace(const PositionedFile& file, const TiffStructure& structure) {
  return Finder(file, structure).Find();
}

Stretch StretchAt(uint64_t fileEnd, uint64_t previous) {
  return {fileEnd, AlignedToMarker(fileEnd), 0, previous};
}

std::vector<uint8_t> ComposeMarker(const Stretch& stretch) {
  std::vector<uint8_t> bytes(kMarkerBytes);
  std::copy(kMagic.begin(), kMagic.end(), bytes.begin());
  uint8_t* at = &bytes[kMagic.size()];
  for (const uint64_t number : {stretch.start, stretch.marker, stretch.end, stretch.previous}) {
    kOrder.Put(number, 8, at);
    at += 8;
  }
  kOrder.Put(ChecksumOf(bytes.data(), size_t(at - bytes.data())), 8, at);
  return bytes;
}

std::optional<Stretch> ReadMarker(const PositionedFile& file, uint64_t position) {
  const uint64_t size = file.Size();
  if (position % kMarkerBytes != 0 || position > size || size - position < kMarkerBytes)
    return std::nullopt;
  std::vector<uint8_t> bytes(kMarkerBytes);
  file.Read(position, bytes.data(), bytes.size());
  const auto number = [&](unsigned i) { return kOrder.Number(&bytes[kMagic.size() + i * 8], 8); };
  const Stretch stretch{number(0), number(1), number(2), number(3)};
  if (stretch.marker != position || bytes != ComposeMarker(stretch)) return std::nullopt;
  const bool isPlausible = stretch.start <= position && position - stretch.start < kMarkerBytes &&
                           (stretch.end == 0 || stretch.end >= stretch.Body()) &&
                           stretch.previous < position;
  return isPlausible ? std::optional(stretch) : std::nullopt;
}

std::vector<uint8_t> ComposePointer(uint64_t marker, uint64_t directory) {
  std::vector<uint8_t> bytes(kPointerBytes);
  kOrder.Put(marker, 8, bytes.data());
  kOrder.Put(PointerCheck(marker, directory), 8, &bytes[8]);
  return bytes;
}

Joining JoinStretches(const OwnSpace& space) {
  const std::set<uint64_t> directories(space.directories.begin(), space.directories.end());
  const auto holdsDirectory = [&](const Stretch& stretch) {
    const auto first = directories.lower_bound(stretch.Body());
    return first != directories.end() && *first < stretch.end;
  };
  Joining joining;
  std::map<uint64_t, uint64_t> joined;  // from the marker that is given up to the one that stays
  std::set<uint64_t> growing;           // markers
  std::vector<Stretch> staying;
  for (Stretch stretch : space.stretches) {
    if (!staying.empty() && staying.back().end == stretch.start && !holdsDirectory(stretch)) {
      staying.back().end = stretch.end;
      joined.emplace(stretch.marker, staying.back().marker);
      growing.insert(staying.back().marker);
      continue;
    }
    if (const auto other = joined.find(stretch.previous); other != joined.end()) {
      stretch.previous = other->second;
      joining.relinked.push_back(stretch);
    }
    staying.push_back(stretch);
  }
  for (const Stretch& stretch : staying)
    if (growing.contains(stretch.marker)) joining.grown.push_back(stretch);
  return joining;
}

uint64_t OwnSpace::ShortestEnd(uint64_t fileSize, const ByteRanges& given) const {
  constexpr uint64_t kPadding = 1;  // other programs begin at even positions
  ByteRanges spare = given;
  for (const Stretch& stretch : stretches) spare.Add({stretch.start, stretch.end});
  uint64_t end = fileSize;
  while (!spare.IsEmpty() && spare.End() <= end && end - spare.End() <= kPadding &&
         used.End() < end) {
    const ByteRange last = spare.Last();
    const uint64_t needed = used.End() + used.End() % 2;  // a stretch ends at an even position
    end = used.End() <= last.start ? last.start : std::min(needed, end);
    if (end > last.start) break;
    spare.Remove(last);
  }
  return end;
}

}  // namespace orin::drivers
