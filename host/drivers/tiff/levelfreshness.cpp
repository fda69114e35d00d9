// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelfreshness.h"

#include <algorithm>
#include <chrono>
#include <utility>

#include "host/datasources/filestate.h"
#include "host/drivers/tiff/stampcommit.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

using model::FileStamp;
using model::ImageRecord;
using model::ImageStamp;

LevelFreshness::LevelFreshness(std::shared_ptr<datasources::ImageWatch> watch, bool isInImage,
                               model::LevelInputs inputs)
    : watch_(std::move(watch)), isInImage_(isInImage), inputs_(std::move(inputs)) {
  opened_ = watch_->FullStamp();
}

void LevelFreshness::FailAsChanged(const char* operation) const {
  throw Exception(FormatString(_("%s: was changed by another program while a level was computed "
                                 "from it. Run again when nobody writes to it."),
                               watch_->File().c_str()),
                  "host/drivers/tiff/levelfreshness", std::string("LevelFreshness::") + operation,
                  0);
}

/// What the image shows; while levels are written into it, what it showed before.
std::optional<ImageStamp> LevelFreshness::Now() const {
  if (isInImage_ && isChanging_) return before_;
  auto now = watch_->FullStamp();
  if (now && isInImage_) now = now->InImage();
  return now;
}

/// The same of the file that holds the levels.
std::optional<FileStamp> LevelFreshness::HolderNow(const std::string& file) const {
  if (isChanging_) return holderBefore_;
  const auto state = datasources::StateOf(file);
  return state ? std::optional(FileStamp{state->bytes, state->modified}) : std::nullopt;
}

/// Levels that agree on what the image was when it looked as now are believed.
void LevelFreshness::Trust(const std::vector<StoredLevel>& levels) {
  const auto now = Now();
  if (!now || watch_->Known(*now)) return;
  std::string fingerprint;
  for (const StoredLevel& level : levels) {
    const ImageRecord& record = level.metadata.image;
    if (!level.isOurs || record.IsBlank() || !IsUnchanged(record.stamp, *now)) continue;
    if (!fingerprint.empty() && record.fingerprint != fingerprint) return;
    fingerprint = record.fingerprint;
  }
  if (!fingerprint.empty()) watch_->Learn(*now, fingerprint);
}

/// Of `Now()`, if it is known without reading; else empty.
std::string LevelFreshness::KnownFingerprint() const {
  const auto now = Now();
  return now ? watch_->Known(*now).value_or("") : "";
}

/// Empty when it cannot be told.
std::string LevelFreshness::FingerprintOf(const ImageStamp& now) {
  if (const auto known = watch_->Known(now)) return *known;
  std::string fingerprint = watch_->Fingerprint(now);
  return isChanging_ || Now() == now ? fingerprint : std::string();
}

std::string LevelFreshness::BytesOf(const LevelFile& file, const StoredLevel& level) {
  const auto holder = HolderNow(file.Path());
  std::string bytes = holder ? contents_.KnownBytes(level, *holder) : std::string();
  if (!bytes.empty()) return bytes;
  bytes = BytesDigestOf(file.File(), file.Structure(), level);
  if (holder) contents_.Learn(level, *holder, bytes);
  return bytes;
}

model::ContentRecord LevelFreshness::ContentOf(const LevelFile& file, const StoredLevel& level) {
  StoredLevel recorded = level;
  model::ContentRecord& content = recorded.metadata.content;
  content = {TableDigestOf(file.File(), file.Structure(), level),
             BytesDigestOf(file.File(), file.Structure(), level),
             {}};
  if (const auto holder = HolderNow(file.Path())) contents_.Learn(recorded, *holder, content.bytes);
  return content;
}

LevelFreshness::Answers LevelFreshness::CheckFreshness(const LevelFile& file,
                                                       const std::vector<StoredLevel>& levels) {
  Answers answers;
  answers.now = Now();
  model::ObservedImage image{answers.now, inputs_, [&] { return FingerprintOf(*answers.now); }};
  if (answers.now)  // what is known in this program comes before what levels say
    if (const auto known = watch_->Known(*answers.now); known && isChanging_)
      image.fingerprint = [known] { return *known; };
  std::vector<model::LevelRecord> records;
  std::vector<model::ObservedLevel> observed;
  for (const StoredLevel& level : levels) {
    records.push_back(level.isOurs ? model::LevelRecord(level.metadata) : model::LevelRecord());
    observed.push_back({HolderNow(file.Path()),
                        level.isOurs ? TableDigestOf(file.File(), file.Structure(), level) : "",
                        [&] { return BytesOf(file, level); }});
  }
  answers.levels = model::CheckFreshness(records, image, observed);
  answers.areStampsOld =
      std::any_of(answers.levels.begin(), answers.levels.end(),
                  [](const model::Freshness& answer) { return answer.isStampOld; });
  return answers;
}

void LevelFreshness::BeginChange(const LevelFile& file, const std::vector<StoredLevel>& levels) {
  if (isChanging_) return;
  Trust(levels);
  before_ = Now();
  holderBefore_ = HolderNow(file.Path()).value_or(FileStamp());
  for (const StoredLevel& level : levels) {
    const model::ContentRecord& content = level.metadata.content;
    const bool isBelieved = holderBefore_ && content.holder == *holderBefore_ &&
                            contents_.KnownBytes(level, *holderBefore_).empty();
    if (level.isOurs && isBelieved) contents_.Learn(level, *holderBefore_, content.bytes);
  }
  isChanging_ = true;
  hasChanged_ = true;
}

void LevelFreshness::EndChange(const LevelFile& file) {
  if (!isChanging_) return;
  const std::string fingerprint = KnownFingerprint();
  isChanging_ = false;
  if (!file.Exists()) return;
  const auto holder = HolderNow(file.Path());
  if (holder && holderBefore_) contents_.Carry(*holderBefore_, *holder);
  const auto now = Now();
  if (now && !fingerprint.empty()) watch_->Learn(*now, fingerprint);
}

std::optional<LevelFreshness::Start> LevelFreshness::Begin(const std::vector<StoredLevel>& levels) {
  Trust(levels);
  const bool isUntouched = !isInImage_ || !hasChanged_;
  const bool isKnown = isInImage_ && !KnownFingerprint().empty();
  const auto stamp = isKnown ? watch_->FullStamp() : watch_->SettledStamp();
  if (isUntouched && opened_ && (!stamp || stamp->InImage() != opened_->InImage()))
    FailAsChanged("Begin");
  if (!stamp) return std::nullopt;
  if (!isKnown) watch_->Start(*stamp);
  return Start{*stamp, isKnown};
}

void LevelFreshness::RequireUnchanged(const std::optional<Start>& start) {
  if (!start || start->isKnown || !isInImage_ || proven_ == start->stamp) return;
  const std::string fingerprint = watch_->Fingerprint(start->stamp);
  if (watch_->FullStamp() != start->stamp) FailAsChanged("RequireUnchanged");
  proven_ = start->stamp;
  if (!fingerprint.empty()) watch_->Learn(start->stamp.InImage(), fingerprint);
}

ImageRecord LevelFreshness::RecordSince(const std::optional<Start>& start, bool wasTouched) {
  if (!start) return {};
  if (isInImage_) {
    const std::string fingerprint = KnownFingerprint();
    if (wasTouched && (fingerprint.empty() || watch_->Again() != fingerprint))
      FailAsChanged("RecordSince");
    return {fingerprint, {}};  // the stamp comes last of all
  }
  const std::string fingerprint = watch_->Fingerprint(start->stamp);
  if (watch_->FullStamp() != start->stamp) FailAsChanged("RecordSince");
  proven_ = start->stamp;
  return fingerprint.empty() ? ImageRecord() : ImageRecord{fingerprint, start->stamp};
}

void LevelFreshness::CommitStamps(PositionedFile& file, const TiffStructure& structure,
                                  const std::vector<StoredLevel>& levels,
                                  std::optional<int64_t> modified) {
  const auto settled = isInImage_ ? watch_->FullStamp() : watch_->SettledStamp();
  if (!settled) return;
  Trust(levels);
  const std::string fingerprint =
      isInImage_ ? KnownFingerprint() : watch_->Known(*settled).value_or("");
  const auto holder = HolderNow(file.Path());
  if (fingerprint.empty() || !holder) return;
  StampCommit commit(file, structure);
  for (const StoredLevel& level : levels) {
    const bool isWhole =
        level.metadata.content.holder == *holder || contents_.IsWhole(level, *holder);
    if (level.isOurs && isWhole && level.metadata.image.fingerprint == fingerprint)
      commit.Add(level);
  }
  const bool mustRead = isInImage_ || proven_ != settled;
  const auto holds = [&] {
    return (!mustRead || watch_->Again() == fingerprint) &&
           (isInImage_ || watch_->FullStamp() == settled);
  };
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  commit.Run(isInImage_ ? std::nullopt : settled, settled->companions,
             modified.value_or(std::chrono::nanoseconds(now).count()), holds);
}

}  // namespace orin::drivers
