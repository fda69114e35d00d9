/// The run: checks a request against its file, decides what is missing, and has it built.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <numeric>

#include "host/datasources/formats.h"
#include "host/datasources/overviewaccessors.h"
#include "host/model/levelsize.h"
#include "host/model/methods.h"
#include "host/services/autoptr.h"
#include "host/services/counter.h"
#include "host/services/exception.h"
#include "host/services/logger.h"
#include "host/services/text.h"
#include "host/services/warning.h"
#include "processes/overviews/createoverviews.h"
#include "processes/overviews/levelrun.h"
#include "processes/overviews/statusqueries.h"
#include "processes/qrtfilters/resamplers/factories.h"

namespace {

using orin::HAutoPtr;
using orin::datasources::IDataset;
using orin::datasources::IRasterDataset;
using orin::model::LevelSizeOf;
using orin::model::Method;
using Levels = std::vector<unsigned>;
using Channels = std::vector<unsigned>;

constexpr char kSource[] = "processes/overviews/createoverviews";

/// Reports a failed check. \returns false
bool Fail(const std::string& message, unsigned line) {
  orin::tarn::Warning::Warn(message, kSource, line);
  return false;
}

bool FailWith(const orin::Exception& exception) {
  // Texts that are fixed in English are translated here, where they are shown.
  return Fail(std::string(_("Failed to create overviews.\n")) + _(exception.GetMessage().c_str()),
              913);
}

Channels AllChannels(unsigned count) {
  Channels channels(count);
  std::iota(channels.begin(), channels.end(), 1u);
  return channels;
}

/// All channels but bit masks.
void AppendDefaultChannels(const IRasterDataset& raster, Channels& channels) {
  for (unsigned channel = 1; channel <= raster.GetChannelCount(); ++channel) {
    const HAutoPtr<orin::datasources::IChannelInfo> info(raster.GetChannelInfo(channel));
    if (info->GetDataType().bits > 1) channels.push_back(channel);
  }
}

bool CheckChannels(const Channels& channels, unsigned count) {
  for (const unsigned channel : channels)
    if (channel == 0 || channel > count)
      return Fail(_("Error. Expecting a non-zero value less than or equal to ") +
                      std::to_string(count) + ".",
                  609);
  return true;
}

bool CheckLevels(const Levels& levels, const IRasterDataset& raster, bool force) {
  for (size_t i = 0; i < levels.size(); ++i) {
    if (levels[i] < 2)
      return Fail(FormatString(_("OLEVELS[%d] = %d  - Levels must be 2 or greater.\n"), int(i + 1),
                               int(levels[i])),
                  625);
    if (force && LevelSizeOf(raster.GetWidth(), raster.GetHeight(), levels[i]).IsEmpty())
      return Fail(_("You cannot use level ") + std::to_string(levels[i]) +
                      _(" With a file with size ") + std::to_string(raster.GetWidth()) + "x" +
                      std::to_string(raster.GetHeight()) +
                      _(" or you will end up with a size 0 overview."),
                  641);
  }
  return true;
}

/// Checks that overviews asked to stand inside the file can.
bool CheckInternalPlacement(IDataset* dataset, bool readOnly) {
  if (!SupportsInternalOverviews(dataset)) {
    const ZMBInfo_s* format = ZMBInfo[ZMBTestOpen(dataset->GetFileName().c_str())];
    const std::string name =
        format ? format->description : orin::datasources::FormatNameOf(*dataset);
    return Fail(FormatString(_("Error. You have requested overviews be created internally (with "
                               "KVX=NO) but that is not supported for %s files."),
                             name.c_str()),
                658);
  }
  if (readOnly)
    return Fail(
        _("Error. You have requested overviews be created internally (with KVX=NO) but that "
          "is not possible for a read-only file."),
        670);
  return true;
}

/// The requested levels that do not exist or are not valid for all channels, ascending.
Levels MissingLevels(IRasterDataset& raster, const Levels& requested, const Channels& channels,
                     bool force) {
  Levels missing;
  const HAutoPtr<orin::datasources::IOverviewInfo> info(force ? nullptr : raster.GetOverviewInfo());
  const Levels existing = info ? info->GetLevels() : Levels();
  for (const unsigned level : requested) {
    const bool exists = std::find(existing.begin(), existing.end(), level) != existing.end();
    const bool upToDate =
        exists && std::all_of(channels.begin(), channels.end(),
                              [&](unsigned channel) { return info->IsLevelValid(channel, level); });
    if (!upToDate) missing.push_back(level);
  }
  std::sort(missing.begin(), missing.end());
  return missing;
}

bool BuildLevels(const orin::overviews::LevelRequest& request) {
  bool result = false;
  orin::tarn::Counter::Update(0.0f);
  try {
    result = orin::overviews::LevelRun(request).Build();
  } catch (const orin::Exception& exception) {
    FailWith(exception);
  }
  orin::tarn::Counter::Update(1.0f);
  return result;
}

}  // namespace

bool CreateFileOverviews::Generate() {
  try {
    IDataset* dataset = nullptr;
    const bool readOnly = OpenDataset(fileName_, &dataset);
    HAutoPtr<IDataset> holder(dataset);
    const auto* raster = dynamic_cast<IRasterDataset*>(dataset);
    if (!raster || raster->GetChannelCount() == 0) return false;
    Levels levels;
    if (!GetLevelsToCompute(dataset, levels) || levels.empty()) return false;
    return CreateOverviews(&dataset, readOnly, fileName_, type_, levels);
  } catch (const orin::Exception& exception) {
    return FailWith(exception);
  }
}

bool CreateFileOverviews::Generate(std::vector<std::string>& files) {
  bool result = !files.empty();
  for (size_t i = 0; i < files.size() && result; ++i) {
    if (&fileName_ != &files[i]) fileName_ = files[i];
    result = GenerateListed();
  }
  return result;
}

/// One file of a list: skipped without harm when it cannot be opened or has nothing to do.
bool CreateFileOverviews::GenerateListed() {
  try {
    IDataset* dataset = nullptr;
    const bool readOnly = OpenDataset(fileName_, &dataset);
    HAutoPtr<IDataset> holder(dataset);
    auto* raster = dynamic_cast<IRasterDataset*>(dataset);
    if (!raster) return true;
    const orin::datasources::BasicOverviewReaderAccessor existing(
        raster, AllChannels(raster->GetChannelCount()));
    if (const bool hasLevels = !existing.GetLevels().empty(); readOnly && hasLevels) return true;
    Levels levels;
    if (!GetLevelsToCompute(dataset, levels) || levels.empty()) return true;
    return CreateOverviews(&dataset, readOnly, fileName_, type_, levels);
  } catch (const orin::Exception& exception) {
    return FailWith(exception);
  }
}

bool CreateFileOverviews::CreateOverviews(IDataset** dataset, bool readOnly,
                                          std::string /*fileName*/, QRTOverviewResampleType type,
                                          std::vector<unsigned>& levels) {
  auto* raster = dynamic_cast<IRasterDataset*>(*dataset);
  if (!raster) return false;
  const bool isTiff = orin::datasources::FormatNameOf(**dataset).find("TIFF") != std::string::npos;
  if (channels_.empty()) AppendDefaultChannels(*raster, channels_);
  else if (!CheckChannels(channels_, raster->GetChannelCount())) return false;
  if (!CheckLevels(levels, *raster, force_)) return false;
  if (!external_ && !automatic_ && !CheckInternalPlacement(*dataset, readOnly)) return false;
  const bool hasComplex = HasComplex();
  const Method* const method = orin::model::FindMethod(type);
  const auto factory = orin::resamplers::MakeResamplerFactory(type);
  if (hasComplex && !(method && method->takesComplex))
    return Fail(_("Only AVER or NEAREST is supported for complex data."), 698);
  if (channels_.empty()) return true;  // only bit masks: they have no overviews
  const Levels missing = MissingLevels(*raster, levels, channels_, force_);
  if (missing.empty()) {
    orin::tarn::Logger::LogEvent(
        _("No processing required. The requested overviews already exist and are up-to-date."),
        kSource, 724);
    return true;
  }
  return BuildLevels({raster, channels_, missing, factory.get(),
                      std::string(method ? method->name : ""), isTiff,
                      method && method->needsDivisor, progress_});
}
