// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfanode.h"

#include <algorithm>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr uint32_t kHeaderPointerAt = 16;
constexpr uint32_t kHeaderBytes = 18;
constexpr uint32_t kReadBytes = 120;  // of a node
constexpr uint32_t kNameBytes = 64;

constexpr uint32_t kMaxDataBytes = 64 << 20;  // of a node: the blocks of a file of 2 GB take 7 MB
constexpr uint64_t kMaxVisits = 16;           // of a node; more is a loop

std::string TextAt(std::string_view bytes, size_t at, size_t length) {
  const std::string_view field = bytes.substr(at, length);
  return std::string(field.substr(0, field.find('\0')));
}

}  // namespace

uint32_t HfaNumberAt(std::string_view bytes, size_t at) {
  uint32_t number = 0;
  for (size_t i = 0; i < 4 && at + i < bytes.size(); ++i)
    number |= uint32_t{static_cast<uint8_t>(bytes[at + i])} << (8 * i);
  return number;
}

void PutHfaNumber(std::string& bytes, size_t at, uint32_t number) {
  for (size_t i = 0; i < 4; ++i) bytes.at(at + i) = static_cast<char>(number >> (8 * i) & 255);
}

HfaTree::HfaTree(const std::string& path)
    : path_(path), file_(VSIFOpenL(path.c_str(), "rb"), [](VSILFILE* f) { VSIFCloseL(f); }) {
  if (!file_) Fail();
  maxNodesRead_ = kMaxVisits * (1 + Size() / kHfaNodeBytes);
}

void HfaTree::Fail() const {
  throw Exception(FormatString(_("%s: cannot be read: %s."), path_.c_str(),
                               _("its list of contents is damaged")),
                  "host/drivers/hfa/hfanode", "orin::drivers::HfaTree", 0);
}

std::string HfaTree::Bytes(uint64_t position, uint32_t count) {
  if (count > kMaxDataBytes || position + count > Size()) Fail();
  std::string bytes(count, '\0');
  if (VSIFSeekL(file_.get(), position, SEEK_SET) != 0 ||
      VSIFReadL(bytes.data(), 1, count, file_.get()) != count)
    Fail();
  return bytes;
}

uint64_t HfaTree::Size() {
  if (VSIFSeekL(file_.get(), 0, SEEK_END) != 0) Fail();
  return VSIFTellL(file_.get());
}

HfaTree::Header HfaTree::FileHeader() {
  const uint32_t position = HfaNumberAt(Bytes(kHeaderPointerAt, 4), 0);
  const std::string header = Bytes(position, kHeaderBytes);
  return {position, HfaNumberAt(header, 4), HfaNumberAt(header, 14)};
}

HfaNode HfaTree::Root() {
  constexpr uint32_t kRootAt = 8;
  return NodeAt(HfaNumberAt(Bytes(FileHeader().position, kHeaderBytes), kRootAt), 0);
}

std::string HfaTree::NodeBytes(const HfaNode& node) {
  const uint64_t left = Size() - std::min<uint64_t>(Size(), node.position);
  std::string bytes = Bytes(node.position, uint32_t(std::min<uint64_t>(kHfaNodeBytes, left)));
  bytes.resize(kHfaNodeBytes);
  return bytes;
}

std::vector<HfaNode> HfaTree::ChildrenOf(const HfaNode& parent) {
  std::vector<HfaNode> children;
  uint32_t pointer = parent.position + kHfaChildAt;
  for (uint32_t at = parent.child; at != 0; at = children.back().next) {
    if (++nodesRead_ > maxNodesRead_) Fail();
    children.push_back(NodeAt(at, pointer));
    pointer = at + kHfaNextAt;
  }
  return children;
}

HfaNode HfaTree::NodeAt(uint32_t position, uint32_t pointer) {
  const std::string bytes = Bytes(position, kReadBytes);
  return {position,
          pointer,
          HfaNumberAt(bytes, kHfaPreviousAt),
          HfaNumberAt(bytes, kHfaNextAt),
          HfaNumberAt(bytes, kHfaParentAt),
          HfaNumberAt(bytes, kHfaChildAt),
          HfaNumberAt(bytes, kHfaDataAt),
          HfaNumberAt(bytes, kHfaDataAt + 4),
          TextAt(bytes, kHfaNameAt, kNameBytes),
          TextAt(bytes, kHfaTypeAt, kHfaTypeBytes)};
}

}  // namespace orin::drivers
