// SPDX-License-Identifier: MIT
#include "host/datasources/nodatamask.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#include "basic/core/typedispatch/pixeltypes.h"
#include "host/datasources/nodatacompare.h"

namespace {

using orin::datasources::AuxiliaryData;
using orin::datasources::ChannelValue;
using orin::datasources::CompareChunk;
using orin::datasources::HasHits;
using orin::datasources::Hits;
using orin::datasources::IRasterReader;
using orin::datasources::kChunk;
using orin::datasources::PackHits;
using orin::gobs::IMaskDecision;
using orin::gobs::Mask;
using orin::gobs::Raster;
using orin::model::NoData;
using orin::model::NoDataValue;
using orin::model::SourceFacts;

/// What one channel declares.
struct ChannelNoData {
  std::optional<NoData> noData;
  bool isAlpha = false;  ///< may hold anything in a pixel without data
};

/// A pixel is no data when every channel that counts equals its value.
template <class T>
class EqualsNoData final : public IMaskDecision {
 public:
  EqualsNoData(const std::vector<ChannelNoData>& channels, uint32_t componentsPerSample)
      : components_(componentsPerSample) {
    for (const ChannelNoData& channel : channels) {
      const auto value = channel.noData ? channel.noData->As<T>() : std::nullopt;
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

/// What the reader's channels declare; nothing when none of those that count declares a value.
std::optional<std::vector<ChannelNoData>> DeclaredBy(const SourceFacts& facts, unsigned channels) {
  const std::optional<NoData> file = facts.noDataIsFill ? std::nullopt : facts.noData;
  std::vector<ChannelNoData> declared;
  bool any = false;
  for (unsigned channel = 1; channel <= channels; ++channel) {
    const std::optional<NoData>& own = facts.OfChannel(channel);
    const bool isAlpha = channel <= facts.channels.size() && facts.channels[channel - 1].isAlpha;
    declared.push_back({own ? own : file, isAlpha});
    any = any || (!isAlpha && declared.back().noData);
  }
  if (!any) return std::nullopt;
  return declared;
}

/// The decision of the values that the reader's file declares, or null.
std::unique_ptr<IMaskDecision> DeclaredDecision(const IRasterReader& reader,
                                                const SourceFacts& facts) {
  const auto declared = DeclaredBy(facts, reader.GetChannelCount());
  if (!declared) return nullptr;
  const orin::gobs::DataType type = reader.GetDataType();
  std::unique_ptr<IMaskDecision> decision;
  orin::typedispatch::WithPixelType(type, [&]<class T>(std::type_identity<T>) {
    decision = std::make_unique<EqualsNoData<T>>(*declared, ComponentsPerSample(type));
  });
  return decision;
}

}  // namespace

IMaskDecision* GetFileMetadataSrcMask(IRasterReader* reader) {
  const AuxiliaryData metadata = reader->GetAuxiliaryData();
  std::unique_ptr<IMaskDecision> decision = DeclaredDecision(*reader, metadata.Facts());
  if (metadata.Facts().carriesValidity)
    decision = std::make_unique<WithBlockValidity>(std::move(decision));
  return decision.release();
}
