// SPDX-License-Identifier: MIT
#include "host/drivers/common/auxiliaryfile.h"

#include <expat.h>
#include <fcntl.h>
#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <bit>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <memory>
#include <optional>

#include "host/drivers/common/descriptor.h"

namespace orin::drivers {
namespace {

constexpr uint64_t kMaxBytes = uint64_t{64} << 20;
constexpr size_t kMaxValueBytes = 4096;

bool Is(const char* name, const char* other) { return strcasecmp(name, other) == 0; }

/// The attribute's text, or null.
const char* AttributeOf(const char** attributes, const char* name) {
  for (; *attributes; attributes += 2)
    if (Is(attributes[0], name)) return attributes[1];
  return nullptr;
}

unsigned ChannelOf(const char** attributes) {
  const char* text = AttributeOf(attributes, "band");
  unsigned channel = 0;
  if (text) std::from_chars(text, text + std::string_view(text).size(), channel);
  return channel;
}

std::string TextOf(double value) {
  if (std::isnan(value)) return "nan";
  char digits[32];
  return {digits, std::to_chars(std::begin(digits), std::end(digits), value).ptr};
}

/// The text of the double whose eight bytes, the lowest first, are written in hexadecimal: beside a
/// decimal text that was rounded.
std::optional<std::string> ExactText(const char* hex) {
  if (!hex || std::string_view(hex).size() != 16) return std::nullopt;
  uint64_t bits = 0;
  for (int byte = 0; byte < 8; ++byte) {
    unsigned value = 0;
    const char* end = hex + 2 * byte + 2;
    if (std::from_chars(hex + 2 * byte, end, value, 16).ptr != end) return std::nullopt;
    bits |= uint64_t{value} << (8 * byte);
  }
  return TextOf(std::bit_cast<double>(bits));
}

std::string Trimmed(const std::string& text) {
  constexpr char kBlanks[] = " \t\r\n";
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == text.npos) return {};
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

/// Follows the elements of one text: PAMDataset / PAMRasterBand / NoDataValue.
class Elements {
 public:
  explicit Elements(XML_Parser parser) : parser_(parser) {}

  void Start(const char* name, const char** attributes) {
    ++depth_;
    if (depth_ == 1 && !Is(name, "PAMDataset")) XML_StopParser(parser_, XML_FALSE);
    if (depth_ == 2) channel_ = Is(name, "PAMRasterBand") ? ChannelOf(attributes) : 0;
    if (depth_ == 2) hasValue_ = false;
    if (depth_ != 3 || channel_ == 0) return;
    if (Is(name, "CategoryNames")) found_.namesCategories = true;
    isInValue_ = Is(name, "NoDataValue") && !hasValue_;  // the first one of a channel counts
    if (!isInValue_) return;
    value_.clear();
    exact_ = ExactText(AttributeOf(attributes, "le_hex_equiv"));
  }

  void End() {
    if (depth_ == 3 && isInValue_) {
      const std::string text = exact_.value_or(Trimmed(value_));
      hasValue_ = true;
      isInValue_ = false;
      if (!text.empty()) found_.noData[channel_] = text;
    }
    --depth_;
  }

  void Text(const char* bytes, int count) {
    if (isInValue_ && depth_ == 3 && value_.size() < kMaxValueBytes)
      value_.append(bytes, static_cast<size_t>(count));
  }

  /// A text that defines its own abbreviations is none that raster programs write.
  void Define() { XML_StopParser(parser_, XML_FALSE); }

  AuxiliaryFile Take() { return std::move(found_); }

 private:
  XML_Parser parser_;
  AuxiliaryFile found_;
  int depth_ = 0;
  unsigned channel_ = 0;  ///< of the element of depth 2; 0 for another kind of element
  bool hasValue_ = false;
  bool isInValue_ = false;
  std::string value_;
  std::optional<std::string> exact_;
};

Elements& Of(void* data) { return *static_cast<Elements*>(data); }

/// \param encoding  null: as the text says, else UTF-8
std::optional<AuxiliaryFile> Parse(std::string_view text, bool isWhole, const char* encoding) {
  const std::unique_ptr<XML_ParserStruct, decltype(&XML_ParserFree)> parser(
      XML_ParserCreate(encoding), XML_ParserFree);
  if (!parser) throw std::bad_alloc();
  Elements elements(parser.get());
  XML_SetUserData(parser.get(), &elements);
  XML_SetElementHandler(
      parser.get(),
      [](void* data, const char* name, const char** attributes) {
        Of(data).Start(name, attributes);
      },
      [](void* data, const char*) { Of(data).End(); });
  XML_SetCharacterDataHandler(
      parser.get(), [](void* data, const char* bytes, int count) { Of(data).Text(bytes, count); });
  XML_SetEntityDeclHandler(
      parser.get(), [](void* data, const char*, int, const char*, int, const char*, const char*,
                       const char*, const char*) { Of(data).Define(); });
  const int size = static_cast<int>(std::min(text.size(), size_t{kMaxBytes}));
  if (XML_Parse(parser.get(), text.data(), size, isWhole) != XML_STATUS_OK) return std::nullopt;
  return elements.Take();
}

/// A descriptor that is closed again.
class Opened {
 public:
  explicit Opened(const std::string& path)
      : descriptor_(OpenDescriptor(path, O_RDONLY | O_NONBLOCK | O_NOCTTY)) {}
  ~Opened() {
    if (descriptor_ >= 0) close(descriptor_);
  }
  Opened(const Opened&) = delete;
  Opened& operator=(const Opened&) = delete;

  /// Empty when it is no regular file.
  std::string Beginning(bool& isWhole) const {
    struct stat status;
    if (descriptor_ < 0 || fstat(descriptor_, &status) != 0 || !S_ISREG(status.st_mode)) return {};
    isWhole = uint64_t(status.st_size) <= kMaxBytes;
    std::string text(std::min(uint64_t(status.st_size), kMaxBytes), '\0');
    const Transfer done = ReadAt(descriptor_, 0, text.data(), text.size());
    text.resize(done.bytes);
    return text;
  }

 private:
  int descriptor_;
};

}  // namespace

AuxiliaryFile ParseAuxiliaryText(std::string_view text, bool isWhole) {
  if (auto found = Parse(text, isWhole, nullptr)) return *std::move(found);
  // Names in the letters of another time make no difference to numbers.
  return Parse(text, isWhole, "ISO-8859-1").value_or(AuxiliaryFile());
}

AuxiliaryFile ReadAuxiliaryFile(const std::string& imageFile) {
  bool isWhole = true;
  const std::string text = Opened(imageFile + ".aux.xml").Beginning(isWhole);
  return text.empty() ? AuxiliaryFile() : ParseAuxiliaryText(text, isWhole);
}

}  // namespace orin::drivers
