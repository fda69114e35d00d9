// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfatree.h"

#include <cpl_vsi.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

// Positions within the file's parts, bytes; all numbers are little-endian.
constexpr uint32_t kHeaderPointerAt = 16;
constexpr uint32_t kRootPointerInHeader = 8;
constexpr uint32_t kNodeBytes = 124;
constexpr uint32_t kNameAt = 24, kNameBytes = 64;
constexpr uint32_t kTypeAt = 88, kTypeBytes = 32;

constexpr unsigned kMostNodes = 100000;        // more is a loop, or no file to work with
constexpr uint32_t kMostListBytes = 1u << 20;  // of a list of names

constexpr uint32_t kNextAt = 0, kPreviousAt = 4, kChildAt = 12;

struct Node {
  uint32_t position, next, child, data, dataBytes;
  std::string name, type;
};

uint32_t NumberAt(std::string_view bytes, size_t at) {
  uint32_t number = 0;
  for (size_t i = 0; i < 4 && at + i < bytes.size(); ++i)
    number |= uint32_t{static_cast<uint8_t>(bytes[at + i])} << (8 * i);
  return number;
}

std::string TextAt(std::string_view bytes, size_t at, size_t length) {
  const std::string_view field = bytes.substr(at, length);
  return std::string(field.substr(0, field.find('\0')));
}

class TreeReader {
 public:
  explicit TreeReader(const std::string& path)
      : path_(path), file_(VSIFOpenL(path.c_str(), "rb"), [](VSILFILE* f) { VSIFCloseL(f); }) {
    if (!file_) Fail();
  }

  Node Root() {
    return NodeAt(
        NumberAt(Bytes(NumberAt(Bytes(kHeaderPointerAt, 4), 0), 20), kRootPointerInHeader));
  }

  std::vector<Node> ChildrenOf(const Node& parent) {
    std::vector<Node> children;
    for (uint32_t at = parent.child; at != 0; at = children.back().next) {
      if (++nodesRead_ > kMostNodes) Fail();
      children.push_back(NodeAt(at));
    }
    return children;
  }

  std::string DataOf(const Node& node) {
    return Bytes(node.data, std::min(node.dataBytes, kMostListBytes));
  }

 private:
  std::string Bytes(uint32_t position, uint32_t count) {
    std::string bytes(count, '\0');
    if (VSIFSeekL(file_.get(), position, SEEK_SET) != 0 ||
        VSIFReadL(bytes.data(), 1, count, file_.get()) != count)
      Fail();
    return bytes;
  }

  Node NodeAt(uint32_t position) {
    const std::string bytes = Bytes(position, kNodeBytes);
    return {position,
            NumberAt(bytes, kNextAt),
            NumberAt(bytes, kChildAt),
            NumberAt(bytes, 16),
            NumberAt(bytes, 20),
            TextAt(bytes, kNameAt, kNameBytes),
            TextAt(bytes, kTypeAt, kTypeBytes)};
  }

  [[noreturn]] void Fail() const {
    throw Exception(FormatString(_("%s: cannot be read: %s."), path_.c_str(),
                                 _("its list of contents is damaged")),
                    "host/drivers/gdal/hfatree", "orin::drivers::ReadHfaPyramid", 0);
  }

  std::string path_;
  std::unique_ptr<VSILFILE, void (*)(VSILFILE*)> file_;
  unsigned nodesRead_ = 0;
};

/// "scene.img(:Layer_1:_ss_4_)"; factor 0 for what is no level.
HfaLevelName ParseName(std::string_view text) {
  HfaLevelName name;
  const size_t layer = text.find("(:");
  const size_t factor = text.rfind("_ss_");
  if (layer == text.npos) return name;
  name.file = text.substr(0, layer);
  if (factor != text.npos)
    std::from_chars(text.data() + factor + 4, text.data() + text.size(), name.factor);
  return name;
}

/// A text is its length, a position that nobody needs, and its characters. The list's first text is
/// the name of a method; then come the number of names, a position, and the names.
std::vector<HfaLevelName> ParseNames(std::string_view data) {
  std::vector<HfaLevelName> names;
  size_t at = 8 + size_t{NumberAt(data, 0)};
  if (at + 8 > data.size()) return names;
  const uint32_t count = NumberAt(data, at);
  at += 8;
  for (uint32_t i = 0; i < count && at + 8 <= data.size(); ++i) {
    const size_t length = NumberAt(data, at);
    at += 8;
    if (length > data.size() - at) break;
    if (length > 0) names.push_back(ParseName(TextAt(data, at, length)));
    at += length;
  }
  return names;
}

}  // namespace

bool HfaPyramid::NamesAnotherFileThan(const std::string& name) const {
  return std::any_of(channels.begin(), channels.end(), [&](const auto& levels) {
    return std::any_of(levels.begin(), levels.end(), [&](const HfaLevelName& level) {
      return !level.file.empty() && level.file != name;
    });
  });
}

int HfaPyramid::Find(unsigned channel, unsigned factor) const {
  if (channel < 1 || channel > channels.size()) return -1;
  const auto& levels = channels[channel - 1];
  const auto found = std::find_if(levels.begin(), levels.end(),
                                  [&](const HfaLevelName& l) { return l.factor == factor; });
  return found == levels.end() ? -1 : static_cast<int>(found - levels.begin());
}

std::vector<HfaPointer> PointersWithout(const HfaItemPlace& item) {
  std::vector<HfaPointer> pointers;
  pointers.push_back(item.previous ? HfaPointer{item.previous + kNextAt, item.next}
                                   : HfaPointer{item.parent + kChildAt, item.next});
  if (item.next) pointers.push_back({item.next + kPreviousAt, item.previous});
  return pointers;
}

std::optional<HfaItemPlace> FindHfaItem(const std::string& path, const std::string& key) {
  TreeReader tree(path);
  for (const Node& table : tree.ChildrenOf(tree.Root())) {
    if (table.name != "GDAL_MetaData" || table.type != "Edsc_Table") continue;
    uint32_t previous = 0;
    for (const Node& column : tree.ChildrenOf(table)) {
      if (column.name == key && column.type == "Edsc_Column") {
        const std::string data = tree.DataOf(column);  // rows, position, type of 2 bytes, length
        return HfaItemPlace{NumberAt(data, 4), NumberAt(data, 10), column.position,
                            previous,          column.next,        table.position};
      }
      previous = column.position;
    }
  }
  return std::nullopt;
}

HfaPyramid ReadHfaPyramid(const std::string& path) {
  TreeReader tree(path);
  HfaPyramid pyramid;
  for (const Node& layer : tree.ChildrenOf(tree.Root())) {
    if (layer.type != "Eimg_Layer") continue;
    std::vector<HfaLevelName> names, unlisted;
    for (const Node& part : tree.ChildrenOf(layer)) {
      if (part.type == "Eimg_RRDNamesList") names = ParseNames(tree.DataOf(part));
      if (part.type == "Eimg_Layer_SubSample") unlisted.push_back(ParseName("(:" + part.name));
      if (part.type == "ImgExternalRaster") pyramid.isSpilled = true;
    }
    // As the library does: without a list, what is there counts in the order of the nodes.
    pyramid.channels.push_back(std::move(names.empty() ? unlisted : names));
  }
  return pyramid;
}

}  // namespace orin::drivers
