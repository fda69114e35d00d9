/// Rasters and masks for tests: drawn as pictures or given by size, guards round every buffer.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <vector>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"
#include "tests/testing/guardedbuffer.h"

namespace orin::testing {

/// Size of a block and of the margin that lies on each of its sides, in pixels.
struct Geometry {
  uint32_t width = 0, height = 0;
  uint32_t marginX = 0, marginY = 0;

  uint32_t Columns() const { return width + 2 * marginX; }
  uint32_t Lines() const { return height + 2 * marginY; }
  size_t BufferPixels() const { return size_t{Columns()} * Lines(); }
};

/// A raster of T that looks at a guarded buffer. New ones are filled with `kUnwritten` bytes.
template <class T>
class TestRaster {
 public:
  static constexpr uint8_t kUnwritten = 0xAB;

  explicit TestRaster(const Geometry& g, uint32_t channels = 1, bool isComplex = false)
      : geometry_(g),
        valuesPerPixel_(channels * (isComplex ? 2 : 1)),
        buffer_(std::make_unique<GuardedBuffer>(g.BufferPixels() * valuesPerPixel_ * sizeof(T))) {
    std::fill_n(buffer_->Data(), buffer_->Size(), kUnwritten);
    const gobs::RasterInfo info(g.width, g.height, channels, gobs::DataTypeOf<T>(isComplex));
    const parallelio::ProcessWindow window{g.marginX, g.marginY, 0, 0};
    raster_ = std::make_unique<gobs::Raster>(info, window, buffer_->Data());
  }

  gobs::Raster* Get() { return raster_.get(); }
  const Geometry& Size() const { return geometry_; }
  uint32_t ValuesPerPixel() const { return valuesPerPixel_; }
  /// The whole buffer, the margin's top-left corner first.
  T* Values() { return reinterpret_cast<T*>(buffer_->Data()); }
  size_t ValueCount() const { return buffer_->Size() / sizeof(T); }
  /// Component k of the pixel (x, y) of the useful area; the margin is in reach.
  T& At(int64_t x, int64_t y, uint32_t k = 0) {
    const int64_t line = y + geometry_.marginY;
    return Values()[(line * geometry_.Columns() + x + geometry_.marginX) * valuesPerPixel_ + k];
  }
  bool GuardsIntact() { return buffer_->GuardsIntact(); }

 private:
  Geometry geometry_;
  uint32_t valuesPerPixel_;
  std::unique_ptr<GuardedBuffer> buffer_;  // before the raster that looks at it
  std::unique_ptr<gobs::Raster> raster_;
};

template <class T>
using Rows = std::vector<std::vector<T>>;

/// The one-channel raster that `rows` draws, the margin included in the drawing.
/// \param marginX,marginY  how much of the drawing, on each side, is margin
template <class T>
TestRaster<T> RasterOf(const Rows<T>& rows, uint32_t marginX = 0, uint32_t marginY = 0) {
  const auto columns = static_cast<uint32_t>(rows.at(0).size());
  const auto lines = static_cast<uint32_t>(rows.size());
  TestRaster<T> raster({columns - 2 * marginX, lines - 2 * marginY, marginX, marginY});
  T* to = raster.Values();
  for (const std::vector<T>& row : rows) to = std::copy_n(row.begin(), columns, to);
  return raster;
}

/// A mask with its bits as bytes of the test's own, so that twins need not ask the mask.
class TestMask {
 public:
  /// \param bytes  one bit a buffer pixel, the top bit of a byte first, lines not padded
  TestMask(const Geometry& g, std::vector<uint8_t> bytes)
      : geometry_(g),
        bytes_(std::move(bytes)),
        buffer_(std::make_unique<GuardedBuffer>(bytes_.size())),
        mask_(std::make_unique<gobs::Mask>(g.width, g.height,
                                           parallelio::ProcessWindow{g.marginX, g.marginY, 0, 0})) {
    std::copy(bytes_.begin(), bytes_.end(), buffer_->Data());
    mask_->begin = buffer_->Data();
    mask_->end = buffer_->Data() + buffer_->Size();
  }

  static size_t BytesFor(const Geometry& g) { return (g.BufferPixels() + 7) / 8; }

  gobs::Mask* Get() { return mask_.get(); }
  const uint8_t* Bytes() const { return bytes_.data(); }
  /// Whether the mask still holds the bits that it was made with.
  bool Untouched() {
    return std::equal(bytes_.begin(), bytes_.end(), buffer_->Data()) && buffer_->GuardsIntact();
  }

 private:
  Geometry geometry_;
  std::vector<uint8_t> bytes_;
  std::unique_ptr<GuardedBuffer> buffer_;
  std::unique_ptr<gobs::Mask> mask_;
};

/// The mask that `rows` draws, 1 valid and 0 no data, the margin included in the drawing.
inline TestMask MaskOf(const Rows<int>& rows, uint32_t marginX = 0, uint32_t marginY = 0) {
  const auto columns = static_cast<uint32_t>(rows.at(0).size());
  const auto lines = static_cast<uint32_t>(rows.size());
  const Geometry g{columns - 2 * marginX, lines - 2 * marginY, marginX, marginY};
  std::vector<uint8_t> bytes(TestMask::BytesFor(g));
  size_t pixel = 0;
  for (const std::vector<int>& row : rows) {
    for (const int valid : row) {
      if (valid != 0) bytes[pixel / 8] |= static_cast<uint8_t>(128 >> (pixel % 8));
      ++pixel;
    }
  }
  return TestMask(g, std::move(bytes));
}

}  // namespace orin::testing
