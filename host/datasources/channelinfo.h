/// What is known of one channel.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/datatype.h"

namespace orin::datasources {

class IChannelInfo {
 public:
  virtual ~IChannelInfo() = default;
  /// Bits, signedness and complexness of the channel's samples; lives as long as this object.
  virtual const gobs::DataType& GetDataType() const = 0;
};

}  // namespace orin::datasources
