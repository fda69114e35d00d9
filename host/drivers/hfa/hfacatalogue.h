/// Everything that an ERDAS Imagine file tells of its levels.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <functional>
#include <map>
#include <set>
#include <string>

#include "host/datasources/levelstore.h"
#include "host/drivers/hfa/hfarecord.h"
#include "host/drivers/hfa/hfatree.h"

namespace orin::drivers {

/// Channels are 1-based. A level is stored for a channel where the tree leads to it, and other
/// programs see it; it is pending where it waits for other channels.
struct HfaCatalogue {
  HfaPyramid pyramid = {};
  std::map<unsigned, HfaRecord> records = {};  ///< of stored levels
  std::map<unsigned, HfaPendingLevel> pending = {};

  std::set<unsigned> Levels() const;
  bool IsStored(unsigned channel, unsigned level) const {
    return pyramid.Find(channel, level) >= 0;
  }
  bool IsPending(unsigned channel, unsigned level) const;
  /// What describes the level: of channels that wait, if there are any. Null for another program's.
  const HfaRecord* RecordOf(unsigned level) const;
  /// Whether the channel is finished, and is what `RecordOf` describes.
  bool IsValid(unsigned channel, unsigned level) const;
  /// Has `change` change all records.
  void ChangeRecords(const std::function<void(HfaRecord&)>& change);
};

/// Whether builds make levels for a channel: bits of a mask get none, unless there is nothing else.
bool GetsHfaLevels(const datasources::IRasterSource& image, unsigned channel);

/// \param channels  of the image
/// \throws orin::Exception  the file's tree cannot be read
HfaCatalogue ReadHfaCatalogue(const std::string& path, size_t channels);

}  // namespace orin::drivers
