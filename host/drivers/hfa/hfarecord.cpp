// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfarecord.h"

#include <algorithm>
#include <charconv>
#include <iomanip>
#include <sstream>
#include <vector>

namespace orin::drivers {

std::string HfaRecordKey(unsigned level) { return "ORIN_LEVEL_" + std::to_string(level); }

namespace {

constexpr size_t kPartDigits = 8;

std::string Padded(std::string text, size_t length) {
  text.resize(std::max(length, text.size()), ' ');
  return text;
}

}  // namespace

std::string ComposeHfaRecord(const HfaRecord& record) {
  constexpr size_t kMethodLength = 8, kLevelLength = 5;
  return Padded(record.method, kMethodLength) + ";" +
         Padded(std::to_string(record.sourceLevel), kLevelLength) + ";" + record.program + ";" +
         record.validity + ";" + datasources::TextOf(record.image);
}

std::optional<HfaRecord> ParseHfaRecord(const std::string& text, size_t channels) {
  std::vector<std::string> fields;
  std::istringstream stream(text);
  for (std::string field; std::getline(stream, field, ';');) fields.push_back(field);
  if (fields.size() != 5) return std::nullopt;
  HfaRecord record{fields[0], 0, fields[2], fields[3], datasources::ParseImageRecord(fields[4])};
  record.method.erase(record.method.find_last_not_of(' ') + 1);
  std::from_chars(fields[1].data(), fields[1].data() + fields[1].size(), record.sourceLevel);
  const bool isWhole = record.validity.size() == channels &&
                       record.validity.find_first_not_of("-01") == std::string::npos;
  if (!isWhole) return std::nullopt;
  return record;
}

std::string HfaPendingKey(unsigned level) { return "ORIN_PENDING_" + std::to_string(level); }

std::string ComposeHfaPending(const HfaPendingLevel& pending) {
  std::ostringstream text;
  for (const uint32_t part : pending.parts)
    text << std::hex << std::setw(kPartDigits) << std::setfill('0') << part;
  return text.str() + ";" + ComposeHfaRecord(pending.record);
}

std::optional<HfaPendingLevel> ParseHfaPending(const std::string& text, size_t channels) {
  const size_t digits = kPartDigits * channels;
  if (text.size() <= digits || text[digits] != ';') return std::nullopt;
  const auto record = ParseHfaRecord(text.substr(digits + 1), channels);
  if (!record) return std::nullopt;
  HfaPendingLevel pending{*record, {}};
  for (size_t i = 0; i < channels; ++i) {
    const char* first = text.data() + i * kPartDigits;
    uint32_t part = 0;
    const auto [end, error] = std::from_chars(first, first + kPartDigits, part, 16);
    if (error != std::errc() || end != first + kPartDigits) return std::nullopt;
    pending.parts.push_back(part);
  }
  return pending;
}

bool AreAlike(const HfaRecord& one, const HfaRecord& other) {
  return one.method == other.method && one.image.fingerprint == other.image.fingerprint;
}

std::string HfaProgramName() { return "Orin Overviews " ORIN_VERSION; }

}  // namespace orin::drivers
