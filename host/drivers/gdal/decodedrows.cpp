// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/decodedrows.h"

#include <algorithm>

namespace orin::drivers {

DecodedRows::DecodedRows(unsigned width, unsigned height, uint64_t pixelBytes, unsigned bandRows)
    : height_(height),
      bandRows_(std::clamp(bandRows, 1u, std::max(height, 1u))),
      rowBytes_(width * pixelBytes),
      bands_((height + bandRows_ - 1) / bandRows_) {}

DecodedRows::Bytes DecodedRows::Band(unsigned number, const Decode& decode) {
  {
    const std::lock_guard lock(mutex_);
    if (bands_.at(number)) return bands_[number];
  }
  // Not under the lock: two readers that want the same band at once both decode it, in parallel.
  const unsigned first = number * bandRows_;
  const unsigned rows = std::min(bandRows_, height_ - first);
  auto bytes = std::make_shared<std::vector<uint8_t>>(rows * rowBytes_);
  decode(first, rows, bytes->data());
  const std::lock_guard lock(mutex_);
  return bands_[number] = std::move(bytes);
}

}  // namespace orin::drivers
