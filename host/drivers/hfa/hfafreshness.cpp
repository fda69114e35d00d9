// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfafreshness.h"

#include <chrono>
#include <utility>
#include <vector>

namespace orin::drivers {

using datasources::ImageRecord;
using datasources::ImageStamp;
using datasources::LevelStatus;

namespace {

/// Of all levels, pending ones as well.
std::vector<ImageRecord> ImagesIn(const HfaCatalogue& catalogue) {
  std::vector<ImageRecord> images;
  for (const auto& [level, record] : catalogue.records) images.push_back(record.image);
  for (const auto& [level, pending] : catalogue.pending) images.push_back(pending.record.image);
  std::erase_if(images, [](const ImageRecord& image) { return image.IsBlank(); });
  return images;
}

}  // namespace

HfaFreshness::HfaFreshness(std::shared_ptr<datasources::ImageWatch> watch)
    : watch_(std::move(watch)) {}

std::optional<ImageStamp> HfaFreshness::Now() const {
  if (isChanging_) return before_;
  return watch_ ? watch_->Stamp() : std::nullopt;
}

/// Levels that agree on what the image was when it looked as now are believed.
void HfaFreshness::Trust(const HfaCatalogue& catalogue, const ImageStamp& now) const {
  if (watch_->Known(now)) return;
  std::string fingerprint;
  for (const ImageRecord& image : ImagesIn(catalogue)) {
    if (image.stamp != now) continue;
    if (!fingerprint.empty() && fingerprint != image.fingerprint) return;
    fingerprint = image.fingerprint;
  }
  if (!fingerprint.empty()) watch_->Learn(now, fingerprint);
}

std::string HfaFreshness::Fingerprint(const HfaCatalogue& catalogue) const {
  const auto now = ImagesIn(catalogue).empty() ? std::nullopt : Now();
  if (!now) return {};
  Trust(catalogue, *now);
  const std::string fingerprint = watch_->Fingerprint(*now);
  return isChanging_ || watch_->Stamp() == now ? fingerprint : std::string();
}

LevelStatus HfaFreshness::StatusOf(const HfaRecord* record, bool isFinished,
                                   const std::string& fingerprint) {
  const bool isKnown = record && !record->image.IsBlank() && !fingerprint.empty();
  if (isKnown && record->image.fingerprint != fingerprint) return LevelStatus::kStale;
  if (!isFinished) return LevelStatus::kUnfinished;
  return isKnown ? LevelStatus::kCurrent : LevelStatus::kUnverified;
}

void HfaFreshness::BeginChange(const HfaCatalogue& catalogue) {
  if (isChanging_ || !watch_) return;
  before_ = watch_->Stamp();
  isChanging_ = true;
  if (!before_) return;
  Trust(catalogue, *before_);
  watch_->Start(*before_);
}

ImageRecord HfaFreshness::ImageBefore() const {
  if (!before_) return {};
  const std::string fingerprint = watch_->Fingerprint(*before_);
  return fingerprint.empty() ? ImageRecord() : ImageRecord{fingerprint, *before_};
}

bool HfaFreshness::CommitStamps(const HfaCatalogue& catalogue, PositionedFile& file) {
  const bool wasChanging = std::exchange(isChanging_, false);
  if (!wasChanging || !before_) return false;
  const std::string fingerprint = watch_->Known(*before_).value_or("");
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  file.SetModified(std::chrono::nanoseconds(now).count());
  const auto stamp = watch_->Stamp();  // with the time as the file system keeps it
  if (fingerprint.empty() || !stamp) return false;
  UpdateStamps(catalogue, fingerprint, *stamp, file);
  watch_->Learn(*stamp, fingerprint);
  return true;
}

void HfaFreshness::UpdateStamps(const HfaCatalogue& catalogue, const std::string& fingerprint,
                                const ImageStamp& stamp, PositionedFile& file) const {
  const std::string text = datasources::TextOf(stamp);
  const auto update = [&](const std::string& key, const std::string& known,
                          const ImageRecord& image) {
    if (image.fingerprint != fingerprint || image.stamp == stamp) return;
    const auto item = FindHfaItem(file.Path(), key);
    std::string there(known.size(), '\0');
    const bool isThere =
        item && file.ReadUpTo(item->text, there.data(), there.size()).bytes == known.size();
    if (isThere && there == known)
      file.Write(item->text + known.size() - text.size(), text.data(), text.size());
  };
  for (const auto& [level, record] : catalogue.records)
    update(HfaRecordKey(level), ComposeHfaRecord(record), record.image);
  for (const auto& [level, pending] : catalogue.pending)
    update(HfaPendingKey(level), ComposeHfaPending(pending), pending.record.image);
  file.Sync();
  file.SetModified(stamp.modified);
}

}  // namespace orin::drivers
