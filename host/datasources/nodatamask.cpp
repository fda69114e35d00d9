// SPDX-License-Identifier: MIT
#include "host/datasources/nodatamask.h"

#include <cmath>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "basic/core/typedispatch/pixeltypes.h"
#include "host/datasources/nodataanswers.h"
#include "host/datasources/nodatavalue.h"

namespace {

using orin::datasources::AuxiliaryData;
using orin::datasources::IRasterReader;
using orin::datasources::NoDataValue;
using orin::gobs::Mask;
using orin::gobs::Raster;

/// A pixel is no data when every channel equals its value.
template <class T>
class EqualsNoData final : public orin::gobs::IMaskDecision {
 public:
  /// \param values  one for each channel; nothing where no pixel can equal the declared one
  EqualsNoData(const std::vector<std::optional<NoDataValue<T>>>& values,
               uint32_t componentsPerSample)
      : components_(componentsPerSample) {
    for (const std::optional<NoDataValue<T>>& channel : values) {
      possible_ = possible_ && channel;
      values_.push_back(channel.value_or(NoDataValue<T>()));
    }
  }

  void Decide(const Raster& block, Mask& mask) const override {
    if (!possible_) return;  // a new mask is all valid
    const T* sample = reinterpret_cast<const T*>(block.data);
    const uint64_t pixels = uint64_t{block.stride} * block.bufferLines;
    const uint64_t size = values_.size() * components_;
    for (uint64_t pixel = 0; pixel < pixels; ++pixel, sample += size)
      if (IsNoData(sample)) mask.begin[pixel / 8] &= static_cast<uint8_t>(~(0x80u >> (pixel % 8)));
  }

 private:
  bool IsNoData(const T* sample) const {
    for (const NoDataValue<T>& value : values_) {
      if (!(components_ == 1 ? value.Matches(*sample) : MatchesPair(value, sample))) return false;
      sample += components_;
    }
    return true;
  }

  /// A complex sample: (value, 0), and with NaN in either part it is no number.
  static bool MatchesPair(const NoDataValue<T>& value, const T* sample) {
    if constexpr (std::is_floating_point_v<T>)
      if (std::isnan(value.stored)) return std::isnan(sample[0]) || std::isnan(sample[1]);
    return value.Matches(sample[0]) && sample[1] == T{0};
  }

  uint32_t components_;
  std::vector<NoDataValue<T>> values_;
  bool possible_ = true;
};

/// The declared text where another one is answered for it.
std::string Declared(const std::string& answered, const std::string& declared) {
  return declared.empty() ? answered : declared;
}

/// The reader's no-data texts, one a channel; nothing when no channel has one.
std::optional<std::vector<std::string>> DeclaredTexts(const IRasterReader& reader) {
  using orin::datasources::kDeclaredNoDataKey;
  using orin::datasources::kNoDataKey;
  const AuxiliaryData metadata = reader.GetAuxiliaryData();
  const std::string file = Declared(metadata.GetFileMetadataValue(kNoDataKey),
                                    metadata.GetFileMetadataValue(kDeclaredNoDataKey));
  std::vector<std::string> texts;
  bool any = false;
  for (unsigned channel = 1; channel <= reader.GetChannelCount(); ++channel) {
    const std::string own = Declared(metadata.GetChanMetadataValue(kNoDataKey, channel),
                                     metadata.GetChanMetadataValue(kDeclaredNoDataKey, channel));
    texts.push_back(own.empty() ? file : own);
    any = any || orin::datasources::ParseNoData(texts.back());
  }
  if (!any) return std::nullopt;
  return texts;
}

}  // namespace

orin::gobs::IMaskDecision* GetFileMetadataSrcMask(orin::datasources::IRasterReader* reader) {
  const auto texts = DeclaredTexts(*reader);
  if (!texts) return nullptr;
  const orin::gobs::DataType type = reader->GetDataType();
  std::unique_ptr<orin::gobs::IMaskDecision> decision;
  orin::typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    std::vector<std::optional<NoDataValue<T>>> values;
    for (const std::string& text : *texts)
      values.push_back(orin::datasources::NoDataValueOf<T>(text));
    decision = std::make_unique<EqualsNoData<T>>(values, ComponentsPerSample(type));
  });
  return decision.release();
}
