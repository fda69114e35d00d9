// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/hfalevelstore.h"

#include <algorithm>
#include <filesystem>
#include <set>
#include <utility>

#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/hfalevelwriter.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::LevelDescription;

double SampleBytes(const gobs::DataType& type) {
  return double(BytesPerComponent(type)) * ComponentsPerSample(type);
}

uint64_t FileBytes(const std::string& path) {
  std::error_code ignored;
  const auto size = std::filesystem::file_size(path, ignored);
  return ignored ? 0 : size;
}

/// Levels 2, 4, 8 ... take a third of the image.
bool HasRoom(const std::string& path, const datasources::IRasterSource& image) {
  double bytes = 0;
  for (unsigned channel = 1; channel <= image.ChannelCount(); ++channel)
    bytes += double(image.Width()) * image.Height() * SampleBytes(image.TypeOf(channel));
  return double(FileBytes(path)) + bytes * 0.35 < double(kMostHfaBytes);
}

[[noreturn]] void Refuse(const char* format, const std::string& name) {
  throw Exception(FormatString(format, name.c_str()), "host/drivers/gdal/hfalevelstore",
                  "orin::drivers::OpenHfaLevels", 0);
}

}  // namespace

std::unique_ptr<datasources::ILevelStore> OpenHfaLevels(const std::string& name,
                                                        const GdalFormat& format,
                                                        datasources::IRasterSource& image,
                                                        SourceUse use) {
  std::error_code none;
  const std::filesystem::path real = std::filesystem::canonical(name, none);
  const std::string path = none ? name : real.string();
  const HfaPyramid pyramid = ReadHfaPyramid(path);
  const bool isForeign =
      pyramid.NamesAnotherFileThan(std::filesystem::path(path).filename().string());
  if (use != SourceUse::kRead && isForeign)
    Refuse(_("%s: holds a list of levels under another file's name, for it was copied or renamed; "
             "levels inside it would change that file."),
           name);
  if (use == SourceUse::kUpdate && (pyramid.isSpilled || !HasRoom(path, image)))
    Refuse(_("%s: would grow beyond the 2 GB that the format keeps in one file."), name);
  if (isForeign) return nullptr;
  return std::make_unique<HfaLevelStore>(path, format, image, use != SourceUse::kRead);
}

HfaLevelStore::HfaLevelStore(std::string path, const GdalFormat& format,
                             datasources::IRasterSource& image, bool mayChange)
    : path_(std::move(path)),
      format_(format),
      image_(image),
      mayChange_(mayChange),
      watch_(image.Watch()) {
  Reload();
}

HfaLevelStore::~HfaLevelStore() {
  if (build_) EndWriting(*build_);
  try {
    if (isChanged_) GiveBackSpace();
    Settle();
  } catch (const std::exception&) {
    // deliberate: nothing is lost but space, which the next change finds again
  }
}

void HfaLevelStore::Fail(const char* format, unsigned level) const {
  throw Exception(FormatString(format, path_.c_str(), level), "host/drivers/gdal/hfalevelstore",
                  "orin::drivers::HfaLevelStore", 0);
}

void HfaLevelStore::Reload() {
  pyramid_ = ReadHfaPyramid(path_);
  records_.clear();
  const GdalHandle handle(path_, format_);
  const GdalErrors quiet;
  for (const auto& names : pyramid_.channels)
    for (const HfaLevelName& name : names) {
      const char* text = GDALGetMetadataItem(handle.Get(), HfaRecordKey(name.factor).c_str(), "");
      const auto record = ParseHfaRecord(text ? text : "", image_.ChannelCount());
      if (record) records_[name.factor] = *record;
    }
}

/// Keeps other builds away until the store goes.
void HfaLevelStore::LockFile() {
  if (lock_) return;
  auto file = std::make_unique<PositionedFile>(path_, PositionedFile::Mode::kUpdate);
  file->Lock();
  lock_ = std::move(file);
}

/// The format rounds up; what we make ends where it should.
unsigned HfaLevelStore::WidthOf(unsigned level, bool isOurs) const {
  return image_.Width() / level + (!isOurs && image_.Width() % level != 0);
}
unsigned HfaLevelStore::HeightOf(unsigned level, bool isOurs) const {
  return image_.Height() / level + (!isOurs && image_.Height() % level != 0);
}

/// \param fingerprint  of the image now; empty when it is unknown
LevelDescription HfaLevelStore::Describe(unsigned level, const std::string& fingerprint) const {
  const auto record = records_.find(level);
  const auto pending = pending_.find(level);
  const bool isOurs = record != records_.end() || pending != pending_.end();
  LevelDescription entry;
  entry.level = level;
  entry.width = WidthOf(level, isOurs);
  entry.height = HeightOf(level, isOurs);
  entry.file = path_;
  entry.status = StatusOf(level, fingerprint);
  const bool isStale = entry.status == datasources::LevelStatus::kStale;
  for (unsigned channel = 1; channel <= image_.ChannelCount(); ++channel) {
    const bool isStored = pyramid_.Find(channel, level) >= 0;
    const bool isPending = pending != pending_.end() && pending->second.channels[channel - 1];
    const bool isValid =
        record != records_.end() ? record->second.validity[channel - 1] == kHfaValid : !isPending;
    entry.presentChannels.push_back(isStored || isPending);
    entry.validChannels.push_back(isStored && isValid && !isStale);
  }
  if (record != records_.end()) {
    entry.method = record->second.method;
    entry.sourceLevel = record->second.sourceLevel;
    entry.program = record->second.program;
    entry.image = record->second.image;
  } else if (isOurs) {
    entry.method = pending->second.method;
    entry.program = HfaProgramName();
  }
  return entry;
}

std::vector<LevelDescription> HfaLevelStore::List() const {
  const std::lock_guard lock(mutex_);
  std::set<unsigned> levels;
  for (const auto& names : pyramid_.channels)
    for (const HfaLevelName& name : names)
      if (name.factor >= 2) levels.insert(name.factor);
  for (const auto& [level, pending] : pending_) levels.insert(level);
  std::vector<LevelDescription> list;
  const std::string fingerprint = FingerprintNow();
  for (const unsigned level : levels) list.push_back(Describe(level, fingerprint));
  return list;
}

void HfaLevelStore::Create(unsigned level, const std::vector<unsigned>& channels,
                           const std::string& method) {
  const std::lock_guard lock(mutex_);
  if (!mayChange_) Fail(_("%s: is open for reading only; level %u cannot be made."), level);
  Pending& pending = pending_[level];
  pending.channels.resize(image_.ChannelCount());
  for (const unsigned channel : channels) pending.channels.at(channel - 1) = true;
  pending.method = method;
  lastRead_ = 0;
}

std::unique_ptr<datasources::IRasterWriter> HfaLevelStore::OpenWriter(
    unsigned level, const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  for (const unsigned channel : channels) {
    const auto pending = pending_.find(level);
    const bool isPending = pending != pending_.end() && pending->second.channels.at(channel - 1);
    if (!isPending && pyramid_.Find(channel, level) < 0) Fail(_("%s: has no level %u."), level);
    if (!(image_.TypeOf(channel) == image_.TypeOf(channels.front())))
      Fail(_("%s: the channels of level %u differ in type; they cannot be treated together."),
           level);
  }
  const bool isOurs = records_.contains(level) || pending_.contains(level);
  HfaLevelWriter::Level what{path_,
                             level,
                             WidthOf(level, isOurs),
                             HeightOf(level, isOurs),
                             channels,
                             image_.TypeOf(channels.empty() ? 1 : channels.front()),
                             image_.MetadataOf(channels),
                             {}};
  for (const unsigned channel : channels) what.storedBits.push_back(image_.StoredBitsOf(channel));
  return std::make_unique<HfaLevelWriter>(*this, std::move(what));
}

std::vector<int> HfaLevelStore::PositionsOf(unsigned level, const std::vector<unsigned>& channels) {
  const std::lock_guard lock(mutex_);
  std::vector<int> positions;
  for (const unsigned channel : channels) {
    positions.push_back(pyramid_.Find(channel, level));
    if (positions.back() < 0) Fail(_("%s: level %u is not finished and cannot be read."), level);
  }
  if (!pending_.contains(level)) lastRead_ = level;
  return positions;
}

}  // namespace orin::drivers
