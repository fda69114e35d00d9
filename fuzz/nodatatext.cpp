/// Fuzzes the no-data text: which texts declare a value, and which pixels equal it.
// SPDX-License-Identifier: MIT

// The input's first byte chooses the pixel type; then follow texts with a bar between them: the
// file's, and those of one to three channels. What they say is compared with the C library's
// reading of the same number.
#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "basic/core/typedispatch/pixeltypes.h"
#include "fuzz/check.h"
#include "host/datasources/nodatamask.h"

namespace {

using namespace orin;
using datasources::AuxiliaryData;
using typedispatch::PixelTypes;

constexpr size_t kMostChannels = 3;

/// A reader that has metadata and nothing else.
class Declaring final : public datasources::ReaderState<datasources::IRasterReader> {
 public:
  Declaring(const gobs::DataType& type, AuxiliaryData metadata, unsigned channels)
      : type_(type), metadata_(std::move(metadata)), channels_(channels) {}

  unsigned GetWidth() const override { return 1; }
  unsigned GetHeight() const override { return 1; }
  unsigned GetChannelCount() const override { return channels_; }
  const gobs::DataType& GetDataType() const override { return type_; }
  unsigned GetLevel() const override { return 1; }
  AuxiliaryData GetAuxiliaryData() const override { return metadata_; }
  std::vector<unsigned> GetChannelsInfo() const override { return {}; }
  void Read(gobs::Raster& block) override { std::memset(block.data, 0, block.byteSize); }

 protected:
  unsigned StoredTileWidth() const override { return 1; }
  unsigned StoredTileHeight() const override { return 1; }

 private:
  gobs::DataType type_;
  AuxiliaryData metadata_;
  unsigned channels_;
};

std::string Trim(std::string_view text) {
  constexpr std::string_view kBlanks = " \t\r\n";
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == text.npos) return "";
  return std::string(text.substr(first, text.find_last_not_of(kBlanks) - first + 1));
}

size_t SkipDigits(std::string_view text, size_t at) {
  while (at < text.size() && text[at] >= '0' && text[at] <= '9') ++at;
  return at;
}

/// A sign, digits with at most one point among or beside them, an exponent: nothing else.
bool IsDecimal(std::string_view text) {
  size_t at = !text.empty() && (text[0] == '+' || text[0] == '-');
  const size_t whole = SkipDigits(text, at);
  size_t digits = whole - at;
  at = whole;
  if (at < text.size() && text[at] == '.') {
    const size_t end = SkipDigits(text, at + 1);
    digits += end - at - 1;
    at = end;
  }
  if (digits == 0) return false;
  if (at == text.size()) return true;
  if (text[at] != 'e' && text[at] != 'E') return false;
  ++at;
  if (at < text.size() && (text[at] == '+' || text[at] == '-')) ++at;
  const size_t end = SkipDigits(text, at);
  return end > at && end == text.size();
}

/// Names of what is no finite number are another matter, so are commas and unusual blanks.
bool IsAnotherMatter(std::string_view text) { return text.find_first_of("nNiI,\v\f") != text.npos; }

struct Declaration {
  std::vector<std::string> texts;  ///< one a channel, without blanks around it
  AuxiliaryData metadata;
};

Declaration Read(std::string_view input) {
  std::vector<std::string> parts;
  for (size_t end = 0; end != input.npos && parts.size() <= kMostChannels;) {
    end = input.find('|');
    parts.emplace_back(input.substr(0, end));
    input.remove_prefix(std::min(end, input.size()));
    if (!input.empty()) input.remove_prefix(1);
  }
  if (parts.size() < 2) parts.emplace_back();
  Declaration declaration;
  std::vector<AuxiliaryData::Items> channels;
  for (size_t i = 1; i < parts.size(); ++i) {
    channels.push_back({{datasources::kNoDataKey, parts[i]}});
    const std::string own = Trim(parts[i]);  // one that is no number leaves the file's in force
    declaration.texts.push_back(IsDecimal(own) || IsAnotherMatter(own) ? own : Trim(parts[0]));
  }
  declaration.metadata = AuxiliaryData({{datasources::kNoDataKey, parts[0]}}, channels);
  return declaration;
}

template <class T>
std::vector<T> Candidates(const std::string& text) {
  const long double number = std::strtold(text.c_str(), nullptr);
  std::vector<T> values{T(0), T(1), std::numeric_limits<T>::lowest(),
                        std::numeric_limits<T>::max()};
  if (number >= std::numeric_limits<T>::lowest() && number <= std::numeric_limits<T>::max()) {
    values.push_back(static_cast<T>(number));
    if constexpr (std::is_integral_v<T>) {
      if (values.back() > std::numeric_limits<T>::min()) values.push_back(T(values.back() - 1));
    }
  }
  return values;
}

/// Whether the value of that text is `value`; only asked where the C library's answer is exact.
template <class T>
bool Equals(const std::string& text, T value) {
  if constexpr (std::is_floating_point_v<T>) {
    const double number = std::strtod(text.c_str(), nullptr);
    return static_cast<T>(number) == value;
  } else {
    return std::strtold(text.c_str(), nullptr) == static_cast<long double>(value);
  }
}

/// A long double holds 64 bits; a text that it rounds is not compared, nor one beyond a double.
bool IsExact(const std::string& text, bool isFloat) {
  errno = 0;
  std::strtod(text.c_str(), nullptr);
  if (isFloat) return errno != ERANGE;
  return text.size() <= 18 && text.find_first_of(".eE") == text.npos;
}

template <class T>
void CheckPixels(const gobs::IMaskDecision& decision, const std::string& text, bool isComplex) {
  if (!IsExact(text, std::is_floating_point_v<T>)) return;
  if constexpr (std::is_same_v<T, float>) {  // what is beyond a float may stand for its limits
    if (!std::isfinite(std::strtof(text.c_str(), nullptr))) return;
  }
  const std::vector<T> values = Candidates<T>(text);
  const auto width = static_cast<unsigned>(values.size());
  gobs::Raster block({width, 1, 1, gobs::DataTypeOf<T>(isComplex)}, {});
  std::memset(block.data, 0, block.byteSize);
  for (size_t i = 0; i < values.size(); ++i)
    std::memcpy(block.data + i * gobs::PixelBytes(block), &values[i], sizeof(T));
  gobs::Mask mask(width, 1, {});
  decision.Decide(block, mask);
  for (unsigned x = 0; x < width; ++x)
    fuzz::Demand(mask.IsValid(x, 0) != Equals(text, values[x]),
                 "a pixel is no data where it equals the declared value, and only there");
}

/// Checks one declaration for one pixel type.
template <class T>
void Check(const Declaration& declaration, bool isComplex) {
  const std::vector<std::string>& texts = declaration.texts;
  Declaring reader(gobs::DataTypeOf<T>(isComplex), declaration.metadata,
                   static_cast<unsigned>(texts.size()));
  const std::unique_ptr<gobs::IMaskDecision> decision(GetFileMetadataSrcMask(&reader));
  if (std::any_of(texts.begin(), texts.end(), IsDecimal))
    fuzz::Demand(decision != nullptr, "a decimal number declares a value");
  else if (std::none_of(texts.begin(), texts.end(), IsAnotherMatter))
    fuzz::Demand(decision == nullptr, "what is no number declares nothing");
  if (decision && texts.size() == 1 && IsDecimal(texts[0]))
    CheckPixels<T>(*decision, texts[0], isComplex);
}

template <class... Ts>
void CheckType(typedispatch::TypeList<Ts...>, unsigned choice, const Declaration& declaration) {
  const bool isComplex = choice >= 128;
  unsigned index = 0;
  ((index++ == choice % sizeof...(Ts) ? Check<Ts>(declaration, isComplex) : void()), ...);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size == 0) return 0;
  const std::string_view text(reinterpret_cast<const char*>(data + 1), size - 1);
  if (text.find('\0') != text.npos) return 0;  // the C library would stop there
  CheckType(PixelTypes{}, data[0], Read(text));
  return 0;
}
