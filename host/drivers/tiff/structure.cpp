// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/structure.h"

#include <algorithm>
#include <array>
#include <optional>
#include <set>

#include <tiff.h>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr size_t kMostDirectories = 65535;

[[noreturn]] void Refuse(const PositionedFile& file, const char* reason) {
  throw Exception(FormatString(_("%s: cannot be read: %s."), file.Path().c_str(), reason),
                  "host/drivers/tiff/structure", "ParseStructure(const PositionedFile&)", 0);
}

/// Reads the directories of one file.
class Parser {
 public:
  Parser(const PositionedFile& file, const TiffStructure& structure)
      : file_(file), structure_(structure), size_(file.Size()) {}

  /// Reads the header into `structure`, which is the parser's. \returns the link to the first
  /// directory
  uint64_t ReadHeader(TiffStructure& structure) const;
  /// The directory at `offset`, or none when there is no valid one.
  std::optional<TiffDirectory> ReadDirectory(uint64_t offset) const;

 private:
  bool Holds(uint64_t position, uint64_t count) const {
    return position <= size_ && count <= size_ - position;
  }
  uint64_t Number(uint64_t position, unsigned width) const;
  void AddEntry(const uint8_t* raw, uint64_t position, TiffDirectory& directory) const;

  const PositionedFile& file_;
  const TiffStructure& structure_;
  uint64_t size_;
};

uint64_t Parser::Number(uint64_t position, unsigned width) const {
  std::array<uint8_t, 8> bytes;
  file_.Read(position, bytes.data(), width);
  return structure_.byteOrder.Number(bytes.data(), width);
}

uint64_t Parser::ReadHeader(TiffStructure& structure) const {
  std::array<uint8_t, 4> start{};
  if (!Holds(0, 8)) Refuse(file_, _("it is no TIFF file"));
  file_.Read(0, start.data(), start.size());
  const bool little = start[0] == 'I' && start[1] == 'I';
  if (!little && !(start[0] == 'M' && start[1] == 'M')) Refuse(file_, _("it is no TIFF file"));
  structure.byteOrder.order = little ? std::endian::little : std::endian::big;
  const uint64_t version = structure_.byteOrder.Number(&start[2], 2);
  structure.isBig = version == TIFF_VERSION_BIG;
  const bool isKnown = version == TIFF_VERSION_CLASSIC ||
                       (structure_.isBig && Holds(0, 16) && Number(4, 2) == 8 && Number(6, 2) == 0);
  if (!isKnown) Refuse(file_, _("it is no TIFF file"));
  return Number(structure_.HeadLinkPosition(), structure_.LinkBytes());
}

void Parser::AddEntry(const uint8_t* raw, uint64_t position, TiffDirectory& directory) const {
  const ByteOrder& order = structure_.byteOrder;
  const unsigned width = structure_.LinkBytes();
  TiffEntry entry;
  entry.tag = static_cast<uint16_t>(order.Number(raw, 2));
  entry.type = static_cast<uint16_t>(order.Number(raw + 2, 2));
  entry.count = order.Number(raw + 4, width);
  const unsigned element = ElementBytes(entry.type);
  if (element == 0 || entry.count > size_ / element) return;
  entry.bytes = entry.count * element;
  const bool isInline = entry.bytes <= width;
  std::copy_n(raw + 4 + width, width, entry.field.begin());
  entry.position = isInline ? position + 4 + width : order.Number(raw + 4 + width, width);
  if (Holds(entry.position, entry.bytes)) directory.entries.push_back(entry);
}

std::optional<TiffDirectory> Parser::ReadDirectory(uint64_t offset) const {
  const unsigned countBytes = structure_.isBig ? 8 : 2;
  const unsigned entryBytes = structure_.isBig ? 20 : 12;
  if (offset < structure_.HeaderBytes() || !Holds(offset, countBytes)) return std::nullopt;
  const uint64_t count = Number(offset, countBytes);
  if (count == 0 || count > size_ / entryBytes) return std::nullopt;
  const uint64_t start = offset + countBytes;
  if (!Holds(start, count * entryBytes + structure_.LinkBytes())) return std::nullopt;
  const uint64_t held = count * entryBytes;
  std::vector<uint8_t> raw(held + structure_.LinkBytes());
  file_.Read(start, raw.data(), raw.size());
  TiffDirectory directory;
  directory.offset = offset;
  directory.linkPosition = start + held;
  directory.next = structure_.byteOrder.Number(&raw[held], structure_.LinkBytes());
  for (uint64_t i = 0; i < count; ++i)
    AddEntry(&raw[i * entryBytes], start + i * entryBytes, directory);
  return directory;
}

}  // namespace

uint64_t ByteOrder::Number(const uint8_t* bytes, unsigned width) const {
  uint64_t number = 0;
  for (unsigned i = 0; i < width; ++i)
    number = number << 8 | bytes[order == std::endian::big ? i : width - 1 - i];
  return number;
}

void ByteOrder::Put(uint64_t number, unsigned width, uint8_t* bytes) const {
  for (unsigned i = 0; i < width; ++i, number >>= 8)
    bytes[order == std::endian::big ? width - 1 - i : i] = static_cast<uint8_t>(number);
}

void ByteOrder::Swap(std::vector<uint8_t>& bytes, unsigned elementBytes) const {
  if (!IsSwapped() || elementBytes < 2) return;
  for (size_t i = 0; i + elementBytes <= bytes.size(); i += elementBytes)
    std::reverse(bytes.begin() + static_cast<ptrdiff_t>(i),
                 bytes.begin() + static_cast<ptrdiff_t>(i + elementBytes));
}

unsigned ElementBytes(uint16_t type) {
  switch (type) {
    case TIFF_BYTE:
    case TIFF_ASCII:
    case TIFF_SBYTE:
    case TIFF_UNDEFINED:
      return 1;
    case TIFF_SHORT:
    case TIFF_SSHORT:
      return 2;
    case TIFF_LONG:
    case TIFF_SLONG:
    case TIFF_FLOAT:
    case TIFF_IFD:
      return 4;
    case TIFF_RATIONAL:
    case TIFF_SRATIONAL:
    case TIFF_DOUBLE:
      return 8;
    case TIFF_LONG8:
    case TIFF_SLONG8:
    case TIFF_IFD8:
      return 8;
    default:
      return 0;
  }
}

unsigned SwapBytes(uint16_t type) {
  return type == TIFF_RATIONAL || type == TIFF_SRATIONAL ? 4 : ElementBytes(type);
}

const TiffEntry* TiffDirectory::Find(uint16_t tag) const {
  const auto found = std::find_if(entries.begin(), entries.end(),
                                  [tag](const TiffEntry& entry) { return entry.tag == tag; });
  return found == entries.end() ? nullptr : &*found;
}

std::optional<TiffDirectory> ReadDirectoryAt(const PositionedFile& file,
                                             const TiffStructure& structure, uint64_t offset) {
  return Parser(file, structure).ReadDirectory(offset);
}

TiffStructure ParseStructure(const PositionedFile& file) {
  TiffStructure structure;
  const Parser parser(file, structure);
  uint64_t offset = parser.ReadHeader(structure);
  std::set<uint64_t> seen;
  uint64_t unread = file.Size();  // directories that do not overlap are not larger than the file
  while (offset != 0 && structure.directories.size() < kMostDirectories &&
         seen.insert(offset).second) {
    auto directory = parser.ReadDirectory(offset);
    const bool isImage =
        directory && directory->Find(TIFFTAG_IMAGEWIDTH) && directory->Find(TIFFTAG_IMAGELENGTH);
    if (!isImage || directory->linkPosition - offset > unread) break;
    unread -= directory->linkPosition - offset;
    offset = directory->next;
    structure.directories.push_back(std::move(*directory));
  }
  if (structure.directories.empty()) Refuse(file, _("it holds no directory of an image"));
  structure.isBroken = offset != 0;
  const bool isCut = structure.directories.size() < kMostDirectories;
  if (isCut) structure.directories.back().next = 0;  // a dangling or looping link ends the chain
  return structure;
}

std::vector<uint8_t> ReadBytes(const PositionedFile& file, const TiffStructure& structure,
                               const TiffEntry& entry) {
  std::vector<uint8_t> bytes(entry.bytes);
  file.Read(entry.position, bytes.data(), bytes.size());
  structure.byteOrder.Swap(bytes, SwapBytes(entry.type));
  return bytes;
}

std::vector<uint64_t> ReadNumbers(const PositionedFile& file, const TiffStructure& structure,
                                  const TiffEntry& entry) {
  std::vector<uint64_t> numbers;
  switch (entry.type) {
    case TIFF_BYTE:
    case TIFF_SHORT:
    case TIFF_LONG:
    case TIFF_LONG8:
    case TIFF_IFD:
    case TIFF_IFD8:
      break;
    default:
      return numbers;
  }
  std::vector<uint8_t> bytes(entry.bytes);
  file.Read(entry.position, bytes.data(), bytes.size());
  const unsigned width = ElementBytes(entry.type);
  numbers.reserve(entry.count);
  for (uint64_t i = 0; i < entry.count; ++i)
    numbers.push_back(structure.byteOrder.Number(&bytes[i * width], width));
  return numbers;
}

bool HoldsNumber(const PositionedFile& file, const TiffStructure& structure, const TiffEntry& entry,
                 uint64_t sought) {
  constexpr uint64_t kAtOnce = 1 << 16;
  const unsigned width = ElementBytes(entry.type);
  for (uint64_t done = 0; done < entry.count; done += kAtOnce) {
    TiffEntry part = entry;
    part.count = std::min(kAtOnce, entry.count - done);
    part.bytes = part.count * width;
    part.position = entry.position + done * width;
    const std::vector<uint64_t> numbers = ReadNumbers(file, structure, part);
    if (std::find(numbers.begin(), numbers.end(), sought) != numbers.end()) return true;
  }
  return false;
}

uint64_t NumberOf(const PositionedFile& file, const TiffStructure& structure,
                  const TiffDirectory& directory, uint16_t tag, uint64_t otherwise) {
  const TiffEntry* entry = directory.Find(tag);
  if (!entry || entry->count == 0) return otherwise;
  const bool isUnsigned = entry->type == TIFF_BYTE || entry->type == TIFF_SHORT ||
                          entry->type == TIFF_LONG || entry->type == TIFF_LONG8;
  const bool isAtHand = isUnsigned && entry->bytes <= structure.LinkBytes();
  if (isAtHand)  // no read: a file may have very many directories
    return structure.byteOrder.Number(entry->field.data(), ElementBytes(entry->type));
  TiffEntry first = *entry;
  first.count = 1;
  first.bytes = ElementBytes(entry->type);
  const std::vector<uint64_t> numbers = ReadNumbers(file, structure, first);
  return numbers.empty() ? otherwise : numbers.front();
}

}  // namespace orin::drivers
