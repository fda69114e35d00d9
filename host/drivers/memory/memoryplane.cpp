// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memoryplane.h"

#include <algorithm>
#include <cstring>

#include "basic/core/typedispatch/pixeltypes.h"
#include "host/datasources/rasterreader.h"

namespace orin::drivers {
namespace {

/// One complex sample moves as a whole.
template <class T>
struct Pair {
  T real;
  T imaginary;
};

/// Calls `body(std::type_identity<Sample>{})` for a type of the size of one sample.
template <class Body>
void WithSample(const gobs::DataType& type, Body&& body) {
  typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    if (type.isComplex) body(std::type_identity<Pair<T>>{});
    else body(std::type_identity<T>{});
  });
}

template <class Sample>
void ReadRow(const Sample* from, uint64_t step, Sample* to, int64_t count) {
  if (step == 1) std::copy_n(from, count, to);
  else
    for (int64_t i = 0; i < count; ++i) to[static_cast<uint64_t>(i) * step] = from[i];
}

template <class Sample>
void WriteRow(const Sample* from, uint64_t step, Sample* to, int64_t count) {
  if (step == 1) std::copy_n(from, count, to);
  else
    for (int64_t i = 0; i < count; ++i) to[i] = from[static_cast<uint64_t>(i) * step];
}

template <class Sample>
Sample* SampleAt(const MemoryPlane& plane, int64_t x, int64_t y) {
  return reinterpret_cast<Sample*>(plane.samples) + y * int64_t{plane.width} + x;
}

template <class Sample>
Sample* SampleAt(const gobs::Raster& block, int64_t x, int64_t y, size_t channel) {
  return reinterpret_cast<Sample*>(PixelAddress(block, x, y)) + channel;
}

bool IsBit(const gobs::Raster& block) { return block.dataType == gobs::eDT_BIT; }

/// A bit of a block of the bit type.
struct BitPlace {
  unsigned char* byte;
  unsigned char bit;
};

BitPlace BitAt(const gobs::Raster& block, int64_t x, int64_t y, size_t channel) {
  const uint64_t number = LayoutOf(block).Index(x, y) * block.channelCount + channel;
  return {block.data + number / 8, static_cast<unsigned char>(0x80u >> (number % 8))};
}

void ReadBits(const MemoryPlane& plane, gobs::Raster& block, size_t channel) {
  const int64_t marginX = block.marginX;
  const int64_t marginY = block.marginY;
  for (int64_t y = -marginY; y < block.height + marginY; ++y)
    for (int64_t x = -marginX; x < block.width + marginX; ++x) {
      const int64_t column = std::clamp<int64_t>(block.x + x, 0, plane.width - 1);
      const int64_t row = std::clamp<int64_t>(block.y + y, 0, plane.height - 1);
      const auto [byte, bit] = BitAt(block, x, y, channel);
      const bool set = *SampleAt<unsigned char>(plane, column, row) != 0;
      *byte = static_cast<unsigned char>(set ? *byte | bit : *byte & ~bit);
    }
}

void WriteBits(const MemoryPlane& plane, const gobs::Raster& block, size_t channel) {
  for (int64_t y = 0; y < block.height; ++y)
    for (int64_t x = 0; x < block.width; ++x) {
      const auto [byte, bit] = BitAt(block, x, y, channel);
      *SampleAt<unsigned char>(plane, block.x + x, block.y + y) = (*byte & bit) != 0;
    }
}

}  // namespace

void ReadPlanes(const std::vector<MemoryPlane>& planes, gobs::Raster& block) {
  if (IsBit(block)) {
    for (size_t channel = 0; channel < planes.size(); ++channel)
      ReadBits(planes[channel], block, channel);
    return;
  }
  const auto inside = datasources::InsideOf(block, planes.front().width, planes.front().height);
  WithSample(block.dataType, [&]<class Sample>(std::type_identity<Sample>) {
    for (size_t channel = 0; channel < planes.size(); ++channel)
      for (int64_t y = inside.y; y < inside.y + inside.height; ++y)
        ReadRow(SampleAt<Sample>(planes[channel], inside.x, y), planes.size(),
                SampleAt<Sample>(block, inside.x - block.x, y - block.y, channel), inside.width);
  });
  RepeatEdges(block, inside);
}

void WritePlanes(const std::vector<MemoryPlane>& planes, const gobs::Raster& block) {
  if (IsBit(block)) {
    for (size_t channel = 0; channel < planes.size(); ++channel)
      WriteBits(planes[channel], block, channel);
    return;
  }
  WithSample(block.dataType, [&]<class Sample>(std::type_identity<Sample>) {
    for (size_t channel = 0; channel < planes.size(); ++channel)
      for (int64_t y = 0; y < block.height; ++y)
        WriteRow(SampleAt<Sample>(block, 0, y, channel), planes.size(),
                 SampleAt<Sample>(planes[channel], block.x, block.y + y), block.width);
  });
}

}  // namespace orin::drivers
