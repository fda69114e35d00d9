// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfalevelcommit.h"

#include "host/drivers/hfa/hfatreecopy.h"
#include "host/drivers/hfa/patchedfile.h"

namespace orin::drivers {

HfaPendingLevel HfaLevelCommit::Joined(unsigned level, const HfaRecord& record,
                                       const std::map<unsigned, uint32_t>& parts) const {
  HfaPendingLevel pending{record, std::vector<uint32_t>(image_.ChannelCount())};
  pending.record.validity.assign(image_.ChannelCount(), kHfaAbsent);
  const auto before = catalogue_.pending.find(level);
  if (before != catalogue_.pending.end() && AreAlike(before->second.record, record)) {
    pending.parts = before->second.parts;
    pending.record.validity = before->second.record.validity;
  }
  for (const auto& [channel, part] : parts) {
    pending.parts.at(channel - 1) = part;
    pending.record.validity.at(channel - 1) = kHfaInvalid;
  }
  return pending;
}

/// Whether the channel's stored level is valid, and what `record` describes.
bool HfaLevelCommit::IsStoredAlike(unsigned channel, unsigned level,
                                   const HfaRecord& record) const {
  const auto stored = catalogue_.records.find(level);
  return stored != catalogue_.records.end() && catalogue_.IsStored(channel, level) &&
         AreAlike(stored->second, record) && stored->second.validity[channel - 1] == kHfaValid;
}

bool HfaLevelCommit::IsWhole(unsigned level, const HfaPendingLevel& pending) const {
  for (unsigned channel = 1; channel <= image_.ChannelCount(); ++channel) {
    const bool isReady = pending.parts[channel - 1] != 0
                             ? pending.record.validity[channel - 1] == kHfaValid
                             : IsStoredAlike(channel, level, pending.record);
    if (!isReady && GetsHfaLevels(image_, channel)) return false;
  }
  return true;
}

void HfaLevelCommit::Store(unsigned level, const HfaPendingLevel& pending) const {
  if (IsWhole(level, pending)) StoreLevel(level, pending);
  else StoreWaiting(level, pending);
}

void HfaLevelCommit::StoreLevel(unsigned level, const HfaPendingLevel& pending) const {
  HfaTreeChanges changes;
  changes.level = level;
  HfaRecord record = pending.record;
  for (unsigned channel = 1; channel <= image_.ChannelCount(); ++channel) {
    if (pending.parts[channel - 1] != 0) changes.parts[channel] = pending.parts[channel - 1];
    else if (IsStoredAlike(channel, level, record)) record.validity[channel - 1] = kHfaValid;
  }
  changes.items[HfaRecordKey(level)] = ComposeHfaRecord(record);
  changes.removedItems = {HfaPendingKey(level)};
  ChangeHfaTree(path_, changes);
}

void HfaLevelCommit::StoreWaiting(unsigned level, const HfaPendingLevel& pending) const {
  const std::string text = ComposeHfaPending(pending);
  const auto before = catalogue_.pending.find(level);
  const auto item = FindHfaItem(path_, HfaPendingKey(level));
  const bool fits = item && item->textBytes == text.size() + 1 &&
                    before != catalogue_.pending.end() &&
                    AreAlike(before->second.record, pending.record);
  if (!fits) {
    HfaTreeChanges changes;
    changes.items[HfaPendingKey(level)] = text;
    return ChangeHfaTree(path_, changes);
  }
  const size_t parts = text.find(';');
  PatchedFile file(path_);
  file.WriteNow(item->text, text.data(), parts);
  file.Sync();  // before anything says that they are valid
  file.WriteNow(item->text + parts, text.data() + parts, text.size() - parts);
  file.Sync();
}

void HfaLevelCommit::StoreRecord(unsigned level, const HfaRecord& record) const {
  const std::string text = ComposeHfaRecord(record);
  const auto item = FindHfaItem(path_, HfaRecordKey(level));
  if (!item || item->textBytes != text.size() + 1) {
    HfaTreeChanges changes;
    changes.items[HfaRecordKey(level)] = text;
    return ChangeHfaTree(path_, changes);
  }
  PatchedFile file(path_);
  file.WriteNow(item->text, text.data(), text.size());
  file.Sync();
}

}  // namespace orin::drivers
