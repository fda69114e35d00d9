// SPDX-License-Identifier: MIT
#include "host/datasources/leveloptions.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <string_view>

#include "host/services/text.h"

namespace orin::datasources {
namespace {

constexpr int kMostDeflateEffort = 12;
constexpr int kMostZstdEffort = 22;
constexpr int kMostQuality = 100;
constexpr uint32_t kTileStep = 16;
constexpr uint32_t kMostTileEdge = 16384;

template <class Value>
struct Named {
  std::string_view name;
  Value value;
};

constexpr std::array<Named<LevelCompression>, 9> kCompressions = {{
    {"NONE", LevelCompression::kNone},
    {"DEFLATE", LevelCompression::kDeflate},
    {"LZW", LevelCompression::kLzw},
    {"ZSTD", LevelCompression::kZstd},
    {"PACKBITS", LevelCompression::kPackBits},
    {"LZMA", LevelCompression::kLzma},
    {"LERC", LevelCompression::kLerc},
    {"JPEG", LevelCompression::kJpeg},
    {"WEBP", LevelCompression::kWebp},
}};
constexpr std::array<Named<LevelPredictor>, 6> kPredictors = {{
    {"1", LevelPredictor::kNone},
    {"2", LevelPredictor::kHorizontal},
    {"3", LevelPredictor::kFloatingPoint},
    {"NO", LevelPredictor::kNone},
    {"STANDARD", LevelPredictor::kHorizontal},
    {"FLOAT", LevelPredictor::kFloatingPoint},
}};
constexpr std::array<Named<BigTiff>, 4> kBigTiff = {{
    {"YES", BigTiff::kYes},
    {"NO", BigTiff::kNo},
    {"IF_NEEDED", BigTiff::kIfNeeded},
    {"IF_SAFER", BigTiff::kIfSafer},
}};

std::string Upper(std::string text) {
  for (char& letter : text)
    letter = static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
  return text;
}

template <class Table>
std::string NamesIn(const Table& table) {
  std::string names;
  for (const auto& entry : table) names += (names.empty() ? "" : ", ") + std::string(entry.name);
  return names;
}

/// The value of that name. \returns what is wrong; empty: nothing
template <class Table, class Value>
std::string Choose(const Table& table, const char* key, const std::string& name, Value& value) {
  const auto found = std::find_if(table.begin(), table.end(),
                                  [&](const auto& entry) { return entry.name == name; });
  if (found == table.end())
    return FormatString(_("%s is one of %s, not \"%s\""), key, NamesIn(table).c_str(),
                        name.c_str());
  value = found->value;
  return "";
}

/// A whole number in decimal digits; 0 when the text is none.
uint32_t WholeNumber(std::string_view text) {
  uint32_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size() ? number : 0;
}

std::string ReadNumber(const char* key, const std::string& text, int most,
                       std::optional<int>& value) {
  const uint32_t number = WholeNumber(text);
  if (number < 1 || number > static_cast<uint32_t>(most))
    return FormatString(_("%s is a number from 1 to %d, not \"%s\""), key, most, text.c_str());
  value = static_cast<int>(number);
  return "";
}

std::string ReadTile(const std::string& text, LevelOptions& options) {
  const size_t cross = text.find('X');
  const uint32_t width = WholeNumber(text.substr(0, cross));
  const uint32_t height = cross == text.npos ? width : WholeNumber(text.substr(cross + 1));
  for (const uint32_t edge : {width, height})
    if (edge == 0 || edge % kTileStep != 0 || edge > kMostTileEdge)
      return FormatString(
          _("TILE is a multiple of %u up to %u, or two of them such as 512x256, not "
            "\"%s\""),
          kTileStep, kMostTileEdge, text.c_str());
  options.tileWidth = width;
  options.tileHeight = height;
  return "";
}

}  // namespace

std::string ReadLevelOption(const std::string& text, LevelOptions& options) {
  const size_t equals = text.find('=');
  const std::string key = Upper(text.substr(0, equals));
  const std::string value = equals == text.npos ? "" : Upper(text.substr(equals + 1));
  if (equals != text.npos) {
    if (key == "COMPRESS") return Choose(kCompressions, key.c_str(), value, options.compression);
    if (key == "PREDICTOR") return Choose(kPredictors, key.c_str(), value, options.predictor);
    options.saysBigTiff = options.saysBigTiff || key == "BIGTIFF";
    if (key == "BIGTIFF") return Choose(kBigTiff, key.c_str(), value, options.bigTiff);
    if (key == "TILE") return ReadTile(value, options);
    if (key == "LEVEL") return ReadNumber(key.c_str(), value, kMostZstdEffort, options.effort);
    if (key == "QUALITY") return ReadNumber(key.c_str(), value, kMostQuality, options.quality);
  }
  return FormatString(_("\"%s\" is no option; the options are COMPRESS=, PREDICTOR=, TILE=, "
                        "LEVEL=, QUALITY= and BIGTIFF="),
                      text.c_str());
}

std::string ContradictionIn(const LevelOptions& options) {
  if (!options.compression) return "";
  const auto isOneOf = [&](std::initializer_list<LevelCompression> list) {
    return std::find(list.begin(), list.end(), *options.compression) != list.end();
  };
  using enum LevelCompression;
  const std::string compress = TextOf(*options.compression);
  if (options.effort && !isOneOf({kDeflate, kZstd}))
    return FormatString(_("LEVEL goes with COMPRESS=DEFLATE and ZSTD, not with %s"),
                        compress.c_str());
  if (options.effort && isOneOf({kDeflate}) && *options.effort > kMostDeflateEffort)
    return FormatString(_("LEVEL of COMPRESS=DEFLATE is a number from 1 to %d, not %d"),
                        kMostDeflateEffort, *options.effort);
  if (options.quality && !isOneOf({kJpeg, kWebp}))
    return FormatString(_("QUALITY goes with COMPRESS=JPEG and WEBP, not with %s"),
                        compress.c_str());
  const bool predicts = options.predictor && *options.predictor != LevelPredictor::kNone;
  if (predicts && !isOneOf({kDeflate, kLzw, kZstd, kLzma}))
    return FormatString(_("PREDICTOR goes with COMPRESS=DEFLATE, LZW, ZSTD and LZMA, not with %s"),
                        compress.c_str());
  return "";
}

std::string TextOf(LevelCompression compression) {
  const auto found = std::find_if(kCompressions.begin(), kCompressions.end(),
                                  [&](const auto& entry) { return entry.value == compression; });
  return "COMPRESS=" + std::string(found->name);
}

}  // namespace orin::datasources
