/// Tells whether an image still holds the data that its levels were computed from.
// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <future>
#include <mutex>
#include <optional>
#include <stop_token>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "host/datasources/imagerecord.h"

namespace orin::datasources {

/// Computes the fingerprint of an image at most once for each state that the file system shows of
/// its files. Operations may be called from several threads.
class ImageWatch {
 public:
  /// Of the image's stored data, without its external mask; `stop` asks it to give up, with any
  /// result. May throw, and runs in a thread of its own.
  using Computation = std::function<std::string(const std::stop_token& stop)>;

  /// \param file         the image's own file; where it is none of the file system, nothing can be
  ///                     told of it
  /// \param computation  none: the fingerprint of the file's bytes
  /// \param companions   other files that its pixels come from. `FILE.msk`, the external mask, is
  ///                     always one of them
  explicit ImageWatch(std::string file, Computation computation = {},
                      std::vector<std::string> companions = {});
  ~ImageWatch();
  ImageWatch(const ImageWatch&) = delete;
  ImageWatch& operator=(const ImageWatch&) = delete;

  const std::string& File() const { return file_; }
  /// What the file system shows now, sizes and modification times; none when the image is no
  /// regular file.
  std::optional<ImageStamp> Stamp() const;
  /// The same with status change times and numbers of files.
  std::optional<ImageStamp> FullStamp() const;
  /// The full stamp, of which no later write leaves all as it is; see filestate.h for the
  /// exception. May wait for the disk.
  std::optional<ImageStamp> SettledStamp() const;

  /// The fingerprint of the image as it was at `stamp`, as far as that is known already. An empty
  /// one: it was tried and could not be computed.
  std::optional<std::string> Known(const ImageStamp& stamp) const;
  void Learn(const ImageStamp& stamp, const std::string& fingerprint);

  /// Begins to compute it in the background, unless it is known or being computed.
  /// \param stamp  of now
  void Start(const ImageStamp& stamp);
  /// The fingerprint: known, waited for, or computed now from what the files hold now. Empty when
  /// it cannot be computed.
  std::string Fingerprint(const ImageStamp& stamp);
  /// The fingerprint computed now, whatever is known. Empty when it cannot be computed.
  std::string Again() const { return Compute({}); }

 private:
  std::string Compute(const std::stop_token& stop) const;

  std::string file_;
  Computation computation_;
  std::vector<std::string> companions_;

  mutable std::mutex mutex_;
  std::vector<std::pair<ImageStamp, std::string>> known_;
  std::optional<ImageStamp> computing_;  ///< what the worker computes, or has computed
  std::shared_future<std::string> result_;
  std::jthread worker_;  // last: it uses the others
};

}  // namespace orin::datasources
