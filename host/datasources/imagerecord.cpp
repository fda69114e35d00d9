// SPDX-License-Identifier: MIT
#include "host/datasources/imagerecord.h"

#include <charconv>
#include <cinttypes>
#include <optional>

#include "host/datasources/fingerprint.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

// Columns of the text: a fingerprint, 20 digits, a sign and 19 digits, 16 hexadecimal digits.
constexpr size_t kBytesAt = kFingerprintLength + 1;
constexpr size_t kTimeAt = kBytesAt + 21;
constexpr size_t kCompanionsAt = kTimeAt + 21;
static_assert(kCompanionsAt + 16 == kImageRecordLength);
static_assert(kImageRecordLength - kBytesAt == kImageStampLength);

template <class T>
std::optional<T> NumberIn(const std::string& text, size_t at, size_t length, int base) {
  T number = 0;
  const char* start = &text[at];
  if (*start == '+') ++start;
  const char* const stop = &text[at] + length;
  const auto [end, error] = std::from_chars(start, stop, number, base);
  return error == std::errc() && end == stop ? std::optional<T>(number) : std::nullopt;
}

bool IsFingerprint(const std::string& text) {
  return text.size() == kFingerprintLength &&
         text.find_first_not_of("0123456789abcdef") == std::string::npos;
}

}  // namespace

std::string TextOf(const ImageStamp& stamp) {
  return FormatString("%020" PRIu64 " %+020" PRId64 " %016" PRIx64, stamp.bytes, stamp.modified,
                      stamp.companions);
}

std::string TextOf(const ImageRecord& record) {
  if (record.IsBlank()) return std::string(kImageRecordLength, '-');
  return record.fingerprint + ' ' + TextOf(record.stamp);
}

ImageRecord ParseImageRecord(const std::string& text) {
  if (text.size() != kImageRecordLength) return {};
  const std::string fingerprint = text.substr(0, kFingerprintLength);
  const auto bytes = NumberIn<uint64_t>(text, kBytesAt, 20, 10);
  const auto modified = NumberIn<int64_t>(text, kTimeAt, 20, 10);
  const auto companions = NumberIn<uint64_t>(text, kCompanionsAt, 16, 16);
  if (!IsFingerprint(fingerprint) || !bytes || !modified || !companions) return {};
  return {fingerprint, {*bytes, *modified, *companions, 0, 0}};
}

}  // namespace orin::datasources
