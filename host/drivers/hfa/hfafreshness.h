/// How levels in an ERDAS Imagine file stand to its image, which other programs may have changed.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "host/datasources/imagewatch.h"
#include "host/datasources/overviewinfo.h"
#include "host/drivers/common/positionedfile.h"
#include "host/drivers/hfa/hfacatalogue.h"

namespace orin::drivers {

/// Levels stand in the image's own file: what we write there must not pass for a change of the
/// image. Not for several threads at a time.
class HfaFreshness {
 public:
  /// \param watch  of the image; null when nothing can be told
  explicit HfaFreshness(std::shared_ptr<datasources::ImageWatch> watch);

  /// Of the image; reads it where its time has changed. Empty when it cannot be told, or when no
  /// level remembers one.
  std::string Fingerprint(const HfaCatalogue& catalogue) const;
  /// \param fingerprint  of the image now; empty when it is unknown
  static datasources::LevelStatus StatusOf(const HfaRecord* record, bool isFinished,
                                           const std::string& fingerprint);

  /// The first change of the file comes next. The image's fingerprint is computed meanwhile.
  void BeginChange(const HfaCatalogue& catalogue);
  /// What a level remembers that is computed from the image as it was when the changes began; waits
  /// for the fingerprint. Blank when it is unknown.
  datasources::ImageRecord ImageBefore() const;
  /// The last step of every change: levels that were computed from the data that the image holds
  /// learn the size and time that the file has from then on. \returns whether records changed
  bool CommitStamps(const HfaCatalogue& catalogue, PositionedFile& file);
  /// Has levels remember how the image looks now, where it had to be read to know it: that is to
  /// say, `stamp`, with which it has `fingerprint`.
  void UpdateStamps(const HfaCatalogue& catalogue, const std::string& fingerprint,
                    const datasources::ImageStamp& stamp, PositionedFile& file) const;
  /// What the image shows now; while levels are written into its file, what it showed before.
  std::optional<datasources::ImageStamp> Now() const;
  bool IsChanging() const { return isChanging_; }

 private:
  void Trust(const HfaCatalogue& catalogue, const datasources::ImageStamp& now) const;

  std::shared_ptr<datasources::ImageWatch> watch_;
  bool isChanging_ = false;  ///< from the first write into the file to the last
  std::optional<datasources::ImageStamp> before_;  ///< of the image, when the changes began
};

}  // namespace orin::drivers
