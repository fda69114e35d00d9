/// How levels remember the image that they were computed from, once all else is written.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <chrono>

#include "host/drivers/tiff/tifflevelstore.h"
#include "host/services/exception.h"

namespace orin::drivers {

using datasources::ImageRecord;
using datasources::ImageStamp;

/// What the level remembers that was computed: what its source level does, or the image. One of an
/// image that changed meanwhile is nothing.
ImageRecord TiffLevelStore::RecordOrGiveUp(unsigned level, const Pending& pending) {
  if (source_) return *source_;
  try {
    return freshness_.RecordSince(pending.imageAtStart, file_->TakeWasTouched());
  } catch (const Exception&) {
    const std::shared_ptr<LevelBuild> build = pending.build;
    GiveUp(level, *build);
    freshness_.Doubt();
    Settle();
    throw;
  }
}

/// \param channels  that are read
void TiffLevelStore::NoteSource(const StoredLevel& stored, const std::vector<unsigned>& channels) {
  lastRead_ = stored.level;
  const bool isWhole = stored.isOurs && std::all_of(channels.begin(), channels.end(), [&](auto c) {
                         return stored.metadata.validity.at(c - 1) == kValid;
                       });
  source_ = isWhole ? stored.metadata.image : ImageRecord();
}

void TiffLevelStore::SetSource(const datasources::LevelDescription& source) {
  const std::lock_guard lock(mutex_);
  lastRead_ = source.level;
  const bool isWhole = source.status == datasources::LevelStatus::kCurrent;
  source_ = isWhole ? source.image : ImageRecord();
}

/// The last step of every change. Levels that were computed from the data that the image holds
/// learn its size and time. Where that is the file that was just written, its time is set to the
/// one written, so that it agrees from then on; a step left out, by a kill or a loss of power,
/// costs the next answer a reading of the image. So does a file that somebody else wrote to.
void TiffLevelStore::Settle() {
  if (!file_->Exists()) return freshness_.EndChange(std::nullopt);
  if (freshness_.IsInImage() && file_->TakeWasTouched()) freshness_.Doubt();
  const std::string fingerprint = freshness_.KnownFingerprint();
  std::optional<ImageStamp> stamp = freshness_.Now();
  if (fingerprint.empty() || !stamp) return freshness_.EndChange(std::nullopt);
  if (freshness_.IsInImage()) {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    stamp->bytes = file_->File().Size();
    stamp->modified = file_->SetModified(std::chrono::nanoseconds(now).count());
  }
  for (const StoredLevel& level : levels_) {
    const ImageRecord& record = level.metadata.image;
    if (level.isOurs && record.fingerprint == fingerprint && record.stamp != *stamp)
      file_->Overwrite(StampPosition(level), TextOf(*stamp));
  }
  if (freshness_.IsInImage()) file_->SetModified(stamp->modified);
  freshness_.EndChange(stamp);
  Reload();
}

void TiffLevelStore::KeepAnswers() {
  const std::lock_guard lock(mutex_);
  Keep(freshness_.Judge(levels_));
}

void TiffLevelStore::Keep(const LevelFreshness::Judgement& judgement) const {
  if (judgement.outdated.empty() || freshness_.IsChanging() || kept_ == judgement.now) return;
  kept_ = judgement.now;
  std::vector<const StoredLevel*> levels;
  for (const size_t index : judgement.outdated) levels.push_back(&levels_[index]);
  RestampLevels(*file_, levels, *judgement.now, freshness_.IsInImage());
}

}  // namespace orin::drivers
