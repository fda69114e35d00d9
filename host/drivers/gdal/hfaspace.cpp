// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfaspace.h"

#include <algorithm>
#include <array>
#include <span>
#include <string_view>
#include <utility>

#include "host/drivers/gdal/hfablocks.h"
#include "host/drivers/gdal/hfatree.h"

namespace orin::drivers {
namespace {

/// Nodes whose data refers to no other bytes of the file. Those that do are treated one by one.
constexpr std::string_view kPlainTypes[] = {"root",
                                            "ImgFormatInfo831",
                                            "Eimg_Layer",
                                            "Eimg_Layer_SubSample",
                                            "Eimg_NonInitializedValue",
                                            "Eimg_StatisticsParameters830",
                                            "Eimg_MapInformation",
                                            "Esta_Statistics",
                                            "Edsc_Table",
                                            "Eprj_MapInfo",
                                            "Eprj_ProParameters",
                                            "Eprj_Datum",
                                            "Eprj_MapProjection842",
                                            "Exfr_GenericXFormHeader",
                                            "Efga_Polynomial"};

constexpr uint32_t kMostTextBytes = 1 << 20;
constexpr unsigned kDeepestNode = 30;

class SpaceFinder {
 public:
  explicit SpaceFinder(const std::string& path) : tree_(path) { space_.size = tree_.Size(); }

  HfaSpace Find(const ByteRanges& given) {
    UseHeader();
    Walk(tree_.Root(), false, 0);
    if (!isKnown_) return {space_.size, space_.size, {}, {}, {}};
    space_.end = std::max(levels_.End(), others_.End());
    space_.free.Add({others_.End(), space_.size});
    space_.free.Add(given);
    space_.free.Remove({space_.size, UINT64_MAX});
    space_.free.Remove(levels_);
    space_.free.Remove(others_);
    KeepMovablesApart();
    std::sort(space_.pointers.begin(), space_.pointers.end(),
              [](const auto& a, const auto& b) { return a.position < b.position; });
    return std::move(space_);
  }

  ByteRanges BytesOf(const HfaNode& node) {
    Walk(node, true, 0);
    return std::move(levels_);
  }

 private:
  void UseHeader() {
    constexpr uint32_t kStartBytes = 20, kHeaderBytes = 18;
    const HfaTree::Header header = tree_.FileHeader();
    Use(0, kStartBytes);
    Use(header.position, kHeaderBytes);
    UseText(header.dictionary);
    isKnown_ = isKnown_ && header.freeList == 0;
  }

  void Use(uint32_t start, uint64_t bytes) {
    if (bytes == 0) return;
    (isLevel_ ? levels_ : others_).Add({start, start + bytes});
    if (isLevel_) space_.movables.push_back({start, static_cast<uint32_t>(bytes)});
  }

  void NotePointer(uint32_t position, uint32_t value) {
    if (value != 0) space_.pointers.push_back({position, value});
  }

  /// Of a text that ends with a zero.
  void UseText(uint32_t start) {
    for (uint32_t bytes = 0; bytes < kMostTextBytes && start + uint64_t{bytes} < space_.size;) {
      const uint64_t left = space_.size - start - bytes;
      const auto part = static_cast<uint32_t>(std::min<uint64_t>(4096, left));
      const size_t zero = tree_.Bytes(uint64_t{start} + bytes, part).find('\0');
      if (zero != std::string::npos) return Use(start, bytes + zero + 1);
      bytes += part;
    }
    isKnown_ = false;
  }

  void UseBlocks(const HfaNode& node) {
    const HfaBlockMap map = ReadHfaBlockMap(tree_, node);
    isKnown_ = isKnown_ && map.isHere;
    if (!map.isHere) return;
    if (isLevel_) NotePointer(map.listPointer, map.list);
    for (const HfaBlock& block : map.blocks) {
      Use(block.position, block.bytes);
      if (isLevel_ && block.bytes > 0) NotePointer(block.pointer, block.position);
    }
  }

  /// A column of a table: its rows stand elsewhere.
  void UseColumn(const HfaNode& node, const std::string& data) {
    constexpr uint32_t kTextType = 3;
    constexpr std::array<uint32_t, kTextType> kCellBytes = {4, 8, 16};  // integer, real, complex
    const uint32_t rows = HfaNumberAt(data, 0), type = HfaNumberAt(data, 8) & 0xffff;
    if (data.size() < 14 || type > kTextType) {
      isKnown_ = false;
      return;
    }
    const uint32_t cell = type == kTextType ? HfaNumberAt(data, 10) : kCellBytes[type];
    Use(HfaNumberAt(data, 4), uint64_t{rows} * cell);
    NotePointer(node.data + 4, HfaNumberAt(data, 4));
  }

  void UseData(const HfaNode& node) {
    Use(node.data, node.dataBytes);
    if (IsHfaBlockMap(node)) return UseBlocks(node);
    const std::string data = tree_.DataOf(node);
    const auto note = [&](uint32_t at) { NotePointer(node.data + at, HfaNumberAt(data, at)); };
    if (node.type == "Edsc_Column") UseColumn(node, data);
    else if (IsHfaNameList(node))
      for (const uint32_t at : PointersInHfaNameList(data)) note(at);
    else if (node.type == "Edsc_BinFunction" || node.type == "Edsc_BinFunction840") note(26);
    else if (node.type == "Ehfa_Layer") {
      UseText(HfaNumberAt(data, 2));
      note(2);
    } else if (std::find(std::begin(kPlainTypes), std::end(kPlainTypes), node.type) ==
               std::end(kPlainTypes))
      isKnown_ = false;
  }

  /// \param isLevel  the node belongs to levels, or to the items that tell of them
  void Walk(const HfaNode& node, bool isLevel, unsigned depth) {
    isLevel = isLevel || FactorOfHfaPart(node) != 0 || IsHfaNameList(node) ||
              node.name == "GDAL_MetaData";
    isLevel_ = isLevel;
    Use(node.position, kHfaNodeBytes);
    NotePointer(node.position + kHfaNextAt, node.next);
    NotePointer(node.position + kHfaPreviousAt, node.previous);
    NotePointer(node.position + kHfaParentAt, node.parent);
    NotePointer(node.position + kHfaChildAt, node.child);
    NotePointer(node.position + kHfaDataAt, node.data);
    UseData(node);
    if (node.child != 0 && depth == kDeepestNode) tree_.Fail();
    for (const HfaNode& child : tree_.ChildrenOf(node)) Walk(child, isLevel, depth + 1);
  }

  /// What is shared stays where it is.
  void KeepMovablesApart() {
    auto& all = space_.movables;
    std::sort(all.begin(), all.end(),
              [](const auto& a, const auto& b) { return a.position < b.position; });
    std::vector<HfaMovable> apart;
    uint64_t end = 0;
    for (size_t i = 0; i < all.size(); ++i) {
      const uint64_t itsEnd = uint64_t{all[i].position} + all[i].bytes;
      const bool overlaps = all[i].position < end ||
                            (i + 1 < all.size() && all[i + 1].position < itsEnd) ||
                            others_.Touches({all[i].position, itsEnd});
      if (!overlaps) apart.push_back(all[i]);
      end = std::max(end, itsEnd);
    }
    all = std::move(apart);
  }

  HfaTree tree_;
  HfaSpace space_;
  ByteRanges levels_, others_;
  bool isLevel_ = false;  ///< what is being added belongs to levels
  bool isKnown_ = true;
};

/// Where things go.
class Moves {
 public:
  /// Chooses places for what can move down. Large things first: they fit into fewer.
  explicit Moves(HfaSpace& space) {
    auto& all = space.movables;
    std::stable_sort(all.begin(), all.end(),
                     [](const auto& a, const auto& b) { return a.bytes > b.bytes; });
    for (auto first = all.begin(); first != all.end();) {
      const auto last = std::find_if(
          first, all.end(), [&](const auto& other) { return other.bytes != first->bytes; });
      PlaceAlike({first, last}, space.free);
      first = last;
    }
  }

  struct Move {
    uint32_t bytes, to;
  };
  const std::map<uint32_t, Move>& All() const { return moves_; }

  /// Where what stands at `position` will stand.
  uint32_t Moved(uint32_t position) const {
    auto at = moves_.upper_bound(position);
    if (at == moves_.begin()) return position;
    const auto& [from, move] = *--at;
    return position - from < move.bytes ? move.to + (position - from) : position;
  }

 private:
  /// Things of one size, ascending: as many as can go to a lower place, the last ones, so that no
  /// more move than there are places, and their order stays.
  void PlaceAlike(std::span<const HfaMovable> alike, ByteRanges& free) {
    const uint32_t bytes = alike.front().bytes;
    std::vector<uint32_t> places;
    while (places.size() < alike.size()) {
      const auto place = free.TakeBefore(alike.back().position, bytes);
      if (!place) break;
      places.push_back(static_cast<uint32_t>(*place));
    }
    const auto fits = [&](size_t count) {
      const auto last = alike.last(count);
      for (size_t i = 0; i < count; ++i)
        if (places[i] >= last[i].position) return false;
      return true;
    };
    size_t count = 0, tooMany = places.size() + 1;
    while (count + 1 < tooMany) {
      const size_t middle = (count + tooMany) / 2;
      (fits(middle) ? count : tooMany) = middle;
    }
    for (size_t i = 0; i < count; ++i) moves_[alike.last(count)[i].position] = {bytes, places[i]};
    for (size_t i = count; i < places.size(); ++i)
      free.Add({places[i], uint64_t{places[i]} + bytes});
  }

  std::map<uint32_t, Move> moves_;
};

/// What stands at `from`, as it is where it goes: its own pointers lead to where things will be.
std::string CopyOf(PatchedFile& file, uint32_t from, uint32_t count, const HfaSpace& space,
                   const Moves& moves) {
  std::string bytes(count, '\0');  // what the file ends before was never written
  file.Read(from, bytes.data(), bytes.size());
  const auto first = std::lower_bound(
      space.pointers.begin(), space.pointers.end(), from,
      [](const HfaPointer& pointer, uint32_t at) { return pointer.position < at; });
  for (auto at = first; at != space.pointers.end() && at->position - from + 4 <= count; ++at)
    PutHfaNumber(bytes, at->position - from, moves.Moved(at->value));
  return bytes;
}

}  // namespace

HfaSpace FindHfaSpace(const std::string& path, const ByteRanges& given) {
  return SpaceFinder(path).Find(given);
}

ByteRanges HfaBytesOf(const std::string& path, const HfaNode& node) {
  return SpaceFinder(path).BytesOf(node);
}

uint64_t MoveHfaLevelsDown(const std::string& path, HfaSpace space) {
  const Moves moves(space);
  if (moves.All().empty()) return 0;
  PatchedFile file(path);
  uint64_t moved = 0;
  for (const auto& [from, move] : moves.All()) {
    const std::string bytes = CopyOf(file, from, move.bytes, space, moves);
    file.WriteNow(move.to, bytes.data(), bytes.size());
    moved += bytes.size();
  }
  std::string number(4, '\0');
  for (const HfaPointer& pointer : space.pointers) {
    const uint32_t value = moves.Moved(pointer.value);
    // Pointers in what moves change in the copy alone: those in the original lead to originals.
    if (value == pointer.value || moves.Moved(pointer.position) != pointer.position) continue;
    PutHfaNumber(number, 0, value);
    file.Write(pointer.position, number.data(), number.size());
  }
  file.RequireWritten();
  file.Commit();
  return moved;
}

}  // namespace orin::drivers
