/// What a reader knows of its pixels beside their values: facts, not metadata that a user may
/// write.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <vector>

#include "host/model/nodata.h"

namespace orin::model {

struct ChannelFacts {
  std::optional<NoData> noData;  ///< the channel's own declaration; goes before the file's
  bool isAlpha = false;          ///< opacity: no part of what a no-data value is compared with
};

struct SourceFacts {
  std::optional<NoData> noData;  ///< declared for the file
  /// The file's value only fills what is no data for other reasons: no pixel is for being equal.
  bool noDataIsFill = false;
  bool carriesValidity = false;        ///< blocks come with the validity of their pixels
  std::vector<ChannelFacts> channels;  ///< in the order of the reader's channels

  /// The channel's own declaration. \param channel  1-based
  const std::optional<NoData>& OfChannel(unsigned channel) const {
    static const std::optional<NoData> none;
    return channel < 1 || channel > channels.size() ? none : channels[channel - 1].noData;
  }
  /// The first that is declared: the file's, then that of the reader's first channel.
  const std::optional<NoData>& First() const { return noData ? noData : OfChannel(1); }
};

}  // namespace orin::model
