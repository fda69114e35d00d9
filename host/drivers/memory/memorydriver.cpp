// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memorydriver.h"

#include <memory>
#include <mutex>

#include "host/datasources/formats.h"
#include "host/drivers/memory/memorysource.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::AccessMode;

constexpr char kSource[] = "host/drivers/memory/memorydriver";

/// The named rasters. Opened datasets share their entry, so that a name can go before them.
class Names {
 public:
  static Names& Instance() {
    static Names names;
    return names;
  }

  void Put(const std::string& name, std::shared_ptr<MemoryEntry> entry) {
    const std::lock_guard lock(mutex_);
    entries_[name] = std::move(entry);
  }
  void Remove(const std::string& name) {
    const std::lock_guard lock(mutex_);
    entries_.erase(name);
  }
  /// Null when nothing has the name.
  std::shared_ptr<MemoryEntry> Find(const std::string& name) const {
    const std::lock_guard lock(mutex_);
    const auto found = entries_.find(name);
    return found == entries_.end() ? nullptr : found->second;
  }

 private:
  std::map<std::string, std::shared_ptr<MemoryEntry>> entries_;
  mutable std::mutex mutex_;
};

class MemoryDriver final : public datasources::IFormatDriver {
 public:
  std::vector<ZMBInfo_s> Formats() const override {
    return {{"TESSRA", "memory raster", kFormatMemory, 1}};
  }
  ZMBFormatType Identify(const std::string& file) const override {
    return Names::Instance().Find(file) ? kFormatMemory : kFormatUnknown;
  }
  std::unique_ptr<datasources::IRasterSource> Open(const std::string& file,
                                                   AccessMode access) override {
    const auto refuse = [](const std::string& text) {
      throw Exception(text, kSource,
                      "MemoryDriver::Open(const std::string&, orin::datasources::AccessMode)", 0);
    };
    std::shared_ptr<MemoryEntry> entry = Names::Instance().Find(file);
    if (!entry)
      refuse(FormatString(_("%s: there is no memory raster of that name."), file.c_str()));
    const bool update = access == datasources::kUpdate;
    if (update && entry->raster.readOnly)
      refuse(FormatString(_("%s: cannot be changed: it is read-only."), file.c_str()));
    return OpenMemorySource(std::move(entry), update);
  }
};

}  // namespace

void RegisterMemoryDriver() {
  datasources::FormatRegistry::Instance().Register(std::make_shared<MemoryDriver>());
}

void PutMemoryRaster(const std::string& name, MemoryRaster raster) {
  Names::Instance().Put(name, MakeMemoryEntry(name, std::move(raster)));
}

void RemoveMemoryRaster(const std::string& name) { Names::Instance().Remove(name); }

std::vector<unsigned char> MemoryLevelSamples(const std::string& name, unsigned channel,
                                              unsigned level) {
  const std::shared_ptr<MemoryEntry> entry = Names::Instance().Find(name);
  if (!entry || channel < 1 || channel > entry->raster.channels.size()) return {};
  if (level == 1) return entry->raster.channels[channel - 1].samples;
  const std::lock_guard lock(entry->levels->mutex);
  const auto found = entry->levels->levels.find(level);
  if (found == entry->levels->levels.end()) return {};
  return found->second.channels[channel - 1].samples;
}

}  // namespace orin::drivers
