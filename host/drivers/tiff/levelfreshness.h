/// Which levels of a file match the image that they were computed from.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/datasources/imagewatch.h"
#include "host/datasources/overviewinfo.h"
#include "host/drivers/tiff/leveldirectories.h"
#include "host/drivers/tiff/levelfile.h"

namespace orin::drivers {

/// Compares what levels remember with the image. Levels of which size and time agree are taken as
/// current at once; for others the image is read, once for each state that it shows.
///
/// Writing levels into the image's own file changes its size and time. From the first such write to
/// the last the file counts as it was before.
class LevelFreshness {
 public:
  /// \param isInImage  the levels stand in the image's own file
  LevelFreshness(std::shared_ptr<datasources::ImageWatch> watch, bool isInImage)
      : watch_(std::move(watch)), isInImage_(isInImage) {}

  bool IsInImage() const { return isInImage_; }

  struct Judgement {
    std::vector<datasources::LevelStatus> statuses;  ///< one a level
    std::vector<size_t> outdated;                    ///< current, but with another size or time
    std::optional<datasources::ImageStamp> now;
  };
  Judgement Judge(const std::vector<StoredLevel>& levels);

  /// What the image shows now; while levels are written into it, what it showed before.
  std::optional<datasources::ImageStamp> Now() const;
  /// The first change to the file that holds `levels` comes next.
  void BeginChange(const std::vector<StoredLevel>& levels);
  bool IsChanging() const { return isChanging_; }
  /// Somebody else may have changed the image since the changes began: what it was tells nothing.
  void Doubt() { before_.reset(); }
  /// All is written. \param now  what the image shows after that, when it is known
  void EndChange(const std::optional<datasources::ImageStamp>& now);

  /// Computes the fingerprint in the background, unless it is known.
  /// \param start  when the computation of a level began
  void Prepare(const std::optional<datasources::ImageStamp>& start);
  /// What a level that was computed from the image remembers; blank when nothing can be told.
  /// \param wasTouched  somebody else may have written to the image's file since then, while levels
  ///                    were written into it
  /// \throws orin::Exception  another program has changed the image since `start`
  datasources::ImageRecord RecordSince(const std::optional<datasources::ImageStamp>& start,
                                       bool wasTouched);
  /// The fingerprint of `Now()`, if it is known without reading; else empty.
  std::string KnownFingerprint() const;

 private:
  void Trust(const std::vector<StoredLevel>& levels, const datasources::ImageStamp& now);
  std::string FingerprintFor(const std::vector<StoredLevel>& levels,
                             const datasources::ImageStamp& now);

  std::shared_ptr<datasources::ImageWatch> watch_;
  bool isInImage_;
  bool isChanging_ = false;
  bool wasKnown_ = false;                          ///< the fingerprint, when the changes began
  std::optional<datasources::ImageStamp> before_;  ///< of the image, when the changes began
};

/// Writes `stamp` over what the levels remember, as long as they stand where they stood; the time
/// of a file that is the image itself stays what it is. Fails quietly: then the next answer
/// reads the image again.
void RestampLevels(const LevelFile& levelFile, const std::vector<const StoredLevel*>& levels,
                   const datasources::ImageStamp& stamp, bool isInImage) noexcept;

/// Where in the file the part of a level's record stands that is its stamp.
uint64_t StampPosition(const StoredLevel& level);

}  // namespace orin::drivers
