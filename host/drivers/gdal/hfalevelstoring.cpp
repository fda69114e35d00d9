/// How a level gets into an ERDAS Imagine file: its pixels, then not valid, then valid.
// SPDX-License-Identifier: MIT
#include <algorithm>

#include "host/drivers/gdal/hfalevelstore.h"
#include "host/drivers/gdal/hfaremoval.h"
#include "host/drivers/gdal/hfaspace.h"
#include "host/drivers/gdal/patchedfile.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

/// The level's record with `channels` not valid.
HfaRecord HfaLevelStore::RecordToWrite(unsigned level, const std::vector<unsigned>& channels) {
  const auto before = records_.find(level);
  const auto pending = pending_.find(level);
  HfaRecord record;
  if (before != records_.end()) record = before->second;
  else record.validity.assign(image_.ChannelCount(), kHfaAbsent);
  if (pending != pending_.end()) record.method = pending->second.method;
  record.sourceLevel = lastRead_ ? lastRead_ : 1;
  record.program = HfaProgramName();
  if (before != records_.end() && before->second.method != record.method)
    std::replace(record.validity.begin(), record.validity.end(), kHfaValid, kHfaInvalid);
  for (const unsigned channel : channels) record.validity.at(channel - 1) = kHfaInvalid;
  return record;
}

/// Over the old record where they have one length, so that the file does not grow.
void HfaLevelStore::Record(unsigned level, const HfaRecord& record) {
  const auto before = records_.find(level);
  const std::string text = ComposeHfaRecord(record);
  if (before != records_.end() && ComposeHfaRecord(before->second) == text) return;
  BeginChange();
  const auto item = FindHfaItem(path_, HfaRecordKey(level));
  if (item && item->textBytes == text.size() + 1) {
    PatchedFile file(path_);
    file.Write(item->text, text.data(), text.size());
    file.Commit();
  } else {
    HfaUpdate update(path_);
    update.SetItem(HfaRecordKey(level), text);
    update.Commit();
  }
  Reload();
}

/// What the level that is about to be built remembers of the image; none: what the image is now.
std::optional<datasources::ImageRecord> HfaLevelStore::SourceImage() const {
  if (lastRead_ == 0) return std::nullopt;
  const auto source = records_.find(lastRead_);
  const bool isCurrent = source != records_.end() && StatusOf(lastRead_, FingerprintNow()) ==
                                                         datasources::LevelStatus::kCurrent;
  return isCurrent ? source->second.image : datasources::ImageRecord();
}

/// Opens the file for the build: stored channels get new room, `missing` ones their level.
void HfaLevelStore::OpenBuild(HfaBuild& build, const std::vector<unsigned>& missing) {
  std::vector<HfaBlockMap> renewed;
  for (const unsigned channel : build.channels) {
    if (pyramid_.Find(channel, build.level) < 0) continue;
    auto map = FindHfaBlockMap(path_, channel, build.level);
    if (!map) Fail(_("%s: level %u is damaged and cannot be written."), build.level);
    build.replaced.Add(HfaBytesOf(path_, map->node));
    renewed.push_back(std::move(*map));
  }
  build.update = std::make_unique<HfaUpdate>(path_, renewed);
  if (!missing.empty()) build.update->AddLevel(build.level, missing);
  for (const unsigned channel : build.channels) {
    const int stored = pyramid_.Find(channel, build.level);
    const int added = channel <= pyramid_.channels.size()
                          ? static_cast<int>(pyramid_.channels[channel - 1].size())
                          : 0;
    build.bands.push_back(build.update->LevelBand(channel, stored >= 0 ? stored : added));
  }
}

std::shared_ptr<HfaBuild> HfaLevelStore::BeginWriting(unsigned level,
                                                      const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  if (!mayChange_) Fail(_("%s: is open for reading only; level %u cannot be written."), level);
  if (build_ && !build_->isClosed)
    Fail(_("%s: level %u cannot be written while another one is."), level);
  LockFile();
  Reload();
  std::vector<unsigned> missing;
  for (const unsigned channel : channels)
    if (pyramid_.Find(channel, level) < 0) missing.push_back(channel);
  datasources::RequireRoom(RoomOf({level}, channels));
  BeginChange();
  isChanged_ = true;
  auto build = std::make_shared<HfaBuild>();
  build->level = level;
  build->channels = channels;
  build->covered.resize(uint64_t{image_.Width() / level} * (image_.Height() / level));
  build->source = SourceImage();
  const HfaRecord record = RecordToWrite(level, channels);
  const auto item = FindHfaItem(path_, HfaRecordKey(level));
  if (missing.empty() && item && item->textBytes == ComposeHfaRecord(record).size() + 1)
    build->record = record;
  else Record(level, record);  // too long for its place: the level is not valid from here on
  RemoveUnlistedHfaLevels(path_, level);
  OpenBuild(*build, missing);
  return build_ = std::move(build);
}

void HfaLevelStore::EndWriting(HfaBuild& build) noexcept {
  const std::lock_guard lock(mutex_);
  if (build.isClosed) return;
  build.isClosed = true;
  build.update.reset();
  pending_.erase(build.level);
  try {
    Settle();
  } catch (const std::exception&) {
    // deliberate: what is not settled costs the next answer a reading of the image
  }
}

/// Puts the pixels that are being written into the file; they are valid when somebody says so.
void HfaLevelStore::StoreBuild() {
  HfaBuild& build = *build_;
  if (std::find(build.covered.begin(), build.covered.end(), false) != build.covered.end())
    Fail(_("%s: level %u is not complete and cannot be marked valid."), build.level);
  build.isClosed = true;
  const std::unique_ptr<HfaUpdate> update = std::move(build.update);
  if (build.record) {
    records_[build.level] = *build.record;
    update->OverwriteItem(HfaRecordKey(build.level), ComposeHfaRecord(*build.record));
  }
  update->Commit();
  freed_.Add(build.replaced);
  pending_.erase(build.level);
  Reload();
}

void HfaLevelStore::SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) {
  const std::lock_guard lock(mutex_);
  if (!mayChange_) Fail(_("%s: is open for reading only; level %u cannot be marked."), level);
  LockFile();
  if (valid && build_ && !build_->isClosed && build_->level == level) StoreBuild();
  for (const unsigned channel : channels)
    if (pyramid_.Find(channel, level) < 0)
      Fail(_("%s: level %u is not complete and cannot be marked."), level);
  const auto record = records_.find(level);
  if (record == records_.end()) {
    if (valid) return;
    Fail(_("%s: level %u is another program's and cannot be marked."), level);
  }
  HfaRecord now = record->second;
  for (const unsigned channel : channels) now.validity.at(channel - 1) = kHfaInvalid;
  if (valid && build_ && build_->level == level) RememberImage(now);
  if (valid)
    for (const unsigned channel : channels) now.validity.at(channel - 1) = kHfaValid;
  Record(level, now);
  Settle();
}

}  // namespace orin::drivers
