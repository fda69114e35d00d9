// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memorysource.h"

#include <utility>

#include "host/drivers/memory/memoryplane.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::AuxiliaryData;

AuxiliaryData MetadataOf(const MemoryRaster& raster, const std::vector<unsigned>& channels) {
  std::vector<AuxiliaryData::Items> items;
  for (const unsigned channel : channels)
    items.push_back(channel >= 1 && channel <= raster.channels.size()
                        ? raster.channels[channel - 1].metadata
                        : AuxiliaryData::Items{});
  return {raster.metadata, std::move(items)};
}

class MemoryReader final : public datasources::ReaderState<datasources::IRasterReader> {
 public:
  MemoryReader(std::shared_ptr<MemoryEntry> entry, std::vector<unsigned> channels)
      : entry_(std::move(entry)),
        channels_(std::move(channels)),
        type_(CommonType(entry_->levels->types, channels_, entry_->levels->file)) {
    for (const unsigned channel : channels_)
      planes_.push_back(
          {GetWidth(), GetHeight(), entry_->raster.channels[channel - 1].samples.data()});
  }

  unsigned GetWidth() const override { return entry_->raster.width; }
  unsigned GetHeight() const override { return entry_->raster.height; }
  unsigned GetChannelCount() const override { return static_cast<unsigned>(channels_.size()); }
  const gobs::DataType& GetDataType() const override { return type_; }
  unsigned GetLevel() const override { return 1; }
  AuxiliaryData GetAuxiliaryData() const override { return MetadataOf(entry_->raster, channels_); }
  std::vector<unsigned> GetChannelsInfo() const override { return channels_; }
  void Read(gobs::Raster& block) override {
    RequireFittingBlock(block, *this, entry_->levels->file);
    ReadPlanes(planes_, block);
  }

 protected:
  unsigned StoredTileWidth() const override { return kMemoryTile; }
  unsigned StoredTileHeight() const override { return kMemoryTile; }

 private:
  std::shared_ptr<MemoryEntry> entry_;
  std::vector<unsigned> channels_;
  gobs::DataType type_;
  std::vector<MemoryPlane> planes_;
};

class MemorySource final : public datasources::IRasterSource {
 public:
  MemorySource(std::shared_ptr<MemoryEntry> entry, bool writable)
      : entry_(std::move(entry)), levels_(entry_->levels, writable) {}

  unsigned Width() const override { return entry_->raster.width; }
  unsigned Height() const override { return entry_->raster.height; }
  unsigned ChannelCount() const override {
    return static_cast<unsigned>(entry_->raster.channels.size());
  }
  gobs::DataType TypeOf(unsigned channel) const override {
    return entry_->raster.channels.at(channel - 1).type;
  }
  AuxiliaryData MetadataOf(const std::vector<unsigned>& channels) const override {
    return drivers::MetadataOf(entry_->raster, channels);
  }
  std::unique_ptr<datasources::IRasterReader> OpenReader(
      const std::vector<unsigned>& channels) override {
    return std::make_unique<MemoryReader>(entry_, channels);
  }
  datasources::ILevelStore* Levels() override { return &levels_; }

 private:
  std::shared_ptr<MemoryEntry> entry_;
  MemoryLevels levels_;
};

}  // namespace

std::shared_ptr<MemoryEntry> MakeMemoryEntry(const std::string& file, MemoryRaster raster) {
  auto levels = std::make_shared<MemoryLevelTable>();
  levels->file = file;
  levels->width = raster.width;
  levels->height = raster.height;
  for (size_t i = 0; i < raster.channels.size(); ++i) {
    const MemoryChannel& channel = raster.channels[i];
    const uint64_t wanted = uint64_t{raster.width} * raster.height * SampleBytes(channel.type);
    if (channel.samples.size() != wanted)
      throw DataException(
          FormatString(_("%s: channel %zu holds %zu bytes; %u x %u pixels of its type "
                         "take %llu."),
                       file.c_str(), i + 1, channel.samples.size(), raster.width, raster.height,
                       static_cast<unsigned long long>(wanted)),
          "host/drivers/memory/memorysource",
          "MakeMemoryEntry(const std::string&, orin::drivers::MemoryRaster)", 0);
    levels->types.push_back(channel.type);
  }
  return std::make_shared<MemoryEntry>(MemoryEntry{std::move(raster), std::move(levels)});
}

std::unique_ptr<datasources::IRasterSource> OpenMemorySource(std::shared_ptr<MemoryEntry> entry,
                                                             bool writable) {
  return std::make_unique<MemorySource>(std::move(entry), writable);
}

}  // namespace orin::drivers
