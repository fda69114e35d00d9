// SPDX-License-Identifier: MIT
#include "host/datasources/nodatafill.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <utility>

#include "basic/core/typedispatch/pixeltypes.h"
#include "basic/gobs/mask/mask.h"
#include "host/datasources/forwardingwriter.h"

namespace orin::datasources {
namespace {

using gobs::Raster;
using model::NoDataValue;

template <class T>
class NoDataFill final : public INoDataFill {
 public:
  /// \param declared  one value for each channel
  NoDataFill(T arriving, NoDataValue<T> fill, const std::vector<NoDataValue<T>>& declared,
             uint32_t componentsPerSample)
      : arriving_(arriving),
        fill_(fill),
        channels_(declared.size()),
        components_(componentsPerSample),
        isReplaced_(!fill.Matches(arriving)) {
    for (const NoDataValue<T>& value : declared) {
      Append(fill.stored, stored_);
      Append(value.stored, own_);
      isOwn_ = isOwn_ && value.Matches(fill.stored);
    }
  }

  bool ChangesAnything() const { return isReplaced_ || NeedsRecognition(); }

  std::unique_ptr<Raster> ToStore(const Raster& block) const override {
    if (!isReplaced_ || !HoldsFill(block)) return nullptr;
    auto copy = std::make_unique<Raster>(block, parallelio::ProcessWindow{0, 0, block.x, block.y});
    const uint64_t line = PixelBytes(block) * block.width;
    for (uint32_t y = 0; y < block.height; ++y)
      std::memcpy(PixelAddress(*copy, 0, y), PixelAddress(block, 0, y), line);
    if (block.validity) copy->validity = WithoutMargins(*block.validity);
    T* pixel = reinterpret_cast<T*>(copy->data);
    for (uint64_t i = uint64_t{copy->width} * copy->height; i > 0; --i, pixel += stored_.size())
      if (*pixel == arriving_) std::copy(stored_.begin(), stored_.end(), pixel);
    return copy;
  }

  void Recognise(Raster& block) const override {
    if (!NeedsRecognition()) return;
    T* pixel = reinterpret_cast<T*>(block.data);
    for (uint64_t i = uint64_t{block.stride} * block.bufferLines; i > 0; --i, pixel += own_.size())
      if (IsFill(pixel)) std::copy(own_.begin(), own_.end(), pixel);
  }

 private:
  static std::unique_ptr<gobs::Mask> WithoutMargins(const gobs::Mask& mask) {
    auto copy = std::make_unique<gobs::Mask>(mask.width, mask.height,
                                             parallelio::ProcessWindow{0, 0, mask.x, mask.y});
    for (uint32_t y = 0; y < mask.height; ++y)
      for (uint32_t x = 0; x < mask.width; ++x)
        if (!mask.IsValid(x, y)) copy->ClearRun(x, y, 1);
    return copy;
  }

  void Append(T real, std::vector<T>& pixel) const {
    pixel.push_back(real);
    if (components_ == 2) pixel.push_back(T{0});
  }

  /// A filled complex pixel does not always have the form (value, 0) that counts as no data.
  bool NeedsRecognition() const { return !isOwn_ || (components_ == 2 && !isReplaced_); }

  /// The value that arrives is none of the data's, so that one component tells.
  bool HoldsFill(const Raster& block) const {
    for (uint32_t y = 0; y < block.height; ++y) {
      const T* pixel = reinterpret_cast<const T*>(PixelAddress(block, 0, y));
      for (uint32_t x = 0; x < block.width; ++x, pixel += stored_.size())
        if (*pixel == arriving_) return true;
    }
    return false;
  }

  /// The forms of a filled pixel: the one stored here; the value in all components, or, of complex
  /// samples, in as many as there are channels, the others 0.
  bool IsFill(const T* pixel) const {
    if (!fill_.Matches(pixel[0])) return false;
    const uint64_t size = own_.size();
    const auto isFill = [&](T value) { return fill_.Matches(value); };
    const auto isZero = [](T value) { return value == T{0}; };
    if (components_ == 1) return std::all_of(pixel + 1, pixel + size, isFill);
    bool isStored = true;
    for (uint64_t i = 0; i < size; i += 2)
      isStored = isStored && isFill(pixel[i]) && isZero(pixel[i + 1]);
    return isStored || (std::all_of(pixel + 1, pixel + channels_, isFill) &&
                        (std::all_of(pixel + channels_, pixel + size, isFill) ||
                         std::all_of(pixel + channels_, pixel + size, isZero)));
  }

  T arriving_;           ///< in the first component of every pixel that the run fills
  NoDataValue<T> fill_;  ///< what the level stores there, in each channel
  uint64_t channels_;
  uint32_t components_;
  bool isReplaced_;
  bool isOwn_ = true;      ///< the fill is every channel's own declared value
  std::vector<T> stored_;  ///< the filled pixel of a level
  std::vector<T> own_;     ///< the pixel of the declared values
};

template <class T>
std::optional<NoDataValue<T>> ValueOf(const std::optional<model::NoData>& noData) {
  return noData ? noData->As<T>() : std::nullopt;
}

template <class T>
std::shared_ptr<const INoDataFill> MakeOf(const NoDataOfPass& pass, uint32_t componentsPerSample) {
  const auto arriving = ValueOf<T>(pass.answered);
  const auto fill = ValueOf<T>(pass.fill);
  if (!arriving || !fill) return nullptr;
  std::vector<NoDataValue<T>> declared;
  for (const std::optional<model::NoData>& own : pass.declared) {
    const auto value = ValueOf<T>(own);
    if (!value) return nullptr;  // no pixel is no data
    declared.push_back(*value);
  }
  auto made =
      std::make_shared<NoDataFill<T>>(arriving->stored, *fill, declared, componentsPerSample);
  return made->ChangesAnything() ? made : nullptr;
}

/// Changes the blocks of a level.
class FilledLevel final : public ForwardingWriter {
 public:
  FilledLevel(std::unique_ptr<IRasterWriter> level, std::shared_ptr<const INoDataFill> fill)
      : ForwardingWriter(std::move(level)), fill_(std::move(fill)) {}

  void Read(Raster& block) override {
    Level().Read(block);
    fill_->Recognise(block);
  }
  void Write(const Raster& block) override {
    const std::unique_ptr<Raster> changed = fill_->ToStore(block);
    Level().Write(changed ? *changed : block);
  }

 private:
  std::shared_ptr<const INoDataFill> fill_;
};

}  // namespace

std::shared_ptr<const INoDataFill> MakeNoDataFill(const NoDataOfPass& pass,
                                                  const gobs::DataType& type) {
  std::shared_ptr<const INoDataFill> made;
  typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    made = MakeOf<T>(pass, ComponentsPerSample(type));
  });
  return made;
}

std::unique_ptr<IRasterWriter> WithNoDataFill(std::unique_ptr<IRasterWriter> level,
                                              std::shared_ptr<const INoDataFill> fill) {
  return std::make_unique<FilledLevel>(std::move(level), std::move(fill));
}

}  // namespace orin::datasources
