// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tifflevelstore.h"

#include <algorithm>
#include <utility>

#include "host/datasources/levelsources.h"
#include "host/drivers/tiff/levelwriter.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

using datasources::LevelDescription;

std::unique_ptr<datasources::ILevelStore> OpenInternalLevels(
    const std::string& file, const PixelFormat& image, bool update,
    std::shared_ptr<datasources::ImageWatch> watch, model::LevelInputs inputs,
    ImageValidity validity) {
  auto levels = std::make_unique<LevelFile>(file, update);
  TiffLevelStore::Settings settings;
  settings.image = {image.width, image.height, image.samplesPerPixel, image.type, true};
  settings.coding =
      CodingOf(levels->File(), levels->Structure(), levels->Structure().directories[0], image);
  settings.validity = std::move(validity);
  settings.usualSource = 1;
  settings.watch = std::move(watch);
  settings.inputs = std::move(inputs);
  return std::make_unique<TiffLevelStore>(std::move(levels), std::move(settings));
}

TiffLevelStore::TiffLevelStore(std::unique_ptr<LevelFile> file, Settings settings)
    : file_(std::move(file)),
      settings_(std::move(settings)),
      freshness_(settings_.watch, settings_.place == datasources::LevelPlace::kInternal,
                 settings_.inputs) {
  Reload();
}

TiffLevelStore::~TiffLevelStore() {
  try {
    StoreAllWaitingBut(0);
    const bool mayReclaim = settings_.place == datasources::LevelPlace::kInternal;
    if (!file_->IsChanged() && !(mayReclaim && PrepareToReclaim())) return;
    freshness_.BeginChange(*file_, levels_);
    file_->Reclaim();
    Reload();
    EndChange();
    if (file_->Exists())
      freshness_.CommitStamps(file_->ToChange(), file_->Structure(), levels_, std::nullopt);
  } catch (...) {
    // deliberate: nothing is lost but space, which the next change finds again
  }
}

void TiffLevelStore::Reload() {
  levels_.clear();
  catalogue_.reset();
  if (!file_->Exists()) return;
  const TiffStructure& structure = file_->Structure();
  catalogue_.emplace(file_->File(), structure, settings_.image.isInFile);
  levels_ = FindLevels(file_->File(), structure, *catalogue_, settings_.image);
}

bool TiffLevelStore::HasReclaimableSpace() const {
  const std::lock_guard lock(mutex_);
  return file_->HasReclaimableSpace();
}

/// Has free space given back when the store goes, although nothing was changed.
/// \returns false: there is none, or others have the file open
bool TiffLevelStore::PrepareToReclaim() {
  if (!file_->MayChange() || !file_->HasReclaimableSpace() || !file_->IsAlone()) return false;
  CatchUp();
  return true;
}

/// Opens the file for changes and looks again where everything stands: another program may have
/// moved it since the file was opened.
void TiffLevelStore::CatchUp() {
  file_->ToAppend();
  file_->Refresh();
  Reload();
  freshness_.BeginChange(*file_, levels_);
}

void TiffLevelStore::Fail(const char* format, unsigned level, const char* operation) const {
  throw Exception(FormatString(format, file_->Path().c_str(), level),
                  "host/drivers/tiff/tifflevelstore",
                  std::string("orin::drivers::TiffLevelStore::") + operation, 0);
}

const StoredLevel* TiffLevelStore::FindOurs(unsigned level) const {
  const auto found = std::find_if(
      levels_.begin(), levels_.end(),
      [level](const StoredLevel& stored) { return stored.level == level && stored.isOurs; });
  return found == levels_.end() ? nullptr : &*found;
}

/// Ours before another program's.
const StoredLevel* TiffLevelStore::Find(unsigned level) const {
  if (const StoredLevel* ours = FindOurs(level)) return ours;
  const auto found =
      std::find_if(levels_.begin(), levels_.end(),
                   [level](const StoredLevel& stored) { return stored.level == level; });
  return found == levels_.end() ? nullptr : &*found;
}

LevelDescription TiffLevelStore::Describe(const StoredLevel& stored,
                                          const model::Freshness& freshness) const {
  using datasources::LevelStatus;
  const bool isLost =
      freshness.status == LevelStatus::kStale || freshness.status == LevelStatus::kChanged;
  LevelDescription entry;
  entry.level = stored.level;
  entry.width = stored.format.width;
  entry.height = stored.format.height;
  entry.place = settings_.place;
  entry.file = file_->Path();
  entry.method = stored.metadata.method;
  entry.hasMask = stored.mask.has_value();
  entry.status = freshness.status;
  entry.reason = freshness.reason;
  const std::string& validity = stored.metadata.validity;
  const bool lacksMask = GetsMask(stored.format) && !stored.mask;
  if (stored.isOurs && lacksMask && !isLost) entry.status = LevelStatus::kUnfinished;
  for (uint32_t i = 0; i < settings_.image.samples; ++i) {
    entry.presentChannels.push_back(!stored.isOurs || validity[i] != kAbsent);
    entry.validChannels.push_back(!stored.isOurs ||
                                  (validity[i] == kValid && !isLost && !lacksMask));
  }
  if (!stored.isOurs) return entry;
  entry.sourceLevel = stored.metadata.sourceLevel;
  entry.program = stored.metadata.program;
  entry.image = stored.metadata.image;
  entry.bytes = stored.metadata.content.bytes;
  entry.sourceBytes = stored.metadata.sourceBytes;
  return entry;
}

void TiffLevelStore::AddPending(unsigned level, const Pending& pending,
                                std::vector<LevelDescription>& list) const {
  auto entry = std::find_if(list.begin(), list.end(),
                            [level](const LevelDescription& e) { return e.level == level; });
  if (entry == list.end() || !FindOurs(level)) {
    if (entry == list.end()) entry = list.emplace(list.end());
    *entry = LevelDescription();
    entry->level = level;
    entry->width = pending.coding.format.width;
    entry->height = pending.coding.format.height;
    entry->place = settings_.place;
    entry->file = file_->Path();
    entry->method = pending.method;
    entry->program = ProgramName();
    entry->status = datasources::LevelStatus::kUnfinished;
    entry->presentChannels = pending.channels;
    entry->validChannels.assign(pending.channels.size(), false);
  }
  for (size_t i = 0; i < pending.channels.size(); ++i)
    if (pending.channels[i]) entry->presentChannels[i] = true;
  for (const unsigned channel : pending.waiting) entry->validChannels.at(channel - 1) = true;
}

std::vector<LevelDescription> TiffLevelStore::List() const {
  const std::lock_guard lock(mutex_);
  std::vector<LevelDescription> list;
  const LevelFreshness::Answers answers = freshness_.CheckFreshness(*file_, levels_);
  if (file_->MayChange() && freshness_.IsInImage()) KeepStamps(answers);  // opened for update
  for (size_t i = 0; i < levels_.size(); ++i)
    if (Find(levels_[i].level) == &levels_[i])
      list.push_back(Describe(levels_[i], answers.levels[i]));
  if (settings_.place == datasources::LevelPlace::kInternal) datasources::CheckSources(list);
  for (const auto& [level, pending] : pending_) AddPending(level, pending, list);
  std::sort(list.begin(), list.end(),
            [](const LevelDescription& a, const LevelDescription& b) { return a.level < b.level; });
  return list;
}

std::vector<LevelDescription> TiffLevelStore::ListHidden() const {
  const std::lock_guard lock(mutex_);
  std::vector<LevelDescription> hidden;
  for (const StoredLevel& level : levels_)
    if (Find(level.level) != &level) hidden.push_back(Describe(level, model::Freshness()));
  if (!catalogue_) return hidden;
  for (const StoredLevel& level :
       FindSubLevels(file_->File(), file_->Structure(), *catalogue_, settings_.image)) {
    hidden.push_back(Describe(level, model::Freshness()));
    hidden.back().isInSubDirectory = true;
  }
  return hidden;
}

/// Compression and grid are the stored level's; what a directory does not tell is the image's.
LevelCoding TiffLevelStore::CodingOfStored(const StoredLevel& stored) const {
  const TiffStructure& structure = file_->Structure();
  LevelCoding coding =
      CodingOf(file_->File(), structure, structure.directories[stored.index], stored.format);
  const LevelCoding& image = settings_.coding;
  coding.mayBeSparse = image.mayBeSparse;
  const bool isCodedAlike = coding.format.compression == image.format.compression &&
                            coding.predictor == image.predictor &&
                            coding.format.planar == image.format.planar &&
                            coding.jpegQuality <= image.jpegQuality;
  coding.imageBytes.reset();
  if (isCodedAlike) coding.imageBytes = image.imageBytes;
  return coding;
}

void TiffLevelStore::Create(unsigned level, const std::vector<unsigned>& channels,
                            const std::string& method) {
  const std::lock_guard lock(mutex_);
  if (!file_->MayChange())
    Fail(_("%s: is open for reading only; level %u cannot be made."), level, "Create");
  StoreAllWaitingBut(level);
  auto entry = pending_.find(level);
  if (entry == pending_.end()) {
    RequireRoomFor(level, channels);
    entry = pending_.emplace(level, PendingFor(level)).first;
    entry->second.start = freshness_.Begin(levels_);
  }
  for (const unsigned channel : channels) entry->second.channels.at(channel - 1) = true;
  entry->second.method = method;
  source_ = {};
}

std::unique_ptr<datasources::IRasterWriter> TiffLevelStore::OpenWriter(
    unsigned level, const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  const auto pending = pending_.find(level);
  const StoredLevel* stored = Find(level);
  if (pending == pending_.end() && !stored) Fail(_("%s: has no level %u."), level, "OpenWriter");
  const PixelFormat& format =
      pending == pending_.end() ? stored->format : pending->second.coding.format;
  return std::make_unique<LevelWriter>(*this, file_->Path(), level, channels, format);
}

/// Whether any of the channels is finished and waits for others.
bool TiffLevelStore::AnyWaits(unsigned level, const std::vector<unsigned>& channels) const {
  const auto pending = pending_.find(level);
  if (pending == pending_.end()) return false;
  const std::vector<unsigned>& waiting = pending->second.waiting;
  return std::find_first_of(waiting.begin(), waiting.end(), channels.begin(), channels.end()) !=
         waiting.end();
}

std::unique_ptr<PixelReader> TiffLevelStore::OpenPixels(unsigned level,
                                                        const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  if (AnyWaits(level, channels)) StoreWaiting(level);
  const StoredLevel* stored = Find(level);
  if (!stored) Fail(_("%s: level %u is not finished and cannot be read."), level, "OpenPixels");
  if (!pending_.contains(level)) NoteSource(*stored, channels);
  return std::make_unique<PixelReader>(
      file_->Path(), file_->Structure().directories[stored->index].offset, channels);
}

std::unique_ptr<PixelReader> TiffLevelStore::OpenStoredTiles(unsigned level) {
  const std::lock_guard lock(mutex_);
  const StoredLevel* ours = FindOurs(level);
  const auto pending = pending_.find(level);
  if (!ours || (pending != pending_.end() && pending->second.isRecoded)) return nullptr;
  return std::make_unique<PixelReader>(
      file_->Path(), file_->Structure().directories[ours->index].offset, std::vector<unsigned>{1});
}

/// The pending level; one of ours that is in the file becomes pending again.
TiffLevelStore::Pending& TiffLevelStore::Reopen(unsigned level,
                                                const std::vector<unsigned>& channels) {
  const StoredLevel* ours = FindOurs(level);
  const auto entry = pending_.find(level);
  if (entry == pending_.end() && !ours)
    Fail(_("%s: level %u was not created; another program's level is never written."), level,
         "BeginWriting");
  for (const unsigned channel : channels) {
    const bool isCreated = (ours && ours->metadata.validity[channel - 1] != kAbsent) ||
                           (entry != pending_.end() && entry->second.channels[channel - 1]);
    if (!isCreated)
      Fail(_("%s: level %u was not created for all channels to be written."), level,
           "BeginWriting");
  }
  if (entry != pending_.end()) return entry->second;
  Pending pending;
  pending.start = freshness_.Begin(levels_);
  pending.channels.resize(settings_.image.samples);
  pending.method = ours->metadata.method;
  pending.coding = CodingOfStored(*ours);
  return pending_.emplace(level, std::move(pending)).first->second;
}

void TiffLevelStore::Mark(const StoredLevel& stored, const std::vector<unsigned>& channels,
                          char validity) {
  std::string now = stored.metadata.validity;
  for (const unsigned channel : channels) now.at(channel - 1) = validity;
  if (now == stored.metadata.validity) return;
  file_->Overwrite(stored.validityPosition, now);
  file_->Sync();
  Reload();
}

std::shared_ptr<LevelBuild> TiffLevelStore::BeginWriting(unsigned level,
                                                         const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  file_->ToAppend();  // locked from here on, nothing is written yet
  RequireSource(level);
  CatchUp();
  Pending& pending = Reopen(level, channels);
  pending.together = channels.size() > 1 ? channels : std::vector<unsigned>();
  const StoredLevel* ours = FindOurs(level);
  std::vector<unsigned> valid;
  for (const unsigned channel : channels)
    if (ours && ours->metadata.validity[channel - 1] == kValid) valid.push_back(channel);
  if (!valid.empty()) Mark(*ours, valid, kInvalid);
  std::erase_if(pending.waiting, [&](unsigned waiting) {
    return std::find(channels.begin(), channels.end(), waiting) != channels.end();
  });
  if (!pending.build)
    pending.build = std::make_shared<LevelBuild>(pending.coding, file_->ToAppend().End());
  ++pending.build->writers;
  return pending.build;
}

TilePlace TiffLevelStore::AppendTile(const std::vector<uint8_t>& bytes) {
  Appender* appender = nullptr;
  {
    const std::lock_guard lock(mutex_);
    appender = &file_->ToAppend();
  }
  return {appender->Append(bytes), bytes.size()};
}

std::vector<uint8_t> TiffLevelStore::ReadAppended(TilePlace place) const {
  const PositionedFile* file = nullptr;
  {
    const std::lock_guard lock(mutex_);
    file = &file_->File();
  }
  std::vector<uint8_t> bytes(place.count);
  file->Read(place.offset, bytes.data(), bytes.size());
  return bytes;
}

void TiffLevelStore::GiveUp(unsigned level, LevelBuild& build) {
  build.isClosed = true;
  pending_.erase(level);
  const bool isLast = std::none_of(pending_.begin(), pending_.end(),
                                   [](const auto& entry) { return entry.second.build != nullptr; });
  if (isLast) file_->CutBackTo(build.FirstEnd());
}

void TiffLevelStore::EndWriting(unsigned level, LevelBuild& build) noexcept {
  const std::lock_guard lock(mutex_);
  if (--build.writers > 0 || build.isClosed) return;
  const auto pending = pending_.find(level);
  const bool isWaited = pending != pending_.end() && !pending->second.waiting.empty();
  if (isWaited && build.HasOnlyCompletePlanes()) return;
  try {
    if (isWaited) StoreWaiting(level);
    else if (!build.IsEmpty() && build.HasOnlyCompletePlanes())
      Store(level, pending_.at(level), CompletePlanes(build), std::move(build.mask), std::nullopt);
  } catch (...) {
    // deliberate: a destructor calls this; the level stays what it was in the file
  }
  try {
    if (!build.isClosed) GiveUp(level, build);
    EndChange();
  } catch (...) {
    // deliberate: what was appended stays behind unused
  }
}

void TiffLevelStore::SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) {
  const std::lock_guard lock(mutex_);
  const auto pending = pending_.find(level);
  if (valid && pending != pending_.end() && pending->second.build) {
    const std::vector<uint32_t> planes = PlanesOf(pending->second.coding, channels);
    for (const uint32_t plane : planes)
      if (!pending->second.build->IsComplete(plane))
        Fail(_("%s: level %u is not complete and cannot be marked valid."), level, "SetValid");
    if (const LevelBuild* mask = pending->second.build->mask.get(); mask && !mask->IsComplete(0))
      Fail(_("%s: level %u is not complete and cannot be marked valid."), level, "SetValid");
    LevelSource source = source_;
    source.image = RecordOrGiveUp(level, pending->second);
    if (!Waits(pending->second, channels, source))
      StoreFinished(level, pending->second, channels, source);
    return;
  }
  if (AnyWaits(level, channels) || !Find(level)) StoreWaiting(level);
  if (file_->Exists()) CatchUp();
  MarkStored(level, channels, valid);
}

void TiffLevelStore::MarkStored(unsigned level, const std::vector<unsigned>& channels, bool valid) {
  const StoredLevel* stored = Find(level);
  RequireStored(stored, level, channels);
  if (stored->isOurs && valid) RecordContent(level);
  stored = Find(level);
  if (stored->isOurs) Mark(*stored, channels, valid ? kValid : kInvalid);
  else if (!valid)
    Fail(_("%s: level %u is another program's and cannot be marked."), level, "SetValid");
  EndChange();
}

void TiffLevelStore::RequireStored(const StoredLevel* stored, unsigned level,
                                   const std::vector<unsigned>& channels) const {
  if (!stored || (!stored->isOurs && pending_.contains(level)))
    Fail(_("%s: level %u is not complete and cannot be marked."), level, "SetValid");
  for (const unsigned channel : channels)
    if (stored->isOurs && stored->metadata.validity.at(channel - 1) == kAbsent)
      Fail(_("%s: level %u is not complete and cannot be marked."), level, "SetValid");
}

}  // namespace orin::drivers
