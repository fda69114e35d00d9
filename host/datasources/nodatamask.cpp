// SPDX-License-Identifier: MIT
#include "host/datasources/nodatamask.h"

#include <charconv>
#include <cmath>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "basic/core/typedispatch/pixeltypes.h"

namespace {

using orin::datasources::AuxiliaryData;
using orin::datasources::IRasterReader;
using orin::datasources::kAlphaKey;
using orin::datasources::kFillOnlyKey;
using orin::datasources::kNoDataKey;
using orin::datasources::kValidityKey;
using orin::gobs::Mask;
using orin::gobs::Raster;

/// A no-data value as its channel can hold it.
template <class T>
struct Declared {
  bool counts = true;       ///< false for alpha, which may hold anything
  bool comparable = false;  ///< false: no pixel of the type can equal it
  T value{};
};

bool IsFiniteNumber(const std::string& text) {
  double value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  return end == text.data() + text.size() && !text.empty() &&
         (error == std::errc::result_out_of_range ||
          (error == std::errc() && std::isfinite(value)));
}

template <class T>
Declared<T> Parse(const std::string& text) {
  Declared<T> declared;
  if constexpr (std::is_integral_v<T>) {  // digit by digit: a double cannot hold every 64-bit value
    const auto [end, error] =
        std::from_chars(text.data(), text.data() + text.size(), declared.value);
    declared.comparable = error == std::errc() && end == text.data() + text.size();
    if (declared.comparable) return declared;
  }
  double number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc()) return declared;
  if constexpr (std::is_floating_point_v<T>) {
    declared.comparable = std::isfinite(static_cast<T>(number)) || std::isinf(number);
    declared.value = static_cast<T>(number);
  } else {
    // 2 to the power of the type's digits is exact in double; the maximum of a 64-bit type is not.
    const double limit = std::ldexp(1.0, std::numeric_limits<T>::digits);
    const bool inRange = number < limit && number >= double(std::numeric_limits<T>::min());
    declared.comparable = inRange && number == std::trunc(number);
    if (declared.comparable) declared.value = static_cast<T>(number);
  }
  return declared;
}

/// A pixel is no data when every channel equals its value.
template <class T>
class EqualsNoData final : public orin::gobs::IMaskDecision {
 public:
  EqualsNoData(std::vector<Declared<T>> values, uint32_t componentsPerSample)
      : components_(componentsPerSample) {
    for (const Declared<T>& channel : values) {
      possible_ = possible_ && (channel.comparable || !channel.counts);
      for (uint32_t i = 0; i < components_; ++i) {
        if (channel.counts) compared_.push_back(pixel_.size());
        pixel_.push_back(i == 0 ? channel.value : T{0});
      }
    }
  }

  void Decide(const Raster& block, Mask& mask) const override {
    if (!possible_) return;  // a new mask is all valid
    const T* sample = reinterpret_cast<const T*>(block.data);
    const uint64_t pixels = uint64_t{block.stride} * block.bufferLines;
    for (uint64_t pixel = 0; pixel < pixels; ++pixel, sample += pixel_.size())
      if (IsNoData(sample)) mask.begin[pixel / 8] &= static_cast<uint8_t>(~(0x80u >> (pixel % 8)));
  }

 private:
  bool IsNoData(const T* sample) const {
    for (const size_t i : compared_)
      if (sample[i] != pixel_[i]) return false;
    return true;
  }

  uint32_t components_;
  std::vector<T> pixel_;
  std::vector<size_t> compared_;  ///< samples of the pixel
  bool possible_ = true;
};

/// No data where `declared` (null: nowhere) says so, or the block's own validity.
class WithBlockValidity final : public orin::gobs::IMaskDecision {
 public:
  explicit WithBlockValidity(std::unique_ptr<orin::gobs::IMaskDecision> declared)
      : declared_(std::move(declared)) {}

  void Decide(const Raster& block, Mask& mask) const override {
    if (declared_) declared_->Decide(block, mask);
    if (block.validity) mask.Intersect(*block.validity);
  }

 private:
  std::unique_ptr<orin::gobs::IMaskDecision> declared_;
};

/// Without blanks around it and without a plus sign, which number parsing does not take.
std::string Trimmed(const std::string& text) {
  constexpr char kBlanks[] = " \t\r\n";
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string::npos) return "";
  const size_t start = text[first] == '+' ? first + 1 : first;
  return text.substr(start, text.find_last_not_of(kBlanks) + 1 - start);
}

bool IsAlpha(const AuxiliaryData& metadata, unsigned channel) {
  return !metadata.GetChanMetadataValue(kAlphaKey, channel).empty();
}

/// The reader's no-data texts, one a channel; nothing when no channel has one.
std::optional<std::vector<std::string>> DeclaredTexts(const AuxiliaryData& metadata,
                                                      unsigned channels) {
  const bool isFillOnly = !metadata.GetFileMetadataValue(kFillOnlyKey).empty();
  const std::string file = isFillOnly ? "" : metadata.GetFileMetadataValue(kNoDataKey);
  std::vector<std::string> texts;
  bool any = false;
  for (unsigned channel = 1; channel <= channels; ++channel) {
    std::string own = metadata.GetChanMetadataValue(kNoDataKey, channel);
    texts.push_back(Trimmed(own.empty() ? file : own));
    any = any || (!IsAlpha(metadata, channel) && IsFiniteNumber(texts.back()));
  }
  if (!any) return std::nullopt;
  return texts;
}

/// The decision of the values that the reader's file declares, or null.
std::unique_ptr<orin::gobs::IMaskDecision> DeclaredDecision(const IRasterReader& reader,
                                                            const AuxiliaryData& metadata) {
  const auto texts = DeclaredTexts(metadata, reader.GetChannelCount());
  if (!texts) return nullptr;
  const orin::gobs::DataType type = reader.GetDataType();
  std::unique_ptr<orin::gobs::IMaskDecision> decision;
  orin::typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    std::vector<Declared<T>> values;
    for (const std::string& text : *texts) {
      values.push_back(Parse<T>(text));
      values.back().counts = !IsAlpha(metadata, static_cast<unsigned>(values.size()));
    }
    decision = std::make_unique<EqualsNoData<T>>(std::move(values), ComponentsPerSample(type));
  });
  return decision;
}

}  // namespace

orin::gobs::IMaskDecision* GetFileMetadataSrcMask(orin::datasources::IRasterReader* reader) {
  const AuxiliaryData metadata = reader->GetAuxiliaryData();
  auto decision = DeclaredDecision(*reader, metadata);
  if (!metadata.GetFileMetadataValue(kValidityKey).empty())
    decision = std::make_unique<WithBlockValidity>(std::move(decision));
  return decision.release();
}
