/// One block of pixels with a margin on every side: geometry, buffer, and typed access.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>

#include "basic/gobs/bufferlayout.h"
#include "basic/gobs/datatype.h"
#include "basic/gobs/outofmemory.h"
#include "basic/gobs/processwindow.h"

namespace orin::gobs {

class Mask;

/// Describes a block without owning pixels.
class RasterInfo {
 public:
  RasterInfo() = default;
  RasterInfo(uint32_t width_, uint32_t height_, uint32_t channelCount_, const DataType& dataType_)
      : width(width_), height(height_), channelCount(channelCount_), dataType(dataType_) {}
  RasterInfo(const RasterInfo&) = default;
  RasterInfo& operator=(const RasterInfo&) = default;
  virtual ~RasterInfo() = default;

  uint32_t width = 0;         ///< pixels per line of the useful area
  uint32_t height = 0;        ///< lines of the useful area
  uint32_t channelCount = 0;  ///< channels interleaved in every pixel
  DataType dataType;          ///< of one component
};

/// Where the useful area lies in the buffer.
struct RasterContext {
  uint32_t marginX = 0;      ///< pixels on the left, and again on the right
  uint32_t marginY = 0;      ///< lines at the top, and again at the bottom
  uint32_t x = 0;            ///< position of the block in its raster, as its window gave it;
  uint32_t y = 0;            ///< kept for readers and writers, no kernel reads it
  uint32_t stride = 0;       ///< pixels per buffer line: width + 2 marginX
  uint32_t bufferLines = 0;  ///< height + 2 marginY
  uint8_t* data = nullptr;   ///< buffer line 0, buffer column 0: the margin's top-left corner
  uint32_t byteSize = 0;
  bool ownsData = false;
};

/// A block with its pixels: channel-interleaved, native byte order, a complex sample's real
/// component before its imaginary one.
class Raster : public RasterInfo, public RasterContext, public ThrowsOutOfMemory {
 public:
  /// Allocates the buffer; its pixels are not initialised.
  /// \throws orin::OutOfMemory
  /// \throws orin::DataException  the block would take 4 GiB or more
  Raster(const RasterInfo& info, const parallelio::ProcessWindow& window);
  /// Looks at a buffer of the caller's, which must hold what the other constructor would allocate
  /// and must outlive the block.
  /// \throws orin::DataException  the block would take 4 GiB or more
  Raster(const RasterInfo& info, const parallelio::ProcessWindow& window, uint8_t* buffer);
  ~Raster() override;
  Raster(const Raster&) = delete;
  Raster& operator=(const Raster&) = delete;

  /// The margin quadruple that the block was made with.
  parallelio::ProcessWindow Window() const { return {marginX, marginY, x, y}; }

  /// What is known of the pixels beside their values, geometry of the block: in a block that was
  /// read, the masks and the alpha channel of its raster; in one that was computed, where the
  /// method put data. Null when nothing is known. Kernels go by the mask that they are given; ours
  /// keep the validity of what they compute where the source block carries one.
  std::unique_ptr<Mask> validity;
};

/// Bytes between neighbouring pixels of a line. Not for the bit type.
inline uint64_t PixelBytes(const RasterInfo& info) {
  return uint64_t{BytesPerComponent(info.dataType)} * ComponentsPerSample(info.dataType) *
         info.channelCount;
}

/// Address of channel 0 of the pixel (x, y) of the useful area; the margin is in reach.
inline uint8_t* PixelAddress(const Raster& raster, int64_t x, int64_t y) {
  const uint64_t bits =
      uint64_t{ComponentsPerSample(raster.dataType)} * raster.dataType.bits * raster.channelCount;
  return raster.data + LayoutOf(raster).Index(x, y) * bits / 8;
}

/// Typed access to a block's pixels. Does not own them.
template <class T>
struct PixelView {
  T* data;
  BufferLayout layout;
  uint64_t components;  ///< values of T per pixel

  /// Channel 0 of the pixel (x, y) of the useful area; the margin is in reach.
  T* At(int64_t x, int64_t y) const { return data + layout.Index(x, y) * components; }
};

/// \param componentsPerSample  2 when the caller treats the samples as complex, else 1
template <class T>
PixelView<T> ViewOf(const Raster& raster, uint32_t componentsPerSample) {
  return {reinterpret_cast<T*>(raster.data), LayoutOf(raster),
          uint64_t{raster.channelCount} * componentsPerSample};
}

}  // namespace orin::gobs
