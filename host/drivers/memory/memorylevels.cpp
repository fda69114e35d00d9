// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memorylevels.h"

#include <algorithm>

#include "host/drivers/memory/memoryplane.h"
#include "host/model/levelsize.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::LevelDescription;

constexpr char kSource[] = "host/drivers/memory/memorylevels";

bool IsComplete(const MemoryLevelChannel& channel) {
  return std::find(channel.written.begin(), channel.written.end(), false) == channel.written.end();
}

/// Reads and writes channels of one level; holds the table, so that it survives the store.
class MemoryWriter final : public datasources::ReaderState<datasources::IRasterWriter> {
 public:
  MemoryWriter(std::shared_ptr<MemoryLevelTable> table, MemoryLevel& level,
               std::vector<unsigned> channels, gobs::DataType type, bool writable)
      : table_(std::move(table)),
        level_(level),
        channels_(std::move(channels)),
        type_(type),
        writable_(writable) {
    for (const unsigned channel : channels_)
      planes_.push_back({GetWidth(), GetHeight(), level_.channels[channel - 1].samples.data()});
  }

  unsigned GetWidth() const override { return level_.description.width; }
  unsigned GetHeight() const override { return level_.description.height; }
  unsigned GetChannelCount() const override { return static_cast<unsigned>(channels_.size()); }
  const gobs::DataType& GetDataType() const override { return type_; }
  unsigned GetLevel() const override { return level_.description.level; }
  datasources::AuxiliaryData GetAuxiliaryData() const override { return {}; }
  std::vector<unsigned> GetChannelsInfo() const override { return channels_; }

  void Read(gobs::Raster& block) override {
    RequireFittingBlock(block, *this, table_->file);
    ReadPlanes(planes_, block);
  }

  void Write(const gobs::Raster& block) override {
    if (!writable_)
      throw Exception(FormatString(_("%s: is open for reading only."), table_->file.c_str()),
                      kSource, "MemoryWriter::Write(const orin::gobs::Raster&)", 0);
    RequireFittingBlock(block, *this, table_->file);
    Invalidate();
    WritePlanes(planes_, block);
    Record(block);
  }

 protected:
  unsigned StoredTileWidth() const override { return kMemoryTile; }
  unsigned StoredTileHeight() const override { return kMemoryTile; }

 private:
  /// A write to a complete channel begins a new round of writing.
  void Invalidate() {
    if (hasWritten_) return;
    hasWritten_ = true;
    const std::lock_guard lock(table_->mutex);
    for (const unsigned number : channels_) {
      MemoryLevelChannel& channel = level_.channels[number - 1];
      channel.valid = false;
      if (IsComplete(channel)) std::fill(channel.written.begin(), channel.written.end(), false);
    }
  }

  void Record(const gobs::Raster& block) {
    const std::lock_guard lock(table_->mutex);
    for (const unsigned number : channels_)
      for (uint64_t y = block.y; y < uint64_t{block.y} + block.height; ++y)
        std::fill_n(level_.channels[number - 1].written.begin() +
                        static_cast<ptrdiff_t>(y * GetWidth() + block.x),
                    block.width, true);
  }

  std::shared_ptr<MemoryLevelTable> table_;
  MemoryLevel& level_;
  std::vector<unsigned> channels_;
  gobs::DataType type_;
  bool writable_;
  bool hasWritten_ = false;
  std::vector<MemoryPlane> planes_;
};

}  // namespace

gobs::DataType CommonType(const std::vector<gobs::DataType>& types,
                          const std::vector<unsigned>& channels, const std::string& file) {
  const auto refuse = [](const std::string& text) {
    throw DataException(text, kSource,
                        "CommonType(const std::vector<orin::gobs::DataType>&, "
                        "const std::vector<unsigned int>&, const std::string&)",
                        0);
  };
  if (channels.empty()) refuse(FormatString(_("%s: no channel was asked for."), file.c_str()));
  for (const unsigned channel : channels) {
    if (channel < 1 || channel > types.size())
      refuse(FormatString(_("%s: there is no channel %u; the file has %zu."), file.c_str(), channel,
                          types.size()));
    if (!(types[channel - 1] == types[channels.front() - 1]))
      refuse(FormatString(_("%s: the channels %u and %u differ in type. Treat them in two runs."),
                          file.c_str(), channels.front(), channel));
  }
  return types[channels.front() - 1];
}

void MemoryLevels::RequireWritable(const char* function) const {
  if (!writable_)
    throw Exception(FormatString(_("%s: is open for reading only."), table_->file.c_str()), kSource,
                    function, 0);
}

MemoryLevel& MemoryLevels::PresentLevel(unsigned level, const std::vector<unsigned>& channels,
                                        const char* function) const {
  const auto found = table_->levels.find(level);
  for (const unsigned channel : channels)
    if (found == table_->levels.end() || channel < 1 || channel > table_->types.size() ||
        !found->second.channels[channel - 1].present)
      throw Exception(FormatString(_("%s: there is no level %u of channel %u."),
                                   table_->file.c_str(), level, channel),
                      kSource, function, 0);
  if (found == table_->levels.end() || channels.empty())
    throw Exception(
        FormatString(_("%s: no channel of level %u was asked for."), table_->file.c_str(), level),
        kSource, function, 0);
  return found->second;
}

std::vector<LevelDescription> MemoryLevels::List() const {
  const std::lock_guard lock(table_->mutex);
  std::vector<LevelDescription> list;
  for (const auto& [factor, level] : table_->levels) {
    list.push_back(level.description);
    for (const MemoryLevelChannel& channel : level.channels) {
      list.back().presentChannels.push_back(channel.present);
      list.back().validChannels.push_back(channel.valid);
    }
    // Nobody changes the raster behind its levels' back.
    list.back().status =
        std::any_of(level.channels.begin(), level.channels.end(),
                    [](const MemoryLevelChannel& c) { return c.present && !c.valid; })
            ? datasources::LevelStatus::kUnfinished
            : datasources::LevelStatus::kCurrent;
  }
  return list;
}

void MemoryLevels::Create(unsigned level, const std::vector<unsigned>& channels,
                          const std::string& method) {
  const char* function =
      "MemoryLevels::Create(unsigned int, const std::vector<unsigned int>&, const std::string&)";
  RequireWritable(function);
  const std::lock_guard lock(table_->mutex);
  const model::LevelSize size = model::LevelSizeOf(table_->width, table_->height, level);
  if (level < 2 || size.IsEmpty())
    throw Exception(FormatString(_("%s: of %u x %u pixels, can have no level %u."),
                                 table_->file.c_str(), table_->width, table_->height, level),
                    kSource, function, 0);
  CommonType(table_->types, channels, table_->file);
  MemoryLevel& made = table_->levels[level];
  made.channels.resize(table_->types.size());
  LevelDescription& description = made.description;
  description.level = level;
  description.width = size.width;
  description.height = size.height;
  description.place = table_->place;
  description.file = table_->file;
  description.method = method;
  const uint64_t pixels = uint64_t{description.width} * description.height;
  for (const unsigned number : channels) {
    MemoryLevelChannel& channel = made.channels[number - 1];
    if (channel.present) continue;
    channel.samples.assign(pixels * SampleBytes(table_->types[number - 1]), 0);
    channel.written.assign(pixels, false);
    channel.present = true;
  }
}

std::unique_ptr<datasources::IRasterWriter> MemoryLevels::OpenWriter(
    unsigned level, const std::vector<unsigned>& channels) {
  const std::lock_guard lock(table_->mutex);
  MemoryLevel& stored = PresentLevel(
      level, channels, "MemoryLevels::OpenWriter(unsigned int, const std::vector<unsigned int>&)");
  return std::make_unique<MemoryWriter>(
      table_, stored, channels, CommonType(table_->types, channels, table_->file), writable_);
}

void MemoryLevels::SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) {
  const char* function =
      "MemoryLevels::SetValid(unsigned int, const std::vector<unsigned int>&, bool)";
  RequireWritable(function);
  const std::lock_guard lock(table_->mutex);
  MemoryLevel& stored = PresentLevel(level, channels, function);
  for (const unsigned channel : channels)
    if (valid && !IsComplete(stored.channels[channel - 1]))
      throw Exception(FormatString(_("%s: level %u of channel %u is not complete."),
                                   table_->file.c_str(), level, channel),
                      kSource, function, 0);
  for (const unsigned channel : channels) stored.channels[channel - 1].valid = valid;
}

void MemoryLevels::Remove(const std::vector<unsigned>& levels) {
  RequireWritable("MemoryLevels::Remove(const std::vector<unsigned int>&)");
  const std::lock_guard lock(table_->mutex);
  for (const unsigned level : levels) table_->levels.erase(level);
}

}  // namespace orin::drivers
