// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfacatalogue.h"

#include <algorithm>
#include <optional>

namespace orin::drivers {
namespace {

/// Empty where there is no such item, or none that is a text of ours.
std::string TextOf(HfaTree& tree, const std::map<std::string, HfaItemPlace>& items,
                   const std::string& key) {
  constexpr uint32_t kMaxTextBytes = 1 << 20;
  const auto item = items.find(key);
  if (item == items.end() || item->second.textBytes > kMaxTextBytes) return {};
  if (item->second.text + uint64_t{item->second.textBytes} > tree.Size()) return {};
  const std::string text = tree.Bytes(item->second.text, item->second.textBytes);
  return text.substr(0, text.find('\0'));
}

/// The factor that such a name of an item ends with; 0: it is no such name.
unsigned FactorIn(const std::string& name) {
  const size_t digits = name.find_last_not_of("0123456789") + 1;
  if (digits == name.size() || name.size() - digits > 9) return 0;
  const auto factor = static_cast<unsigned>(std::stoul(name.substr(digits)));
  return name == HfaPendingKey(factor) ? factor : 0;
}

/// The channels whose parts stand where it says.
std::optional<HfaPendingLevel> ReadPending(HfaTree& tree, unsigned level, const std::string& text,
                                           size_t channels) {
  auto pending = ParseHfaPending(text, channels);
  if (!pending) return pending;
  for (size_t i = 0; i < channels; ++i) {
    uint32_t& part = pending->parts[i];
    const bool isThere = part != 0 && part + uint64_t{kHfaNodeBytes} <= tree.Size() &&
                         FactorOfHfaPart(tree.NodeAt(part)) == level;
    if (isThere) continue;
    part = 0;
    pending->record.validity[i] = kHfaAbsent;
  }
  const bool hasParts = std::any_of(pending->parts.begin(), pending->parts.end(),
                                    [](uint32_t part) { return part != 0; });
  return hasParts ? pending : std::nullopt;
}

}  // namespace

std::set<unsigned> HfaCatalogue::Levels() const {
  std::set<unsigned> levels;
  for (const auto& names : pyramid.channels)
    for (const HfaLevelName& name : names)
      if (name.factor >= 2) levels.insert(name.factor);
  for (const auto& [level, waiting] : pending) levels.insert(level);
  return levels;
}

bool HfaCatalogue::IsPending(unsigned channel, unsigned level) const {
  const auto waiting = pending.find(level);
  return waiting != pending.end() && waiting->second.parts.at(channel - 1) != 0;
}

const HfaRecord* HfaCatalogue::RecordOf(unsigned level) const {
  const auto waiting = pending.find(level);
  if (waiting != pending.end()) return &waiting->second.record;
  const auto record = records.find(level);
  return record != records.end() ? &record->second : nullptr;
}

bool HfaCatalogue::IsValid(unsigned channel, unsigned level) const {
  const HfaRecord* record = RecordOf(level);
  if (IsPending(channel, level)) return record->validity[channel - 1] == kHfaValid;
  if (!record || !IsStored(channel, level)) return !record && IsStored(channel, level);
  const auto stored = records.find(level);
  return stored != records.end() && AreAlike(stored->second, *record) &&
         stored->second.validity[channel - 1] == kHfaValid;
}

void HfaCatalogue::ChangeRecords(const std::function<void(HfaRecord&)>& change) {
  for (auto& [level, record] : records) change(record);
  for (auto& [level, waiting] : pending) change(waiting.record);
}

bool GetsHfaLevels(const datasources::IRasterSource& image, unsigned channel) {
  const auto isMask = [&](unsigned number) { return image.TypeOf(number).bits == 1; };
  if (!isMask(channel)) return true;
  for (unsigned other = 1; other <= image.ChannelCount(); ++other)
    if (!isMask(other)) return false;
  return true;
}

HfaCatalogue ReadHfaCatalogue(const std::string& path, size_t channels) {
  HfaTree tree(path);
  HfaCatalogue catalogue{HfaPyramidOf(tree)};
  const auto items = HfaItemsOf(tree);
  for (const unsigned level : catalogue.Levels())
    if (const auto record = ParseHfaRecord(TextOf(tree, items, HfaRecordKey(level)), channels))
      catalogue.records[level] = *record;
  for (const auto& [name, place] : items) {
    const unsigned level = FactorIn(name);
    if (level < 2) continue;
    if (auto pending = ReadPending(tree, level, TextOf(tree, items, name), channels))
      catalogue.pending[level] = std::move(*pending);
  }
  return catalogue;
}

}  // namespace orin::drivers
