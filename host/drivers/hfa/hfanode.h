/// The nodes of an ERDAS Imagine file (.img), as they stand in the file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <cpl_vsi.h>

namespace orin::drivers {

// Positions within a node, bytes; all numbers of the format are little-endian.
inline constexpr uint32_t kHfaNextAt = 0, kHfaPreviousAt = 4, kHfaParentAt = 8, kHfaChildAt = 12;
inline constexpr uint32_t kHfaDataAt = 16;
inline constexpr uint32_t kHfaNameAt = 24, kHfaTypeAt = 88, kHfaTypeBytes = 32;
inline constexpr uint32_t kHfaNodeBytes = 128;   ///< the last four mean nothing
inline constexpr unsigned kDeepestHfaNode = 30;  ///< below the root; more is no file to work with

/// A number of the file that leads to other bytes.
struct HfaPointer {
  uint32_t position;
  uint32_t value;
};

/// Positions are those in the file; 0: there is none.
struct HfaNode {
  uint32_t position = 0;
  uint32_t pointer = 0;  ///< where the number stands that leads to it; 0 for the root
  uint32_t previous = 0;
  uint32_t next = 0;
  uint32_t parent = 0;
  uint32_t child = 0;
  uint32_t data = 0;
  uint32_t dataBytes = 0;
  std::string name = {}, type = {};
};

/// The 4-byte number at `at`; what lies behind the end counts as zeros.
uint32_t HfaNumberAt(std::string_view bytes, size_t at);
/// Puts it there. \pre at + 4 <= bytes.size()
void PutHfaNumber(std::string& bytes, size_t at, uint32_t number);

/// Reads the tree. Operations throw orin::Exception when it is damaged.
class HfaTree {
 public:
  /// \param path  also a name of the library: "/vsizip/..."
  explicit HfaTree(const std::string& path);

  HfaNode Root();
  /// The node that stands at `position`, which no other node needs to lead to.
  HfaNode NodeAt(uint32_t position) { return NodeAt(position, 0); }
  /// All bytes of a node; what lies behind the file's end counts as zeros.
  std::string NodeBytes(const HfaNode& node);
  std::vector<HfaNode> ChildrenOf(const HfaNode& parent);
  std::string DataOf(const HfaNode& node) { return Bytes(node.data, node.dataBytes); }
  std::string Bytes(uint64_t position, uint32_t count);

  struct Header {
    uint32_t position, freeList, dictionary;
    uint32_t RootPointer() const { return position + 8; }         ///< where the number stands
    uint32_t DictionaryPointer() const { return position + 14; }  ///< the same
  };
  Header FileHeader();
  /// Of the file, bytes.
  uint64_t Size();
  [[noreturn]] void Fail() const;

 private:
  HfaNode NodeAt(uint32_t position, uint32_t pointer);

  std::string path_;
  std::unique_ptr<VSILFILE, void (*)(VSILFILE*)> file_;
  uint64_t nodesRead_ = 0;
  uint64_t maxNodesRead_ = 0;  ///< nodes have no bytes in common, so that so many would be a loop
};

}  // namespace orin::drivers
