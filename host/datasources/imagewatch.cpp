// SPDX-License-Identifier: MIT
#include "host/datasources/imagewatch.h"

#include <algorithm>
#include <charconv>
#include <system_error>

#include "host/datasources/filestate.h"
#include "host/datasources/fingerprint.h"

namespace orin::datasources {
namespace {

constexpr char kExternalMask[] = ".msk";
constexpr size_t kMostKnown = 64;

using Entries = std::vector<std::pair<ImageStamp, std::string>>;

std::optional<std::string> Find(const Entries& entries, const ImageStamp& stamp) {
  const auto found = std::find_if(entries.rbegin(), entries.rend(),
                                  [&](const auto& entry) { return entry.first == stamp; });
  return found == entries.rend() ? std::nullopt : std::optional(found->second);
}

/// What was computed in this process, so that opening an image again computes nothing again.
class Computed {
 public:
  static Computed& Instance() {
    static Computed computed;
    return computed;
  }
  std::optional<std::string> Find(const std::string& file, const ImageStamp& stamp) {
    const std::lock_guard lock(mutex_);
    for (const Entry& entry : entries_)
      if (entry.file == file && entry.stamp == stamp) return entry.fingerprint;
    return std::nullopt;
  }
  void Add(const std::string& file, const ImageStamp& stamp, const std::string& fingerprint) {
    const std::lock_guard lock(mutex_);
    if (entries_.size() >= kMostKnown) entries_.erase(entries_.begin());
    entries_.push_back({file, stamp, fingerprint});
  }

 private:
  struct Entry {
    std::string file;
    ImageStamp stamp;
    std::string fingerprint;
  };
  std::mutex mutex_;
  std::vector<Entry> entries_;
};

/// How much of what other files show goes into their digest.
enum class Detail { kSizeAndTime, kAll };

uint64_t DigestOf(const std::vector<std::string>& files, Detail detail) {
  Fingerprinter digest;
  bool isAny = false;
  for (size_t i = 0; i < files.size(); ++i) {
    const auto state = StateOf(files[i]);
    if (!state) continue;
    isAny = true;
    digest.AddNumber(i);
    digest.AddNumber(state->bytes);
    digest.AddNumber(static_cast<uint64_t>(state->modified));
    if (detail == Detail::kSizeAndTime) continue;
    digest.AddNumber(static_cast<uint64_t>(state->changed));
    digest.AddNumber(state->inode);
  }
  if (!isAny) return 0;
  const std::string text = digest.Text();
  uint64_t number = 0;
  std::from_chars(text.data(), text.data() + 16, number, 16);
  return number;
}

}  // namespace

ImageWatch::ImageWatch(std::string file, Computation computation,
                       std::vector<std::string> companions)
    : file_(std::move(file)),
      computation_(std::move(computation)),
      companions_(std::move(companions)) {
  companions_.insert(companions_.begin(), file_ + kExternalMask);
  if (!computation_)
    computation_ = [path = file_](const std::stop_token& stop) {
      return FingerprintOfFile(path, stop);
    };
}

ImageWatch::~ImageWatch() = default;

std::optional<ImageStamp> ImageWatch::Stamp() const {
  const auto state = StateOf(file_);
  if (!state) return std::nullopt;
  return ImageStamp{state->bytes, state->modified, DigestOf(companions_, Detail::kSizeAndTime), 0,
                    0};
}

std::optional<ImageStamp> ImageWatch::FullStamp() const {
  const auto state = StateOf(file_);
  if (!state) return std::nullopt;
  return ImageStamp{state->bytes, state->modified, DigestOf(companions_, Detail::kAll),
                    state->changed, state->inode};
}

std::optional<ImageStamp> ImageWatch::SettledStamp() const {
  SettledStateOf(file_);
  for (const std::string& companion : companions_) SettledStateOf(companion);
  return FullStamp();
}

std::optional<std::string> ImageWatch::Known(const ImageStamp& stamp) const {
  {
    const std::lock_guard lock(mutex_);
    if (auto known = Find(known_, stamp)) return known;
  }
  return Computed::Instance().Find(file_, stamp);
}

void ImageWatch::Learn(const ImageStamp& stamp, const std::string& fingerprint) {
  const std::lock_guard lock(mutex_);
  if (known_.size() >= kMostKnown) known_.erase(known_.begin());
  known_.emplace_back(stamp, fingerprint);
}

/// Empty when it fails: then nothing can be told, which is no reason to refuse anything.
std::string ImageWatch::Compute(const std::stop_token& stop) const {
  try {
    const std::string mask = companions_.front();
    std::string fingerprint = computation_(stop);
    if (fingerprint.empty() || !StateOf(mask)) return fingerprint;
    Fingerprinter both;
    both.AddText(fingerprint);
    both.AddText(FingerprintOfFile(mask, stop));
    return stop.stop_requested() ? "" : both.Text();
  } catch (...) {
    return {};
  }
}

void ImageWatch::Start(const ImageStamp& stamp) {
  if (Known(stamp)) return;
  const std::lock_guard lock(mutex_);
  if (computing_ == stamp) return;
  worker_ = {};  // an older one is of no use any more
  std::promise<std::string> promise;
  result_ = promise.get_future().share();
  computing_ = stamp;
  try {
    worker_ =
        std::jthread([this, promise = std::move(promise)](const std::stop_token& stop) mutable {
          promise.set_value(Compute(stop));
        });
  } catch (const std::system_error&) {
    computing_.reset();  // without a thread it is computed when it is asked for
  }
}

std::string ImageWatch::Fingerprint(const ImageStamp& stamp) {
  if (auto known = Known(stamp)) return *known;
  std::shared_future<std::string> running;
  {
    const std::lock_guard lock(mutex_);
    if (computing_ == stamp) running = result_;
  }
  const std::string fingerprint = running.valid() ? running.get() : Compute({});
  Learn(stamp, fingerprint);
  if (!fingerprint.empty()) Computed::Instance().Add(file_, stamp, fingerprint);
  return fingerprint;
}

}  // namespace orin::datasources
