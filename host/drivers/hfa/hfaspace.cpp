// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfaspace.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "host/drivers/hfa/hfablocks.h"
#include "host/drivers/hfa/hfacatalogue.h"

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

constexpr uint32_t kMaxTextBytes = 1 << 20;
constexpr uint32_t kIdentityBytes = kHfaTypeAt + kHfaTypeBytes - kHfaDataAt;  // data, name, type

class SpaceFinder {
 public:
  explicit SpaceFinder(const std::string& path) : path_(path), tree_(path) {
    space_.size = tree_.Size();
  }

  HfaSpace Find(const ByteRanges& given) {
    WalkAll();
    if (!isKnown_) return {space_.size, space_.size, {}, {}, {}};
    space_.end = std::max(movable_.End(), others_.End());
    space_.free.Add({others_.End(), space_.size});
    space_.free.Add(given);
    FreeReplacedNodes();
    space_.free.Remove({space_.size, UINT64_MAX});
    space_.free.Remove(movable_);
    space_.free.Remove(others_);
    KeepMovablesApart();
    std::sort(space_.pointers.begin(), space_.pointers.end(),
              [](const auto& a, const auto& b) { return a.position < b.position; });
    return std::move(space_);
  }

  ByteRanges Used() {
    WalkAll();
    others_.Add(movable_);
    return std::move(others_);
  }

 private:
  void WalkAll() {
    UseHeader();
    Walk(tree_.Root(), false, 0);
    WalkPending();
  }

  /// Levels that wait: an item's text, which is no number, leads to their first nodes.
  void WalkPending() {
    const HfaCatalogue catalogue = ReadHfaCatalogue(path_, HfaLayersOf(tree_).size());
    for (const auto& [level, pending] : catalogue.pending)
      for (const uint32_t part : pending.parts) {
        if (part == 0) continue;
        Walk(tree_.NodeAt(part), true, 1);
        std::erase_if(space_.movables, [&](const auto& m) { return m.position == part; });
      }
  }

  void UseHeader() {
    constexpr uint32_t kStartBytes = 20, kHeaderBytes = 18;
    const HfaTree::Header header = tree_.FileHeader();
    Use(0, kStartBytes);
    Use(header.position, kHeaderBytes);
    UseText(header.dictionary);
    NotePointer(header.RootPointer(), tree_.Root().position);
    isKnown_ = isKnown_ && header.freeList == 0;
  }

  void Use(uint32_t start, uint64_t bytes) {
    isLevel_ ? UseMovable(start, bytes) : Fix(start, bytes);
  }

  void UseMovable(uint32_t start, uint64_t bytes) {
    if (bytes == 0) return;
    movable_.Add({start, start + bytes});
    space_.movables.push_back({start, static_cast<uint32_t>(bytes)});
  }

  void Fix(uint32_t start, uint64_t bytes) {
    if (bytes > 0) others_.Add({start, start + bytes});
  }

  void NotePointer(uint32_t position, uint32_t value) {
    if (value != 0) space_.pointers.push_back({position, value});
  }

  /// Of a text that ends with a zero.
  void UseText(uint32_t start) {
    for (uint32_t bytes = 0; bytes < kMaxTextBytes && start + uint64_t{bytes} < space_.size;) {
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
    UseMovable(node.position, kHfaNodeBytes);
    nodes_.insert(tree_.NodeBytes(node).substr(kHfaDataAt, kIdentityBytes));
    NotePointer(node.position + kHfaNextAt, node.next);
    NotePointer(node.position + kHfaPreviousAt, node.previous);
    NotePointer(node.position + kHfaParentAt, node.parent);
    NotePointer(node.position + kHfaChildAt, node.child);
    NotePointer(node.position + kHfaDataAt, node.data);
    UseData(node);
    if (node.child != 0 && depth == kDeepestHfaNode) tree_.Fail();
    for (const HfaNode& child : tree_.ChildrenOf(node)) Walk(child, isLevel, depth + 1);
  }

  /// A change of the tree leaves its old nodes behind, in front of the image's data as well. Such a
  /// one has the name, the type and the data of one that is used.
  void FreeReplacedNodes() {
    constexpr uint64_t kMaxBytes = 1 << 18;  // that are looked through
    ByteRanges gaps;
    gaps.Add({0, std::min(others_.End(), space_.size)});
    gaps.Remove(others_);
    gaps.Remove(movable_);
    uint64_t looked = 0;
    for (const auto& [start, end] : gaps) {
      looked += end - start;
      if (looked > kMaxBytes) return;
      const std::string bytes = tree_.Bytes(start, static_cast<uint32_t>(end - start));
      for (size_t at = 0; at + kHfaNodeBytes <= bytes.size();) {
        const bool isNode = nodes_.contains(bytes.substr(at + kHfaDataAt, kIdentityBytes));
        if (isNode) space_.free.Add({start + at, start + at + kHfaNodeBytes});
        at += isNode ? kHfaNodeBytes : 1;
      }
    }
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

  std::string path_;
  HfaTree tree_;
  HfaSpace space_;
  ByteRanges movable_, others_;
  std::unordered_set<std::string> nodes_;  ///< what tells one from another
  bool isLevel_ = false;                   ///< what is being added belongs to levels
  bool isKnown_ = true;
};

}  // namespace

HfaSpace FindHfaSpace(const std::string& path, const ByteRanges& given) {
  return SpaceFinder(path).Find(given);
}

ByteRanges UsedHfaBytes(const std::string& path) { return SpaceFinder(path).Used(); }

}  // namespace orin::drivers
