// SPDX-License-Identifier: MIT
#include "host/datasources/nodatamask.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "basic/core/typedispatch/pixeltypes.h"
#include "host/datasources/nodataanswers.h"
#include "host/datasources/nodatacompare.h"
#include "host/datasources/nodatavalue.h"

namespace {

using orin::datasources::AuxiliaryData;
using orin::datasources::ChannelValue;
using orin::datasources::CompareChunk;
using orin::datasources::HasHits;
using orin::datasources::Hits;
using orin::datasources::IRasterReader;
using orin::datasources::kAlphaKey;
using orin::datasources::kChunk;
using orin::datasources::kDeclaredNoDataKey;
using orin::datasources::kFillOnlyKey;
using orin::datasources::kNoDataKey;
using orin::datasources::NoDataValue;
using orin::datasources::PackHits;
using orin::gobs::IMaskDecision;
using orin::gobs::Mask;
using orin::gobs::Raster;

/// What one channel declares.
struct ChannelText {
  std::string text;      ///< empty without a value
  bool isAlpha = false;  ///< may hold anything in a pixel without data
};

/// A pixel is no data when every channel that counts equals its value.
template <class T>
class EqualsNoData final : public IMaskDecision {
 public:
  EqualsNoData(const std::vector<ChannelText>& channels, uint32_t componentsPerSample)
      : components_(componentsPerSample) {
    for (const ChannelText& channel : channels) {
      const auto value = orin::datasources::NoDataValueOf<T>(channel.text);
      possible_ = possible_ && (value || channel.isAlpha);
      channels_.push_back({value.value_or(NoDataValue<T>()), !channel.isAlpha});
    }
  }

  void Decide(const Raster& block, Mask& mask) const override {
    if (!possible_) return;  // a new mask is all valid
    const T* samples = reinterpret_cast<const T*>(block.data);
    const uint64_t pixels = uint64_t{block.stride} * block.bufferLines;
    for (uint64_t first = 0; first < pixels; first += kChunk) {
      const uint64_t count = std::min(kChunk, pixels - first);
      const Hits hits = CompareChunk(channels_, components_, samples, count);
      samples += count * channels_.size() * components_;
      if (!HasHits(hits)) continue;
      for (uint64_t i = 0; i < count; i += 8)
        mask.begin[(first + i) / 8] &= static_cast<uint8_t>(~PackHits(&hits[i]));
    }
  }

 private:
  uint32_t components_;
  std::vector<ChannelValue<T>> channels_;
  bool possible_ = true;  ///< false: the type cannot hold one of the values
};

/// No data where `declared` (null: nowhere) says so, or the block's own validity.
class WithBlockValidity final : public IMaskDecision {
 public:
  explicit WithBlockValidity(std::unique_ptr<IMaskDecision> declared)
      : declared_(std::move(declared)) {}

  void Decide(const Raster& block, Mask& mask) const override {
    if (declared_) declared_->Decide(block, mask);
    if (block.validity) mask.Intersect(*block.validity);
  }

 private:
  std::unique_ptr<IMaskDecision> declared_;
};

/// The declared text where another one is answered for it.
std::string Declared(const std::string& answered, const std::string& declared) {
  return declared.empty() ? answered : declared;
}

/// What the reader's channels declare; nothing when none of those that count declares a number.
std::optional<std::vector<ChannelText>> DeclaredTexts(const AuxiliaryData& metadata,
                                                      unsigned channels) {
  const bool isFillOnly = !metadata.GetFileMetadataValue(kFillOnlyKey).empty();
  const std::string file = isFillOnly ? ""
                                      : Declared(metadata.GetFileMetadataValue(kNoDataKey),
                                                 metadata.GetFileMetadataValue(kDeclaredNoDataKey));
  std::vector<ChannelText> texts;
  bool any = false;
  for (unsigned channel = 1; channel <= channels; ++channel) {
    const std::string own = Declared(metadata.GetChanMetadataValue(kNoDataKey, channel),
                                     metadata.GetChanMetadataValue(kDeclaredNoDataKey, channel));
    const bool isAlpha = !metadata.GetChanMetadataValue(kAlphaKey, channel).empty();
    texts.push_back({own.empty() ? file : own, isAlpha});
    any = any || (!isAlpha && orin::datasources::ParseNoData(texts.back().text));
  }
  if (!any) return std::nullopt;
  return texts;
}

/// The decision of the values that the reader's file declares, or null.
std::unique_ptr<IMaskDecision> DeclaredDecision(const IRasterReader& reader,
                                                const AuxiliaryData& metadata) {
  const auto texts = DeclaredTexts(metadata, reader.GetChannelCount());
  if (!texts) return nullptr;
  const orin::gobs::DataType type = reader.GetDataType();
  std::unique_ptr<IMaskDecision> decision;
  orin::typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    decision = std::make_unique<EqualsNoData<T>>(*texts, ComponentsPerSample(type));
  });
  return decision;
}

}  // namespace

IMaskDecision* GetFileMetadataSrcMask(IRasterReader* reader) {
  const AuxiliaryData metadata = reader->GetAuxiliaryData();
  std::unique_ptr<IMaskDecision> decision = DeclaredDecision(*reader, metadata);
  if (!metadata.GetFileMetadataValue(orin::datasources::kValidityKey).empty())
    decision = std::make_unique<WithBlockValidity>(std::move(decision));
  return decision.release();
}
