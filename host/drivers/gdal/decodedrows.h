/// Decoded rows of an image, kept for the other channels.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <vector>

namespace orin::drivers {

/// Many codecs decode all channels of a pixel together, while levels are computed channel by
/// channel: images that fit are decoded once and kept. Shared by readers in several threads.
class DecodedRows {
 public:
  using Bytes = std::shared_ptr<const std::vector<uint8_t>>;
  /// Fills `to` with whole rows, all channels of a pixel side by side.
  using Decode = std::function<void(unsigned firstRow, unsigned rows, uint8_t* to)>;

  /// Bytes of decoded pixels that are kept at most: larger images are not kept at all.
  static constexpr uint64_t kMostBytes = uint64_t{128} << 20;

  /// \param bandRows  rows that are decoded together
  DecodedRows(unsigned width, unsigned height, uint64_t pixelBytes, unsigned bandRows);

  unsigned BandRows() const { return bandRows_; }
  uint64_t RowBytes() const { return rowBytes_; }
  /// The rows from `number` x BandRows() on, the last band being shorter perhaps.
  /// \throws what `decode` throws; nothing is kept then
  Bytes Band(unsigned number, const Decode& decode);

 private:
  unsigned height_;
  unsigned bandRows_;
  uint64_t rowBytes_;
  std::mutex mutex_;
  std::vector<Bytes> bands_;
};

}  // namespace orin::drivers
