// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/stampcommit.h"

#include <algorithm>

#include "host/datasources/filestate.h"
#include "host/drivers/tiff/levelcontents.h"

namespace orin::drivers {

using model::FileStamp;
using model::ImageStamp;

namespace {

std::optional<FileStamp> StampOf(const std::string& path) {
  const auto state = datasources::StateOf(path);
  return state ? std::optional(FileStamp{state->bytes, state->modified}) : std::nullopt;
}

}  // namespace

void StampCommit::Add(const StoredLevel& level) {
  const bool hasPlaces = level.imagePosition != 0 && level.contentPosition != 0;
  const bool isRecorded = !level.metadata.image.IsBlank() && !level.metadata.content.IsBlank();
  if (hasPlaces && isRecorded) levels_.push_back(level);
}

/// Nothing was written since the stamps that stand there.
bool StampCommit::AreAllCommitted(const std::optional<ImageStamp>& image,
                                  uint64_t companions) const {
  const auto now = StampOf(file_.Path());
  if (!now) return false;
  const ImageStamp wanted = image.value_or(ImageStamp{now->bytes, now->modified, companions, 0, 0});
  return std::all_of(levels_.begin(), levels_.end(), [&](const StoredLevel& level) {
    return level.metadata.image.stamp == wanted && level.metadata.content.holder == *now;
  });
}

void StampCommit::Overwrite(uint64_t position, const std::string& text) {
  file_.Write(position, text.data(), text.size());
}

void StampCommit::WriteStamps(const ImageStamp& image, const FileStamp& holder) {
  for (const StoredLevel& level : levels_) {
    Overwrite(level.imagePosition,
              model::TextOf(model::ImageRecord{level.metadata.image.fingerprint, image}));
    model::ContentRecord content = level.metadata.content;
    content.holder = holder;
    Overwrite(level.contentPosition, model::TextOf(content));
  }
}

/// \returns the time that the file has then: one that no later write can give it
int64_t StampCommit::SetTime(int64_t modified) {
  constexpr int64_t kSecond = 1000000000;
  const int64_t set = file_.SetModified(modified);
  const bool countsSeconds = set != modified && set % kSecond == 0;
  return countsSeconds ? file_.SetModified(set - 2 * kSecond) : set;
}

bool StampCommit::AreLevelsWhole() const {
  return std::all_of(levels_.begin(), levels_.end(), [&](const StoredLevel& level) {
    return BytesDigestOf(file_, structure_, level) == level.metadata.content.bytes;
  });
}

bool StampCommit::Run(const std::optional<ImageStamp>& image, uint64_t companions, int64_t modified,
                      const std::function<bool()>& holds) {
  if (levels_.empty() || AreAllCommitted(image, companions)) return !levels_.empty();
  const FileStamp holder{file_.Size(), SetTime(modified)};
  WriteStamps(image.value_or(ImageStamp{holder.bytes, holder.modified, companions, 0, 0}), holder);
  file_.Sync();
  file_.SetModified(holder.modified);
  if (AreLevelsWhole() && holds() && StampOf(file_.Path()) == holder) return true;
  WriteStamps({}, {});
  file_.SetModified(modified);
  return false;
}

}  // namespace orin::drivers
