/// What levels record of the image and of the level that they were computed from.
// SPDX-License-Identifier: MIT
#include <algorithm>

#include "host/datasources/filestate.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

using model::ImageRecord;

/// Before the first write of a level: the image is what it was when its reading began.
void TiffLevelStore::RequireSource(unsigned level) {
  const auto pending = pending_.find(level);
  if (pending == pending_.end() || pending->second.build || source_.isLevel) return;
  try {
    freshness_.RequireUnchanged(pending->second.start);
  } catch (const Exception&) {
    pending_.erase(level);
    throw;
  }
}

/// After the last read of a source level in this file: it is what its record says. A foreign write
/// that is found later could no longer be told from one before.
void TiffLevelStore::RequireSourceLevel() const {
  const StoredLevel* stored = FindOurs(source_.level);
  if (source_.bytes.empty() || !stored || stored->metadata.content.bytes != source_.bytes) return;
  if (BytesDigestOf(file_->File(), file_->Structure(), *stored) == source_.bytes) return;
  Fail(_("%s: another program wrote into level %u while a smaller one was computed from it. Run "
         "the same command again."),
       source_.level, "RequireSourceLevel");
}

/// What the level records that was computed: what its source level does, or the image. One of an
/// image that changed meanwhile is nothing.
ImageRecord TiffLevelStore::RecordOrGiveUp(unsigned level, const Pending& pending) {
  try {
    if (source_.isLevel) {
      RequireSourceLevel();
      return source_.image;
    }
    return freshness_.RecordSince(pending.start, file_->TakeWasTouched());
  } catch (const Exception&) {
    const std::shared_ptr<LevelBuild> build = pending.build;
    GiveUp(level, *build);
    freshness_.Doubt();
    EndChange();
    throw;
  }
}

/// \param channels  that are read
void TiffLevelStore::NoteSource(const StoredLevel& stored, const std::vector<unsigned>& channels) {
  const bool isWhole = stored.isOurs && std::all_of(channels.begin(), channels.end(), [&](auto c) {
                         return stored.metadata.validity.at(c - 1) == kValid;
                       });
  source_ = {stored.level, stored.metadata.content.bytes,
             isWhole ? stored.metadata.image : ImageRecord(), true};
}

void TiffLevelStore::SetSource(const datasources::LevelDescription& source) {
  const std::lock_guard lock(mutex_);
  const bool isWhole = source.status == datasources::LevelStatus::kCurrent;
  source_ = {source.level, source.bytes, isWhole ? source.image : ImageRecord(), true};
}

/// Writes into the level's record what the file holds of it.
void TiffLevelStore::RecordContent(unsigned level) {
  const StoredLevel* stored = FindOurs(level);
  if (!stored || stored->contentPosition == 0) return;
  const model::ContentRecord content = freshness_.ContentOf(*file_, *stored);
  file_->Overwrite(stored->contentPosition, model::TextOf(content));
  Reload();
}

/// Whether the stored channels are what the record says, which goes on counting for them.
bool TiffLevelStore::IsWhole(const StoredLevel& stored) {
  const model::ContentRecord& content = stored.metadata.content;
  return !content.IsBlank() && freshness_.BytesOf(*file_, stored) == content.bytes;
}

/// The last step of every change.
void TiffLevelStore::EndChange() {
  if (freshness_.IsInImage() && file_->Exists() && file_->TakeWasTouched()) freshness_.Doubt();
  freshness_.EndChange(*file_);
}

void TiffLevelStore::KeepAnswers() {
  const std::lock_guard lock(mutex_);
  if (file_->Exists()) KeepStamps(freshness_.CheckFreshness(*file_, levels_));
}

/// Once for each state that the image shows. A file that cannot be written, or is being written, is
/// no failure of a question.
void TiffLevelStore::KeepStamps(const LevelFreshness::Answers& answers) const {
  const bool isBusy = freshness_.IsChanging() || file_->IsChanged() || !pending_.empty();
  if (!answers.areStampsOld || isBusy || kept_ == answers.now) return;
  kept_ = answers.now;
  try {
    const auto file = file_->OpenLocked();
    const TiffStructure structure = ParseStructure(*file);
    const Catalogue catalogue(*file, structure, settings_.image.isInFile);
    const auto levels = FindLevels(*file, structure, catalogue, settings_.image);
    if (const auto state = datasources::StateOf(file->Path()))
      freshness_.CommitStamps(*file, structure, levels, state->modified);
  } catch (...) {
    // deliberate, see above
  }
}

}  // namespace orin::drivers
