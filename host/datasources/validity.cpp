// SPDX-License-Identifier: MIT
#include "host/datasources/validity.h"

#include <algorithm>
#include <cstring>
#include <functional>
#include <utility>

#include "basic/core/typedispatch/pixeltypes.h"
#include "basic/gobs/mask/mask.h"

namespace orin::datasources {
namespace {

constexpr uint64_t kChunkPixels = 1 << 20;

gobs::Mask& ValidityOf(gobs::Raster& block) {
  if (!block.validity)
    block.validity = std::make_unique<gobs::Mask>(block.width, block.height, block.Window());
  return *block.validity;
}

/// Calls `visit(n)` for every pixel n of the block's buffer whose sample is 0.
template <class Visit>
void ForEachZero(const gobs::Raster& block, uint32_t position, Visit&& visit) {
  typedispatch::WithPixelType(block.dataType, [&]<class T>(std::type_identity<T>) {
    const uint32_t components = ComponentsPerSample(block.dataType);
    const T* sample = reinterpret_cast<const T*>(block.data) + position * components;
    const uint64_t pixels = uint64_t{block.stride} * block.bufferLines;
    for (uint64_t n = 0; n < pixels; ++n, sample += block.channelCount * components)
      if (*sample == T{0}) visit(n);
  });
}

class Intersection final : public IValidityReader {
 public:
  explicit Intersection(ValidityReaders readers) : readers_(std::move(readers)) {}

  uint32_t Width() const override { return readers_.front()->Width(); }
  uint32_t Height() const override { return readers_.front()->Height(); }
  void Read(uint32_t x, uint32_t y, uint32_t width, uint32_t height, uint8_t* bytes) override {
    readers_.front()->Read(x, y, width, height, bytes);
    const uint64_t pixels = uint64_t{width} * height;
    other_.resize(pixels);
    for (size_t i = 1; i < readers_.size(); ++i) {
      readers_[i]->Read(x, y, width, height, other_.data());
      for (uint64_t n = 0; n < pixels; ++n)
        if (other_[n] == 0) bytes[n] = 0;
    }
  }

 private:
  ValidityReaders readers_;
  std::vector<uint8_t> other_;
};

class OpaquePixels final : public IValidityReader {
 public:
  explicit OpaquePixels(std::unique_ptr<IRasterReader> alpha) : alpha_(std::move(alpha)) {}

  uint32_t Width() const override { return alpha_->GetWidth(); }
  uint32_t Height() const override { return alpha_->GetHeight(); }
  void Read(uint32_t x, uint32_t y, uint32_t width, uint32_t height, uint8_t* bytes) override {
    gobs::Raster block({width, height, 1, alpha_->GetDataType()}, {0, 0, x, y});
    alpha_->Read(block);
    std::fill_n(bytes, uint64_t{width} * height, uint8_t{255});
    ForEachZero(block, 0, [bytes](uint64_t n) { bytes[n] = 0; });
  }

 private:
  std::unique_ptr<IRasterReader> alpha_;
};

class Centres final : public IValidityReader {
 public:
  Centres(std::unique_ptr<IValidityReader> image, uint32_t factor, uint32_t width, uint32_t height)
      : image_(std::move(image)), factor_(factor), width_(width), height_(height) {}

  uint32_t Width() const override { return width_; }
  uint32_t Height() const override { return height_; }
  void Read(uint32_t x, uint32_t y, uint32_t width, uint32_t height, uint8_t* bytes) override {
    const uint32_t first = CentreOf(x, image_->Width());
    const uint32_t last = CentreOf(x + width - 1, image_->Width());
    row_.resize(last - first + uint64_t{1});
    for (uint32_t j = 0; j < height; ++j) {
      image_->Read(first, CentreOf(y + j, image_->Height()), last - first + 1, 1, row_.data());
      for (uint32_t i = 0; i < width; ++i)
        *bytes++ = row_[CentreOf(x + i, image_->Width()) - first];
    }
  }

 private:
  uint32_t CentreOf(uint32_t at, uint32_t limit) const {
    const uint64_t centre = uint64_t{at} * factor_ + factor_ / 2;
    return static_cast<uint32_t>(std::min<uint64_t>(centre, limit - uint64_t{1}));
  }

  std::unique_ptr<IValidityReader> image_;
  uint32_t factor_;
  uint32_t width_;
  uint32_t height_;
  std::vector<uint8_t> row_;
};

/// Clears what is 0 in a row of bytes that belongs at (x, y).
void ClearRuns(const uint8_t* row, uint32_t width, int64_t x, int64_t y, gobs::Mask& mask) {
  const uint8_t* const end = row + width;
  for (const uint8_t* at = row; at != end;) {
    const auto* first = static_cast<const uint8_t*>(std::memchr(at, 0, size_t(end - at)));
    if (!first) break;
    at = std::find_if(first, end, [](uint8_t byte) { return byte != 0; });
    mask.ClearRun(x + (first - row), y, uint64_t(at - first));
  }
}

/// Gives the pixels of the buffer outside `inside` the validity of the nearest one inside.
void RepeatEdges(const InsideWindow& inside, const gobs::Raster& block, gobs::Mask& mask) {
  const int64_t left = inside.x - block.x;
  const int64_t top = inside.y - block.y;
  const int64_t right = left + inside.width - 1;
  const int64_t bottom = top + inside.height - 1;
  const int64_t lastX = int64_t{block.width} + block.marginX;
  const int64_t lastY = int64_t{block.height} + block.marginY;
  for (int64_t y = -int64_t{block.marginY}; y < lastY; ++y)
    for (int64_t x = -int64_t{block.marginX}; x < lastX; ++x) {
      const bool isRowInside = y >= top && y <= bottom;
      if (isRowInside && x == left) x = right + 1;
      if (x >= lastX) break;
      if (!mask.IsValid(std::clamp(x, left, right), std::clamp(y, top, bottom)))
        mask.SetValid(x, y, false);
    }
}

}  // namespace

std::unique_ptr<IValidityReader> AllOf(ValidityReaders readers) {
  std::erase(readers, nullptr);
  if (readers.empty()) return nullptr;
  if (readers.size() == 1) return std::move(readers.front());
  return std::make_unique<Intersection>(std::move(readers));
}

std::unique_ptr<IValidityReader> OpaquePixelsOf(std::unique_ptr<IRasterReader> alpha) {
  return std::make_unique<OpaquePixels>(std::move(alpha));
}

std::unique_ptr<IValidityReader> CentresOf(std::unique_ptr<IValidityReader> image, uint32_t factor,
                                           uint32_t width, uint32_t height) {
  return std::make_unique<Centres>(std::move(image), factor, width, height);
}

void AddValidity(IValidityReader& reader, gobs::Raster& block) {
  const InsideWindow inside = InsideOf(block, reader.Width(), reader.Height());
  gobs::Mask& mask = ValidityOf(block);
  if (inside.width <= 0 || inside.height <= 0) return;
  const auto width = static_cast<uint32_t>(inside.width);
  const auto rows = static_cast<uint32_t>(
      std::clamp<int64_t>(int64_t{kChunkPixels} / inside.width, 1, inside.height));
  std::vector<uint8_t> bytes(uint64_t{width} * rows);
  for (int64_t y = inside.y; y < inside.y + inside.height; y += rows) {
    const auto count = static_cast<uint32_t>(std::min<int64_t>(rows, inside.y + inside.height - y));
    reader.Read(static_cast<uint32_t>(inside.x), static_cast<uint32_t>(y), width, count,
                bytes.data());
    for (uint32_t row = 0; row < count; ++row)
      ClearRuns(&bytes[uint64_t{row} * width], width, inside.x - block.x, y - block.y + row, mask);
  }
  RepeatEdges(inside, block, mask);
}

void AddOpacity(uint32_t position, gobs::Raster& block) {
  gobs::Mask& mask = ValidityOf(block);
  ForEachZero(block, position, [&mask](uint64_t n) {
    mask.begin[n / 8] &= static_cast<uint8_t>(~(0x80u >> (n % 8)));
  });
}

}  // namespace orin::datasources
