// SPDX-License-Identifier: MIT
#include "host/datasources/overviewaccessors.h"

#include <algorithm>
#include <string>
#include <utility>

#include "host/datasources/forwardingwriter.h"
#include "host/datasources/nodataanswers.h"
#include "host/datasources/withmemory.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

using IsWanted = bool (*)(const LevelDescription&);

std::vector<unsigned> LevelsOf(const ILevelStore* store, const std::vector<unsigned>& channels,
                               IsWanted isWanted) {
  std::vector<unsigned> levels;
  if (store)
    for (const LevelDescription& entry : store->List())
      if (isWanted(entry) && HoldsForAll(entry.presentChannels, channels))
        levels.push_back(entry.level);
  return levels;
}

/// A level in whose reading and writing any want of memory is a failure like all others.
class MemoryCheckedLevel final : public ForwardingWriter {
 public:
  MemoryCheckedLevel(std::unique_ptr<IRasterWriter> level, std::string file)
      : ForwardingWriter(std::move(level)), file_(std::move(file)) {}

  void Read(gobs::Raster& block) override {
    ReadWithMemory(file_, "MemoryCheckedLevel::Read(orin::gobs::Raster&)",
                   [&] { Level().Read(block); });
  }
  void Write(const gobs::Raster& block) override {
    WithMemory(file_,
               _("%s: its levels cannot be written: there is not enough memory. Free memory, then "
                 "run the same command again to resume."),
               "MemoryCheckedLevel::Write(const orin::gobs::Raster&)",
               [&] { Level().Write(block); });
  }

 private:
  std::string file_;
};

bool IsAny(const LevelDescription&) { return true; }
bool MayBeSource(const LevelDescription& entry) { return entry.status != LevelStatus::kStale; }

}  // namespace

BasicOverviewReaderAccessor::BasicOverviewReaderAccessor(IRasterDataset* dataset,
                                                         const std::vector<unsigned>& channels)
    : store_(dataset->GetSource()->Levels()), channels_(channels) {}

std::vector<unsigned> BasicOverviewReaderAccessor::GetLevels() const {
  return LevelsOf(store_, channels_, IsAny);
}

bool BasicOverviewReaderAccessor::IsLevelValid(unsigned level) const {
  if (!store_) return false;
  const std::vector<LevelDescription> levels = store_->List();
  const auto found = std::find_if(levels.begin(), levels.end(),
                                  [level](const LevelDescription& e) { return e.level == level; });
  return found != levels.end() && HoldsForAll(found->validChannels, channels_);
}

BasicOverviewWriterAccessor::BasicOverviewWriterAccessor(IRasterDataset* dataset,
                                                         const std::vector<unsigned>& channels)
    : store_(dataset->GetSource()->Levels()),
      noData_(dataset->GetNoDataAnswers()),
      channels_(channels),
      file_(dataset->GetFileName()) {}

ILevelStore& BasicOverviewWriterAccessor::Store() const {
  if (!store_)
    throw Exception(FormatString(_("%s: its format holds no levels."), file_.c_str()),
                    "host/datasources/overviewaccessors",
                    "orin::datasources::BasicOverviewWriterAccessor", 0);
  return *store_;
}

void BasicOverviewWriterAccessor::CreateLevel(unsigned level) {
  Store().Create(level, channels_, method_);
}

IRasterWriter* BasicOverviewWriterAccessor::CreateRasterWriter(unsigned level) {
  auto writer = noData_.ForLevel(Store().OpenWriter(level, channels_), channels_);
  return writer ? new MemoryCheckedLevel(std::move(writer), file_) : nullptr;
}

std::vector<unsigned> BasicOverviewWriterAccessor::GetLevels() const {
  return LevelsOf(store_, channels_, MayBeSource);
}

void BasicOverviewWriterAccessor::SetValid(unsigned channel, unsigned level, bool valid) {
  if (channel < 1 || channel > channels_.size())
    throw Exception(FormatString(_("%s: the accessor has no channel %u."), file_.c_str(), channel),
                    "host/datasources/overviewaccessors",
                    "orin::datasources::BasicOverviewWriterAccessor::SetValid(unsigned int, "
                    "unsigned int, bool)",
                    0);
  Store().SetValid(level, {channels_[channel - 1]}, valid);
}

void BasicOverviewWriterAccessor::SetLevelValid(unsigned level, bool valid) {
  Store().SetValid(level, channels_, valid);
}

}  // namespace orin::datasources
