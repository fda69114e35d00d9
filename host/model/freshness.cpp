// SPDX-License-Identifier: MIT
#include "host/model/freshness.h"

#include <algorithm>
#include <cassert>

namespace orin::model {
namespace {

bool Remembers(const LevelRecord& record) { return record.version > 0 && !record.image.IsBlank(); }

/// The image's fingerprint now, found out when it is first asked for.
class FingerprintNow {
 public:
  FingerprintNow(const std::vector<LevelRecord>& records, const ObservedImage& image)
      : image_(image) {
    if (!image.stamp) return;
    bool isContradicted = false;
    for (const LevelRecord& record : records) {
      if (!Remembers(record) || !IsUnchanged(record.image.stamp, *image.stamp)) continue;
      isContradicted |= known_ && *known_ != record.image.fingerprint;
      known_ = record.image.fingerprint;
    }
    if (isContradicted) known_.reset();
  }

  /// Empty when it is unknown.
  const std::string& Get() {
    if (!known_) known_ = image_.stamp && image_.fingerprint ? image_.fingerprint() : std::string();
    return *known_;
  }

 private:
  const ObservedImage& image_;
  std::optional<std::string> known_;
};

/// What is true of one level; nothing where it is unknown.
struct Proof {
  std::optional<bool> hasInputs;   ///< those of its record
  std::optional<bool> hasImage;    ///< the data that it was computed from
  std::optional<bool> hasContent;  ///< its own stored bytes
  StaleReason difference = StaleReason::kNone;
};

void CompareInputs(const LevelRecord& record, const ObservedImage& image, Proof& proof) {
  if (record.version < 2 || !image.inputs) return;
  proof.difference = DifferenceOf(record.inputs, *image.inputs);
  proof.hasInputs = proof.difference == StaleReason::kNone;
}

void CompareImage(const LevelRecord& record, FingerprintNow& now, Proof& proof) {
  if (!Remembers(record) || now.Get().empty()) return;
  proof.hasImage = record.image.fingerprint == now.Get();
  if (!*proof.hasImage) proof.difference = StaleReason::kImageData;
}

void CompareContent(const LevelRecord& record, const ObservedLevel& level, Proof& proof) {
  const ContentRecord& content = record.content;
  if (record.version < 2 || content.IsBlank() || !HasValidChannel(record)) return;
  if (!level.table.empty() && level.table != content.table) {
    proof.hasContent = false;
    return;
  }
  if (level.holder && !level.table.empty() && !content.holder.IsBlank() &&
      *level.holder == content.holder) {
    proof.hasContent = true;
    return;
  }
  const std::string bytes = level.bytes ? level.bytes() : std::string();
  if (!bytes.empty()) proof.hasContent = bytes == content.bytes;
}

bool AreStampsOld(const LevelRecord& record, const ObservedImage& image,
                  const ObservedLevel& level) {
  return !image.stamp || !IsUnchanged(record.image.stamp, *image.stamp) || !level.holder ||
         *level.holder != record.content.holder;
}

Freshness Conclude(const LevelRecord& record, const Proof& proof) {
  if (proof.difference != StaleReason::kNone) return {LevelStatus::kStale, proof.difference};
  if (proof.hasContent == false) return {LevelStatus::kChanged};
  if (!IsFinished(record)) return {LevelStatus::kUnfinished};
  const bool isProved = proof.hasInputs && proof.hasImage && proof.hasContent;
  return {isProved ? LevelStatus::kCurrent : LevelStatus::kUnverified};
}

/// Asks in the order of the cost: nothing is read of a level that is known to be stale.
Freshness CheckOne(const LevelRecord& record, const ObservedImage& image,
                   const ObservedLevel& level, FingerprintNow& now) {
  if (record.version == 0) return {};
  Proof proof;
  CompareInputs(record, image, proof);
  if (proof.difference == StaleReason::kNone) CompareImage(record, now, proof);
  if (proof.difference == StaleReason::kNone) CompareContent(record, level, proof);
  Freshness answer = Conclude(record, proof);
  answer.isStampOld = answer.status == LevelStatus::kCurrent && AreStampsOld(record, image, level);
  return answer;
}

bool IsLost(const Freshness& answer) {
  return answer.status == LevelStatus::kStale || answer.status == LevelStatus::kChanged;
}

/// Whether nothing that is there can be the level that `level` was computed from.
bool HasLostItsSource(const Provenance& level, const std::vector<Provenance>& levels,
                      const std::vector<Freshness>& answers) {
  if (level.sourceLevel < 2 || level.sourceBytes.empty()) return false;
  bool isThere = false;
  for (size_t i = 0; i < levels.size(); ++i) {
    if (levels[i].level != level.sourceLevel) continue;
    isThere = true;
    if (levels[i].bytes == level.sourceBytes && !IsLost(answers[i])) return false;
  }
  return isThere;
}

}  // namespace

std::vector<Freshness> CheckFreshness(const std::vector<LevelRecord>& records,
                                      const ObservedImage& image,
                                      const std::vector<ObservedLevel>& levels) {
  assert(records.size() == levels.size());
  FingerprintNow now(records, image);
  std::vector<Freshness> answers;
  for (size_t i = 0; i < records.size(); ++i)
    answers.push_back(CheckOne(records[i], image, levels[i], now));
  return answers;
}

void CheckSources(const std::vector<Provenance>& levels, std::vector<Freshness>& answers) {
  assert(levels.size() == answers.size());
  std::vector<size_t> order(levels.size());
  for (size_t i = 0; i < order.size(); ++i) order[i] = i;
  std::stable_sort(order.begin(), order.end(),
                   [&](size_t a, size_t b) { return levels[a].level < levels[b].level; });
  for (const size_t i : order)  // sources come first: they are larger
    if (!IsLost(answers[i]) && HasLostItsSource(levels[i], levels, answers))
      answers[i] = {LevelStatus::kStale, StaleReason::kSourceRebuilt};
}

}  // namespace orin::model
