// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfalevelstore.h"

#include <algorithm>
#include <filesystem>
#include <utility>

#include "host/drivers/hfa/hfacompactor.h"
#include "host/drivers/hfa/hfalevelcommit.h"
#include "host/drivers/hfa/hfalevelwriter.h"
#include "host/drivers/hfa/hfaspaceestimate.h"
#include "host/drivers/hfa/hfatreecopy.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::LevelDescription;

double SampleBytes(const gobs::DataType& type) {
  return double(BytesPerComponent(type)) * ComponentsPerSample(type);
}

/// Levels 2, 4, 8 ... take a third of the image.
bool HasRoom(const std::string& path, const datasources::IRasterSource& image) {
  double bytes = 0;
  for (unsigned channel = 1; channel <= image.ChannelCount(); ++channel)
    bytes += double(image.Width()) * image.Height() * SampleBytes(image.TypeOf(channel));
  std::error_code ignored;
  const auto size = std::filesystem::file_size(path, ignored);
  return double(ignored ? 0 : size) + bytes * 0.35 < double(kMaxHfaBytes);
}

[[noreturn]] void Refuse(const char* format, const std::string& name) {
  throw Exception(FormatString(format, name.c_str()), "host/drivers/hfa/hfalevelstore",
                  "orin::drivers::OpenHfaLevels", 0);
}

/// The size in pixels that the format gives a level of a side of the image; ours ends earlier.
unsigned RoundedUp(unsigned size, unsigned level) { return size / level + (size % level != 0); }

}  // namespace

std::unique_ptr<datasources::ILevelStore> OpenHfaLevels(const std::string& name,
                                                        const GdalFormat& format,
                                                        datasources::IRasterSource& image,
                                                        SourceUse use) {
  std::error_code none;
  const std::filesystem::path real = std::filesystem::canonical(name, none);
  const std::string path = none ? name : real.string();
  const HfaPyramid pyramid = ReadHfaPyramid(path);
  const bool isForeign =
      pyramid.NamesAnotherFileThan(std::filesystem::path(path).filename().string());
  if (use != SourceUse::kRead && isForeign)
    Refuse(_("%s: holds a list of levels under another file's name, for it was copied or renamed; "
             "levels inside it would change that file."),
           name);
  if (use == SourceUse::kUpdate && (pyramid.isSpilled || !HasRoom(path, image)))
    Refuse(_("%s: would grow beyond the 2 GB that the format keeps in one file."), name);
  if (isForeign) return nullptr;
  return std::make_unique<HfaLevelStore>(path, format, image, use != SourceUse::kRead);
}

HfaLevelStore::HfaLevelStore(std::string path, const GdalFormat& format,
                             datasources::IRasterSource& image, bool mayChange)
    : path_(std::move(path)),
      format_(format),
      image_(image),
      mayChange_(mayChange),
      freshness_(image.Watch()) {
  Reload();
}

HfaLevelStore::~HfaLevelStore() {
  if (build_) EndWriting(*build_);
  try {
    if (isChanged_) ReclaimSpace();
    CommitStamps();
  } catch (...) {
    // deliberate: nothing is lost but space, which the next change finds again
  }
}

void HfaLevelStore::Fail(const char* format, unsigned level) const {
  throw Exception(FormatString(format, path_.c_str(), level), "host/drivers/hfa/hfalevelstore",
                  "orin::drivers::HfaLevelStore", 0);
}

/// Keeps other builds away until the store goes.
void HfaLevelStore::LockFile() {
  if (file_) return;
  auto file = std::make_unique<PositionedFile>(path_, PositionedFile::Mode::kUpdate);
  file->Lock();
  file_ = std::move(file);
}

void HfaLevelStore::Reload() { catalogue_ = ReadHfaCatalogue(path_, image_.ChannelCount()); }

/// Absent channels count: other programs see the image at two resolutions.
bool HfaLevelStore::IsFinished(unsigned level) const {
  if (catalogue_.pending.contains(level)) return false;
  for (unsigned channel = 1; channel <= image_.ChannelCount(); ++channel)
    if (GetsHfaLevels(image_, channel) && !catalogue_.IsStored(channel, level)) return false;
  const HfaRecord* record = catalogue_.RecordOf(level);
  return !record || record->validity.find(kHfaInvalid) == std::string::npos;
}

/// \param fingerprint  of the image now; empty when it is unknown
LevelDescription HfaLevelStore::Describe(unsigned level, const std::string& fingerprint) const {
  const HfaRecord* record = catalogue_.RecordOf(level);
  const auto created = created_.find(level);
  const bool isCreated = created != created_.end();
  const bool isOurs = record || isCreated;
  LevelDescription entry;
  entry.level = level;
  entry.width = isOurs ? image_.Width() / level : RoundedUp(image_.Width(), level);
  entry.height = isOurs ? image_.Height() / level : RoundedUp(image_.Height(), level);
  entry.file = path_;
  const bool isFinished = IsFinished(level) && (record || !isCreated);
  entry.status = HfaFreshness::StatusOf(record, isFinished, fingerprint);
  const bool isStale = entry.status == datasources::LevelStatus::kStale;
  for (unsigned channel = 1; channel <= image_.ChannelCount(); ++channel) {
    const bool isThere =
        catalogue_.IsStored(channel, level) || catalogue_.IsPending(channel, level);
    const bool isComing = isCreated && created->second.channels[channel - 1];
    entry.presentChannels.push_back(isThere || isComing);
    entry.validChannels.push_back(catalogue_.IsValid(channel, level) && !isStale &&
                                  (record || !isComing));
  }
  if (record) {
    entry.method = record->method;
    entry.sourceLevel = record->sourceLevel;
    entry.program = record->program;
    entry.image = record->image;
  } else if (isCreated) {
    entry.method = created->second.method;
    entry.program = HfaProgramName();
  }
  return entry;
}

std::vector<LevelDescription> HfaLevelStore::List() const {
  const std::lock_guard lock(mutex_);
  std::set<unsigned> levels = catalogue_.Levels();
  for (const auto& [level, created] : created_) levels.insert(level);
  std::vector<LevelDescription> list;
  const std::string fingerprint = freshness_.Fingerprint(catalogue_);
  for (const unsigned level : levels) list.push_back(Describe(level, fingerprint));
  return list;
}

void HfaLevelStore::Create(unsigned level, const std::vector<unsigned>& channels,
                           const std::string& method) {
  const std::lock_guard lock(mutex_);
  if (!mayChange_) Fail(_("%s: is open for reading only; level %u cannot be made."), level);
  Created& created = created_[level];
  created.channels.resize(image_.ChannelCount());
  for (const unsigned channel : channels) created.channels.at(channel - 1) = true;
  created.method = method;
  lastRead_ = 0;
}

std::unique_ptr<datasources::IRasterWriter> HfaLevelStore::OpenWriter(
    unsigned level, const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  const auto created = created_.find(level);
  const bool isCreated = created != created_.end();
  for (const unsigned channel : channels)
    if (!(isCreated && created->second.channels.at(channel - 1)) &&
        !catalogue_.IsStored(channel, level) && !catalogue_.IsPending(channel, level))
      Fail(_("%s: has no level %u."), level);
  const bool isOurs = isCreated || catalogue_.RecordOf(level);
  HfaLevelWriter::Level what{path_,
                             level,
                             isOurs ? image_.Width() / level : RoundedUp(image_.Width(), level),
                             isOurs ? image_.Height() / level : RoundedUp(image_.Height(), level),
                             channels,
                             image_.TypeOf(channels.empty() ? 1 : channels.front()),
                             image_.MetadataOf(channels),
                             {}};
  for (const unsigned channel : channels) what.storedBits.push_back(image_.StoredBitsOf(channel));
  return std::make_unique<HfaLevelWriter>(*this, std::move(what));
}

HfaLevelPixels HfaLevelStore::PixelsOf(unsigned level, const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  HfaLevelPixels pixels{nullptr, path_, {}};
  HfaPyramid pyramid = catalogue_.pyramid;
  const auto pending = catalogue_.pending.find(level);
  if (pending != catalogue_.pending.end()) {
    HfaTreeChanges changes;
    changes.level = level;
    for (const unsigned channel : channels)
      if (catalogue_.IsPending(channel, level))
        changes.parts[channel] = pending->second.parts[channel - 1];
    pixels.view = std::make_shared<HfaView>(path_, changes);
    pixels.name = pixels.view->LibraryName();
    pyramid = ReadHfaPyramid(pixels.name);
  }
  for (const unsigned channel : channels) {
    pixels.positions.push_back(pyramid.Find(channel, level));
    if (pixels.positions.back() < 0)
      Fail(_("%s: level %u is not finished and cannot be read."), level);
  }
  if (!created_.contains(level)) lastRead_ = level;
  return pixels;
}

/// The format tells levels apart by their sizes alone; the library cannot know of those that wait.
void HfaLevelStore::RequireOwnSize(unsigned level) const {
  for (const auto& [other, pending] : catalogue_.pending)
    if (other != level && RoundedUp(image_.Width(), other) == RoundedUp(image_.Width(), level) &&
        RoundedUp(image_.Height(), other) == RoundedUp(image_.Height(), level))
      Fail(_("%s: already holds a level of nearly the size of level %u; the format cannot tell "
             "them apart. Choose another level, or build with --external."),
           level);
}

std::shared_ptr<HfaLevelBuild> HfaLevelStore::BeginWriting(unsigned level,
                                                           const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  if (!mayChange_) Fail(_("%s: is open for reading only; level %u cannot be written."), level);
  if (build_ && !build_->IsClosed())
    Fail(_("%s: level %u cannot be written while another one is."), level);
  LockFile();
  Reload();
  datasources::RequireRoom(HfaSpaceEstimate(path_, image_, catalogue_).For({level}, channels));
  RequireOwnSize(level);
  freshness_.BeginChange(catalogue_);
  isChanged_ = true;
  if (HasUnlistedHfaLevel(path_, level)) {
    HfaTreeChanges changes;
    changes.level = level;
    ChangeHfaTree(path_, changes);
  }
  build_ = std::make_shared<HfaLevelBuild>(
      path_, catalogue_,
      HfaLevelBuild::Target{level, channels, image_.Width() / level, image_.Height() / level});
  if (lastRead_ == 0) return build_;
  const HfaRecord* source = catalogue_.RecordOf(lastRead_);
  const bool isCurrent =
      source && HfaFreshness::StatusOf(source, true, freshness_.Fingerprint(catalogue_)) ==
                    datasources::LevelStatus::kCurrent;
  build_->source = isCurrent ? source->image : datasources::ImageRecord();
  return build_;
}

void HfaLevelStore::EndWriting(HfaLevelBuild& build) noexcept {
  const std::lock_guard lock(mutex_);
  if (build.IsClosed()) return;
  build.Close();
  created_.erase(build.Level());
  try {
    CommitStamps();
  } catch (...) {
    // deliberate: records with an old stamp cost the next answer a reading of the image
  }
}

/// Of the level that was built, but for the channels.
HfaRecord HfaLevelStore::RecordOfBuild() const {
  HfaRecord record;
  const HfaRecord* before = catalogue_.RecordOf(build_->Level());
  const auto created = created_.find(build_->Level());
  if (created != created_.end()) record.method = created->second.method;
  else if (before) record.method = before->method;
  record.sourceLevel = lastRead_ ? lastRead_ : 1;
  record.program = HfaProgramName();
  record.image = build_->source ? *build_->source : freshness_.ImageBefore();
  return record;
}

/// Puts the pixels that are being written into the file.
void HfaLevelStore::StoreBuild(const std::vector<unsigned>& validChannels) {
  const unsigned level = build_->Level();
  if (!build_->IsComplete())
    Fail(_("%s: level %u is not complete and cannot be marked valid."), level);
  const HfaRecord record = RecordOfBuild();
  const HfaLevelCommit commit(path_, catalogue_, image_);
  HfaPendingLevel pending = commit.Joined(level, record, build_->Store());
  for (const unsigned channel : validChannels)
    if (pending.parts.at(channel - 1) != 0) pending.record.validity[channel - 1] = kHfaValid;
  commit.Store(level, pending);
}

void HfaLevelStore::Mark(unsigned level, const std::vector<unsigned>& channels, bool valid) {
  const char mark = valid ? kHfaValid : kHfaInvalid;
  const auto pending = catalogue_.pending.find(level);
  const auto record = catalogue_.records.find(level);
  if (record == catalogue_.records.end() && pending == catalogue_.pending.end()) {
    if (valid) return;
    Fail(_("%s: level %u is another program's and cannot be marked."), level);
  }
  freshness_.BeginChange(catalogue_);
  const HfaLevelCommit commit(path_, catalogue_, image_);
  HfaPendingLevel waiting;
  if (pending != catalogue_.pending.end()) waiting = pending->second;
  HfaRecord stored;
  if (record != catalogue_.records.end()) stored = record->second;
  bool changesWaiting = false, changesStored = false;
  for (const unsigned channel : channels) {
    const bool isWaiting = catalogue_.IsPending(channel, level);
    if (!isWaiting && record == catalogue_.records.end()) continue;
    char& now = (isWaiting ? waiting.record : stored).validity.at(channel - 1);
    (isWaiting ? changesWaiting : changesStored) |= std::exchange(now, mark) != mark;
  }
  if (changesStored) commit.StoreRecord(level, stored);
  if (changesWaiting) commit.Store(level, waiting);
}

void HfaLevelStore::SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) {
  const std::lock_guard lock(mutex_);
  if (!mayChange_) Fail(_("%s: is open for reading only; level %u cannot be marked."), level);
  LockFile();
  const bool isBuilt = build_ && !build_->IsClosed() && build_->Level() == level;
  const auto has = [&](unsigned channel) {
    return catalogue_.IsStored(channel, level) || catalogue_.IsPending(channel, level) ||
           (isBuilt && valid &&
            std::count(build_->Channels().begin(), build_->Channels().end(), channel) > 0);
  };
  if (!std::all_of(channels.begin(), channels.end(), has))
    Fail(_("%s: level %u is not complete and cannot be marked."), level);
  const ByteRanges before = UsedHfaBytes(path_);
  if (isBuilt && valid) {
    StoreBuild(channels);
    created_.erase(level);
  } else {
    Mark(level, channels, valid);
  }
  freed_.Add(before);
  freed_.Remove(UsedHfaBytes(path_));
  Reload();
  CommitStamps();
}

datasources::LevelRoom HfaLevelStore::RoomFor(const std::vector<unsigned>& levels,
                                              const std::vector<unsigned>& channels) const {
  const std::lock_guard lock(mutex_);
  return HfaSpaceEstimate(path_, image_, catalogue_).For(levels, channels);
}

void HfaLevelStore::Remove(const std::vector<unsigned>& levels) {
  const std::lock_guard lock(mutex_);
  HfaTreeChanges changes;
  for (const unsigned level : catalogue_.Levels())
    if (std::find(levels.begin(), levels.end(), level) != levels.end()) {
      changes.removedLevels.push_back(level);
      changes.removedItems.push_back(HfaRecordKey(level));
      changes.removedItems.push_back(HfaPendingKey(level));
    }
  if (changes.removedLevels.empty() && !levels.empty()) return;
  if (!mayChange_)
    Fail(_("%s: is open for reading only; level %u cannot be removed."),
         changes.removedLevels.empty() ? 0 : changes.removedLevels.back());
  LockFile();
  if (!changes.removedLevels.empty()) {
    freshness_.BeginChange(catalogue_);
    freed_.Add(UsedHfaBytes(path_));
    ChangeHfaTree(path_, changes);
    freed_.Remove(UsedHfaBytes(path_));
    Reload();
  }
  ReclaimSpace();  // also what a removal left that was stopped
  CommitStamps();
}

void HfaLevelStore::ReclaimSpace() {
  isChanged_ = false;
  if (!file_ || catalogue_.pyramid.isSpilled) return;
  const HfaCompactor compactor(*file_);
  if (!compactor.IsWorthIt(freed_)) return;
  freshness_.BeginChange(catalogue_);
  compactor.Compact(freed_);
  freed_ = {};
  Reload();
}

/// The last step of every change.
void HfaLevelStore::CommitStamps() {
  if (file_ && freshness_.CommitStamps(catalogue_, *file_)) Reload();
}

void HfaLevelStore::KeepAnswers() {
  const std::lock_guard lock(mutex_);
  const std::string fingerprint =
      freshness_.IsChanging() ? std::string() : freshness_.Fingerprint(catalogue_);
  const auto now = freshness_.Now();
  bool isOutdated = false;
  HfaCatalogue(catalogue_).ChangeRecords([&](HfaRecord& record) {
    isOutdated = isOutdated || (!fingerprint.empty() && record.image.fingerprint == fingerprint &&
                                record.image.stamp != now);
  });
  if (!isOutdated || !now) return;
  const bool wasLocked = file_ != nullptr;
  try {
    LockFile();
    freshness_.UpdateStamps(catalogue_, fingerprint, *now, *file_);
    Reload();
  } catch (...) {
    // deliberate: a file that cannot be written, or is being written, is no failure of a question
  }
  if (!wasLocked) file_.reset();
}

}  // namespace orin::drivers
