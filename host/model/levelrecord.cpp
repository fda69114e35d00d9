// SPDX-License-Identifier: MIT
#include "host/model/levelrecord.h"

#include <algorithm>
#include <charconv>
#include <string_view>

namespace orin::model {
namespace {

constexpr std::string_view kVersion = "2 ";
constexpr std::string_view kInputsVersion = "2;";
constexpr size_t kFirstImageTextLength = 91;  // of version 1: no version, a shorter stamp

unsigned NumberIn(const std::string& text) {
  unsigned number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size() ? number : 0;
}

bool IsDigest(std::string_view text) {
  return text.size() == kDigestLength &&
         text.find_first_not_of("0123456789abcdef") == std::string_view::npos;
}

std::string DashesOr(const std::string& digest) {
  return digest.empty() ? std::string(kDigestLength, '-') : digest;
}

/// "FINGERPRINT BYTES MODIFIED COMPANIONS"
std::optional<ImageRecord> ParseFirstImage(const std::string& text) {
  constexpr std::string_view kRest = " +0000000000000000000 0000000000000000";
  const auto stamp = ParseImageStamp(text.substr(kDigestLength + 1) + std::string(kRest));
  const std::string fingerprint = text.substr(0, kDigestLength);
  if (!IsDigest(fingerprint) || text[kDigestLength] != ' ' || !stamp) return std::nullopt;
  return ImageRecord{fingerprint, *stamp};
}

std::optional<ImageRecord> ParseImage(const std::string& text) {
  if (text.size() != kImageTextLength || !text.starts_with(kVersion)) return std::nullopt;
  const std::string fingerprint = text.substr(kVersion.size(), kDigestLength);
  const size_t stampAt = kVersion.size() + kDigestLength + 1;
  const auto stamp = ParseImageStamp(std::string_view(text).substr(stampAt));
  if (!IsDigest(fingerprint) || text[stampAt - 1] != ' ' || !stamp) return std::nullopt;
  return ImageRecord{fingerprint, *stamp};
}

std::optional<ContentRecord> ParseContent(const std::string& text) {
  if (text.size() != kContentTextLength || !text.starts_with(kVersion)) return std::nullopt;
  const std::string table = text.substr(kVersion.size(), kDigestLength);
  const size_t bytesAt = kVersion.size() + kDigestLength + 1;
  const std::string bytes = text.substr(bytesAt, kDigestLength);
  const size_t stampAt = bytesAt + kDigestLength + 1;
  const auto holder = ParseFileStamp(std::string_view(text).substr(stampAt));
  const bool isSplit = text[bytesAt - 1] == ' ' && text[stampAt - 1] == ' ';
  if (!IsDigest(table) || !IsDigest(bytes) || !isSplit || !holder) return std::nullopt;
  return ContentRecord{table, bytes, *holder};
}

void SetImage(const std::string& text, LevelRecord& record) {
  if (text.size() == kFirstImageTextLength) {
    record.image = ParseFirstImage(text).value_or(ImageRecord());
    record.version = std::max(record.version, 1);
  } else {
    record.image = ParseImage(text).value_or(ImageRecord());
  }
}

void Set(const RecordItem& item, LevelRecord& record) {
  const auto& [name, text] = item;
  if (name == kMethodItem) record.method = text;
  if (name == kFactorItem) record.level = NumberIn(text);
  if (name == kSourceItem) record.sourceLevel = NumberIn(text);
  if (name == kSourceBytesItem) record.sourceBytes = IsDigest(text) ? text : "";
  if (name == kProgramItem) record.program = text;
  if (name == kValidityItem)
    record.validity = text.find_first_not_of("-01") == text.npos ? text : "";
  if (name == kInputsItem && text.starts_with(kInputsVersion)) {
    record.inputs = ParseLevelInputs(text.substr(kInputsVersion.size()));
    record.version = 2;
  }
  if (name == kImageItem) SetImage(text, record);
  if (name == kContentItem) record.content = ParseContent(text).value_or(ContentRecord());
}

/// Without the two characters that a line gives a meaning.
std::string InLine(std::string text) {
  std::replace_if(
      text.begin(), text.end(), [](char c) { return c == '|' || c == '\n'; }, ' ');
  return text;
}

}  // namespace

bool IsFinished(const LevelRecord& record) {
  return record.validity.find_first_not_of(kValid) == std::string::npos;
}

bool HasValidChannel(const LevelRecord& record) {
  return record.validity.find(kValid) != std::string::npos;
}

std::vector<RecordItem> ComposeRecord(const LevelRecord& record) {
  std::vector<RecordItem> items;
  if (!record.method.empty()) items.emplace_back(kMethodItem, record.method);
  items.emplace_back(kFactorItem, std::to_string(record.level));
  items.emplace_back(kSourceItem, std::to_string(record.sourceLevel));
  if (!record.sourceBytes.empty()) items.emplace_back(kSourceBytesItem, record.sourceBytes);
  items.emplace_back(kProgramItem, record.program);
  items.emplace_back(kInputsItem, std::string(kInputsVersion) + TextOf(record.inputs));
  items.emplace_back(kValidityItem, record.validity);
  items.emplace_back(kImageItem, TextOf(record.image));
  items.emplace_back(kContentItem, TextOf(record.content));
  return items;
}

LevelRecord ParseRecord(const std::vector<RecordItem>& items) {
  LevelRecord record;
  for (const RecordItem& item : items) Set(item, record);
  if (record.validity.empty()) record.version = 0;
  else record.version = std::max(record.version, 1);
  return record;
}

std::string TextOf(const ImageRecord& image) {
  if (image.IsBlank()) return std::string(kImageTextLength, '-');
  return std::string(kVersion) + image.fingerprint + ' ' + ComposeImageStamp(image.stamp);
}

std::string TextOf(const ContentRecord& content) {
  if (content.IsBlank()) return std::string(kContentTextLength, '-');
  return std::string(kVersion) + DashesOr(content.table) + ' ' + content.bytes + ' ' +
         TextOf(content.holder);
}

std::string LineOf(const LevelRecord& record) {
  std::string line;
  for (const auto& [name, text] : ComposeRecord(record))
    line += (line.empty() ? "" : "|") + name + '=' + InLine(text);
  return line;
}

LevelRecord ParseLine(const std::string& line) {
  std::vector<RecordItem> items;
  for (size_t start = 0; start < line.size();) {
    const size_t end = std::min(line.find('|', start), line.size());
    const size_t equals = line.find('=', start);
    if (equals < end)
      items.emplace_back(line.substr(start, equals - start),
                         line.substr(equals + 1, end - equals - 1));
    start = end + 1;
  }
  return ParseRecord(items);
}

std::optional<size_t> TextAt(const std::string& line, const std::string& name) {
  for (size_t start = 0; start < line.size();
       start = std::min(line.find('|', start), line.size() - 1) + 1)
    if (line.compare(start, name.size() + 1, name + '=') == 0) return start + name.size() + 1;
  return std::nullopt;
}

}  // namespace orin::model
