// SPDX-License-Identifier: MIT
#include "host/datasources/sourcedataset.h"

#include <algorithm>
#include <utility>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

class TableFormat final : public IFormatDescriptor {
 public:
  explicit TableFormat(const ZMBInfo_s& record) : record_(record) {}
  std::string GetDescription() const override { return record_.description; }
  int GetCode() const override { return record_.code; }
  std::string GetName() const override { return record_.name; }

 private:
  const ZMBInfo_s& record_;
};

class TypeInfo final : public IChannelInfo {
 public:
  explicit TypeInfo(const gobs::DataType& type) : type_(type) {}
  const gobs::DataType& GetDataType() const override { return type_; }

 private:
  gobs::DataType type_;
};

/// A snapshot of a store's list.
class ListedOverviews final : public IOverviewInfo {
 public:
  explicit ListedOverviews(std::vector<LevelDescription> levels) : levels_(std::move(levels)) {}

  std::vector<unsigned> GetLevels() const override {
    std::vector<unsigned> factors;
    for (const LevelDescription& entry : levels_) factors.push_back(entry.level);
    return factors;
  }
  std::vector<LevelDescription> Describe() const override { return levels_; }
  std::string GetResamplingName(unsigned level) const override {
    const LevelDescription* entry = Find(level);
    return entry ? entry->method : "";
  }
  bool IsLevelValid(unsigned channel, unsigned level) const override {
    const LevelDescription* entry = Find(level);
    return entry && HoldsForAll(entry->validChannels, {channel});
  }

 private:
  const LevelDescription* Find(unsigned level) const {
    const auto found =
        std::find_if(levels_.begin(), levels_.end(),
                     [level](const LevelDescription& e) { return e.level == level; });
    return found == levels_.end() ? nullptr : &*found;
  }

  std::vector<LevelDescription> levels_;
};

}  // namespace

SourceDataset::SourceDataset(std::unique_ptr<IRasterSource> source, std::string fileName,
                             AccessMode access, int formatCode, int fileCode)
    : source_(std::move(source)),
      fileName_(std::move(fileName)),
      access_(access),
      formatCode_(formatCode),
      fileCode_(fileCode) {}

IFormatDescriptor* SourceDataset::GetFormatDescriptor() const {
  const ZMBInfo_s* record = ZMBGetFormatInfo(formatCode_);
  return new TableFormat(record ? *record : *ZMBInfo[0]);
}

IChannelInfo* SourceDataset::GetChannelInfo(unsigned channel) const {
  if (channel < 1 || channel > GetChannelCount())
    throw DataException(FormatString(_("%s: there is no channel %u; the file has %u."),
                                     fileName_.c_str(), channel, GetChannelCount()),
                        "host/datasources/sourcedataset",
                        "orin::datasources::SourceDataset::GetChannelInfo(unsigned int) const", 0);
  return new TypeInfo(source_->TypeOf(channel));
}

IOverviewInfo* SourceDataset::GetOverviewInfo() {
  ILevelStore* store = source_->Levels();
  return store ? new ListedOverviews(store->List()) : nullptr;
}

}  // namespace orin::datasources
