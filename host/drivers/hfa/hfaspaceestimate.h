/// Looks, before a level is made, whether an ERDAS Imagine file and its file system can take it.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "host/datasources/levelroom.h"
#include "host/datasources/levelstore.h"
#include "host/drivers/hfa/hfacatalogue.h"

namespace orin::drivers {

/// A file that grows beyond it would go on in a second one; bytes.
inline constexpr uint64_t kMaxHfaBytes = 2'000'000'000;

class HfaSpaceEstimate {
 public:
  /// All of them outlive the estimate.
  HfaSpaceEstimate(const std::string& path, const datasources::IRasterSource& image,
                   const HfaCatalogue& catalogue)
      : path_(path), image_(image), catalogue_(catalogue) {}

  /// What it takes to make `levels` for `channels`. A stored level counts like a new one: the old
  /// pixels keep their room until the store goes.
  datasources::LevelRoom For(const std::vector<unsigned>& levels,
                             const std::vector<unsigned>& channels) const;

 private:
  uint64_t MaxBytesOf(unsigned level, unsigned channel) const;
  uint64_t ExpectedBytesOf(unsigned level, unsigned channel) const;
  uint64_t TreeBytesOf(const std::vector<unsigned>& levels,
                       const std::vector<unsigned>& channels) const;

  const std::string& path_;
  const datasources::IRasterSource& image_;
  const HfaCatalogue& catalogue_;
};

}  // namespace orin::drivers
