// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelfreshness.h"

#include <algorithm>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::ImageRecord;
using datasources::ImageStamp;
using datasources::LevelStatus;

bool Remembers(const StoredLevel& level) { return level.isOurs && !level.metadata.image.IsBlank(); }

/// Channels that are absent count: other programs show them empty.
bool IsFinished(const StoredLevel& level) {
  return !level.isOurs || level.metadata.validity.find_first_not_of(kValid) == std::string::npos;
}

/// \param fingerprint  of the image now; empty when it is unknown
LevelStatus StatusOf(const StoredLevel& level, const std::string& fingerprint) {
  const bool isKnown = Remembers(level) && !fingerprint.empty();
  if (isKnown && level.metadata.image.fingerprint != fingerprint) return LevelStatus::kStale;
  if (!IsFinished(level)) return LevelStatus::kUnfinished;
  return isKnown ? LevelStatus::kCurrent : LevelStatus::kUnverified;
}

}  // namespace

std::optional<ImageStamp> LevelFreshness::Now() const {
  return isChanging_ ? before_ : watch_->Stamp();
}

/// Levels that agree on what the image was when it looked as now are believed.
void LevelFreshness::Trust(const std::vector<StoredLevel>& levels, const ImageStamp& now) {
  if (watch_->Known(now)) return;
  std::string fingerprint;
  for (const StoredLevel& level : levels) {
    const ImageRecord& record = level.metadata.image;
    if (!Remembers(level) || record.stamp != now) continue;
    if (!fingerprint.empty() && record.fingerprint != fingerprint) return;
    fingerprint = record.fingerprint;
  }
  if (!fingerprint.empty()) watch_->Learn(now, fingerprint);
}

/// Empty when it cannot be told, or when nobody needs it.
std::string LevelFreshness::FingerprintFor(const std::vector<StoredLevel>& levels,
                                           const ImageStamp& now) {
  if (std::none_of(levels.begin(), levels.end(), Remembers)) return {};
  Trust(levels, now);
  if (const auto known = watch_->Known(now)) return *known;
  std::string fingerprint = watch_->Fingerprint(now);
  const bool isStill = isChanging_ || watch_->Stamp() == now;
  return isStill ? fingerprint : std::string();
}

LevelFreshness::Judgement LevelFreshness::Judge(const std::vector<StoredLevel>& levels) {
  Judgement judgement;
  judgement.now = Now();
  const std::string fingerprint =
      judgement.now ? FingerprintFor(levels, *judgement.now) : std::string();
  for (size_t i = 0; i < levels.size(); ++i) {
    const ImageRecord& record = levels[i].metadata.image;
    judgement.statuses.push_back(StatusOf(levels[i], fingerprint));
    if (Remembers(levels[i]) && record.fingerprint == fingerprint && record.stamp != judgement.now)
      judgement.outdated.push_back(i);
  }
  return judgement;
}

void LevelFreshness::BeginChange(const std::vector<StoredLevel>& levels) {
  if (isChanging_) return;
  before_ = watch_->Stamp();
  isChanging_ = isInImage_;
  if (before_) Trust(levels, *before_);
  wasKnown_ = before_ && watch_->Known(*before_);
}

void LevelFreshness::EndChange(const std::optional<ImageStamp>& now) {
  const std::string fingerprint = KnownFingerprint();
  if (now && !fingerprint.empty()) watch_->Learn(*now, fingerprint);
  isChanging_ = false;
}

void LevelFreshness::Prepare(const std::optional<ImageStamp>& start) {
  if (start) watch_->Start(*start);
}

ImageRecord LevelFreshness::RecordSince(const std::optional<ImageStamp>& start, bool wasTouched) {
  if (!start) return {};
  std::string fingerprint = watch_->Fingerprint(*start);
  // A fingerprint that was computed meanwhile may be of the data before or after a touch.
  const auto isAsBefore = [&] { return wasKnown_ && watch_->Again() == fingerprint; };
  const bool hasChanged = isInImage_ ? wasTouched && !isAsBefore() : watch_->Stamp() != start;
  if (hasChanged)
    throw Exception(FormatString(_("%s: was changed by another program while a level was computed "
                                   "from it. Run again when nobody writes to it."),
                                 watch_->File().c_str()),
                    "host/drivers/tiff/levelfreshness", "LevelFreshness::RecordSince", 0);
  return fingerprint.empty() ? ImageRecord() : ImageRecord{std::move(fingerprint), *start};
}

std::string LevelFreshness::KnownFingerprint() const {
  const auto now = Now();
  return now ? watch_->Known(*now).value_or("") : "";
}

uint64_t StampPosition(const StoredLevel& level) {
  return level.imagePosition + datasources::kImageRecordLength - datasources::kImageStampLength;
}

void RestampLevels(const LevelFile& levelFile, const std::vector<const StoredLevel*>& levels,
                   const ImageStamp& stamp, bool isInImage) noexcept {
  try {
    const auto file = levelFile.OpenLocked();
    for (const StoredLevel* level : levels) {
      std::string there(datasources::kImageRecordLength, '\0');
      file->Read(level->imagePosition, there.data(), there.size());
      if (datasources::ParseImageRecord(there) != level->metadata.image) continue;
      const std::string text = TextOf(stamp);
      file->Write(StampPosition(*level), text.data(), text.size());
    }
    if (isInImage) file->SetModified(stamp.modified);
  } catch (...) {
    // deliberate: a file that cannot be written, or is being written, is no failure of a question
  }
}

}  // namespace orin::drivers
