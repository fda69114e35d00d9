// SPDX-License-Identifier: MIT
#include "tests/testing/recordinghost.h"

#include <algorithm>
#include <utility>

#include "host/drivers/memory/memoryplane.h"
#include "host/services/exception.h"
#include "host/services/text.h"
#include "host/services/warning.h"
#include "tests/testing/recordingobjects.h"

namespace orin::testing {

using datasources::AccessMode;
using datasources::FormatRegistry;
using datasources::LevelPlace;

class RecordingHost::Driver final : public datasources::IFormatDriver {
 public:
  explicit Driver(RecordingHost& host) : host_(host) {}

  std::vector<ZMBInfo_s> Formats() const override { return host_.formats_; }

  ZMBFormatType Identify(const std::string& file) const override {
    const auto found = host_.files_.find(file);
    return found == host_.files_.end() ? kFormatUnknown : found->second.code;
  }

  std::unique_ptr<datasources::IRasterSource> Open(const std::string& file,
                                                   AccessMode access) override {
    const bool update = access == datasources::kUpdate;
    host_.recorder_->Call("Open", "Open(" + file + (update ? ",update)" : ",read)"));
    const File& opened = host_.files_.at(file);
    if (update && opened.entry->raster.readOnly)
      throw Exception(file + ": cannot be changed: it is read-only.", "tests/testing/recordinghost",
                      "Open", 0);
    return Recorded(host_.recorder_, OpenMemorySource(opened.entry, update),
                    HoldsLevels(opened.code));
  }

 private:
  bool HoldsLevels(int code) const {
    return std::any_of(host_.formats_.begin(), host_.formats_.end(),
                       [code](const ZMBInfo_s& format) {
                         return format.code == code && format.nativeOverviews != 0;
                       });
  }

  RecordingHost& host_;
};

class RecordingHost::SideCar final : public datasources::ISideCarFormat {
 public:
  explicit SideCar(RecordingHost& host) : host_(host) {}

  std::unique_ptr<datasources::ILevelStore> Open(const std::string& imageFile,
                                                 datasources::IRasterSource&) override {
    host_.recorder_->Call("SideCar.Open", "sidecar.Open(" + imageFile + ")");
    return Recorded(
        host_.recorder_,
        std::make_unique<drivers::MemoryLevels>(host_.files_.at(imageFile).sideCar, true),
        "sidecar");
  }

 private:
  RecordingHost& host_;
};

RecordingHost::RecordingHost(std::vector<ZMBInfo_s> formats) : formats_(std::move(formats)) {
  FormatRegistry& registry = FormatRegistry::Instance();
  registry.Clear();
  registry.Register(std::make_shared<Driver>(*this));
  registry.SetSideCarFormat(std::make_shared<SideCar>(*this));
  const auto line = [](const char* kind, const tarn::Report& report) {
    return std::string(kind) + "(" + report.message + "," + report.sourceFile + "," +
           std::to_string(report.line) + ")";
  };
  formerEvents_ = tarn::Logger::SetSink([this, line](const tarn::Report& report) {
    events_.push_back(report);
    recorder_->Note(line("LogEvent", report));
  });
  formerWarnings_ = tarn::Warning::SetSink([this, line](const tarn::Report& report) {
    warnings_.push_back(report);
    recorder_->Note(line("Warn", report));
  });
  formerProgress_ = tarn::Counter::SetSink(
      [this](float fraction, const std::string* message) { return OnProgress(fraction, message); });
}

RecordingHost::~RecordingHost() {
  tarn::Logger::SetSink(std::move(formerEvents_));
  tarn::Warning::SetSink(std::move(formerWarnings_));
  tarn::Counter::SetSink(std::move(formerProgress_));
  FormatRegistry::Instance().Clear();
}

std::vector<ZMBInfo_s> RecordingHost::DefaultFormats() {
  return {{"TIFF", "TIFF / GeoTIFF", kFormatTiff, 1},
          {"TESSRA", "memory raster", kFormatMemory, 1},
          {"ODD", "odd raster", 99, 0}};
}

void RecordingHost::Put(const std::string& file, drivers::MemoryRaster raster, int code) {
  auto entry = drivers::MakeMemoryEntry(file, std::move(raster));
  auto sideCar = std::make_shared<drivers::MemoryLevelTable>();
  sideCar->file = file + ".sidecar";
  sideCar->width = entry->levels->width;
  sideCar->height = entry->levels->height;
  sideCar->place = LevelPlace::kSideCar;
  sideCar->types = entry->levels->types;
  files_[file] = {std::move(entry), std::move(sideCar), code};
}

drivers::MemoryLevelTable& RecordingHost::Levels(const std::string& file, LevelPlace place) {
  const File& found = files_.at(file);
  return place == LevelPlace::kInternal ? *found.entry->levels : *found.sideCar;
}

void RecordingHost::AddLevel(const std::string& file, unsigned level, bool valid,
                             LevelPlace place) {
  drivers::MemoryLevelTable& table = Levels(file, place);
  drivers::MemoryLevel& added = table.levels[level];
  added.description.level = level;
  added.description.width = table.width / level;
  added.description.height = table.height / level;
  added.description.place = place;
  added.description.file = table.file;
  added.description.method = "NEAREST";
  const uint64_t pixels = uint64_t{table.width / level} * (table.height / level);
  added.channels.clear();
  for (const gobs::DataType& type : table.types)
    added.channels.push_back({std::vector<unsigned char>(pixels * drivers::SampleBytes(type)),
                              std::vector<bool>(pixels, true), true, valid});
}

std::vector<std::string> RecordingHost::Log(const std::string& start) const {
  std::vector<std::string> lines = recorder_->Log();
  std::erase_if(lines, [&start](const std::string& line) { return line.rfind(start, 0) != 0; });
  return lines;
}

void RecordingHost::Clear() {
  recorder_->Clear();
  warnings_.clear();
  events_.clear();
  progress_.clear();
  refuseAfter_ = 0;
  refuseOnwards_ = false;
}

void RecordingHost::RefuseProgressAt(size_t n, bool onwards) {
  refuseAfter_ = n;
  refuseOnwards_ = onwards;
}

bool RecordingHost::OnProgress(float fraction, const std::string* message) {
  progress_.push_back(fraction);
  recorder_->Note(message ? FormatString("Update(%g,%s)", fraction, message->c_str())
                          : FormatString("Update(%g)", fraction));
  if (refuseAfter_ == 0) return true;
  if (refuseAfter_ > 1) {
    --refuseAfter_;
    return true;
  }
  if (!refuseOnwards_) refuseAfter_ = 0;
  return false;
}

}  // namespace orin::testing
