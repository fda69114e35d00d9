/// How levels in an ERDAS Imagine file stand to its image, which other programs may have changed.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <chrono>
#include <exception>
#include <utility>

#include "host/drivers/gdal/hfalevelstore.h"
#include "host/drivers/gdal/patchedfile.h"

namespace orin::drivers {

using datasources::ImageRecord;
using datasources::ImageStamp;
using datasources::LevelStatus;

/// What the image shows now; while levels are written into its file, what it showed before.
std::optional<ImageStamp> HfaLevelStore::Now() const {
  if (isChanging_) return before_;
  return watch_ ? watch_->Stamp() : std::nullopt;
}

/// Levels that agree on what the image was when it looked as now are believed.
void HfaLevelStore::Trust(const ImageStamp& now) const {
  if (watch_->Known(now)) return;
  std::string fingerprint;
  for (const auto& [level, record] : records_) {
    if (record.image.IsBlank() || record.image.stamp != now) continue;
    if (!fingerprint.empty() && fingerprint != record.image.fingerprint) return;
    fingerprint = record.image.fingerprint;
  }
  if (!fingerprint.empty()) watch_->Learn(now, fingerprint);
}

/// Of the image; reads it where its time has changed. Empty when it cannot be told, or when no
/// level remembers one.
std::string HfaLevelStore::FingerprintNow() const {
  const bool isWanted = std::any_of(records_.begin(), records_.end(), [](const auto& entry) {
    return !entry.second.image.IsBlank();
  });
  const auto now = isWanted ? Now() : std::nullopt;
  if (!now) return {};
  Trust(*now);
  const std::string fingerprint = watch_->Fingerprint(*now);
  return isChanging_ || watch_->Stamp() == now ? fingerprint : std::string();
}

LevelStatus HfaLevelStore::StatusOf(unsigned level, const std::string& fingerprint) const {
  const auto record = records_.find(level);
  if (record == records_.end())
    return pending_.contains(level) ? LevelStatus::kUnfinished : LevelStatus::kUnverified;
  const bool isKnown = !record->second.image.IsBlank() && !fingerprint.empty();
  if (isKnown && record->second.image.fingerprint != fingerprint) return LevelStatus::kStale;
  if (record->second.validity.find(kHfaInvalid) != std::string::npos)
    return LevelStatus::kUnfinished;
  return isKnown ? LevelStatus::kCurrent : LevelStatus::kUnverified;
}

/// The first change of the file comes next. The image's fingerprint is computed meanwhile.
void HfaLevelStore::BeginChange() {
  if (isChanging_ || !watch_) return;
  before_ = watch_->Stamp();
  isChanging_ = true;
  if (!before_) return;
  Trust(*before_);
  watch_->Start(*before_);
}

/// What the level that was built remembers. A level has one image for all its channels: those of
/// another one are not valid from now on.
void HfaLevelStore::RememberImage(HfaRecord& record) const {
  ImageRecord image = build_->source.value_or(ImageRecord());
  if (!build_->source && before_) {
    const std::string fingerprint = watch_->Fingerprint(*before_);
    if (!fingerprint.empty()) image = {fingerprint, *before_};
  }
  if (!record.image.IsBlank() && record.image.fingerprint != image.fingerprint)
    std::replace(record.validity.begin(), record.validity.end(), kHfaValid, kHfaInvalid);
  record.image = image;
}

/// Has the levels of the image `fingerprint` remember how it looks. The file's time is set by the
/// caller: these are its last writes.
void HfaLevelStore::Restamp(const std::string& fingerprint, const ImageStamp& stamp) const {
  PatchedFile file(path_);
  const std::string text = datasources::TextOf(stamp);
  for (const auto& [level, record] : records_) {
    if (record.image.fingerprint != fingerprint || record.image.stamp == stamp) continue;
    const auto item = FindHfaItem(path_, HfaRecordKey(level));
    const std::string known = ComposeHfaRecord(record);
    std::string there(known.size(), '\0');
    const bool isThere = item && file.Read(item->text, there.data(), there.size()) == known.size();
    if (isThere && there == known)
      file.Write(item->text + known.size() - text.size(), text.data(), text.size());
  }
  file.Commit();
}

/// The last step of every change: levels that were computed from the data that the image holds
/// learn the size and time that the file has from then on.
void HfaLevelStore::Settle() {
  const bool wasChanging = isChanging_;
  isChanging_ = false;
  if (!wasChanging || !before_ || !lock_) return;
  const std::string fingerprint = watch_->Known(*before_).value_or("");
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  lock_->SetModified(std::chrono::nanoseconds(now).count());
  const auto stamp = watch_->Stamp();  // with the time as the file system keeps it
  if (fingerprint.empty() || !stamp) return;
  Restamp(fingerprint, *stamp);
  lock_->SetModified(stamp->modified);
  watch_->Learn(*stamp, fingerprint);
  Reload();
}

void HfaLevelStore::KeepAnswers() {
  const std::lock_guard lock(mutex_);
  const std::string fingerprint = isChanging_ ? std::string() : FingerprintNow();
  const auto now = Now();
  const bool isOutdated = std::any_of(records_.begin(), records_.end(), [&](const auto& entry) {
    const ImageRecord& image = entry.second.image;
    return !fingerprint.empty() && image.fingerprint == fingerprint && image.stamp != now;
  });
  if (!isOutdated || !now) return;
  const bool wasLocked = lock_ != nullptr;
  try {
    LockFile();
    Restamp(fingerprint, *now);
    lock_->SetModified(now->modified);
    Reload();
  } catch (const std::exception&) {
    // deliberate: a file that cannot be written, or is being written, is no failure of a question
  }
  if (!wasLocked) lock_.reset();
}

}  // namespace orin::drivers
