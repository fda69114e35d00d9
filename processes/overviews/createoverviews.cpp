// SPDX-License-Identifier: MIT
#include "processes/overviews/createoverviews.h"

#include <algorithm>
#include <numeric>
#include <optional>

#include "host/services/autoptr.h"
#include "host/services/exception.h"
#include "processes/overviews/levelplanning.h"
#include "processes/overviews/opening.h"

namespace {

using orin::HAutoPtr;
using orin::datasources::IDataset;
using orin::datasources::IRasterDataset;

constexpr unsigned kDefaultFactor = 2;
/// Marks that explicit levels are in force.
constexpr unsigned kExplicitLevels = 0x7FFFFFFF;

}  // namespace

// Deliberate: only the constructors that name a file ask for the user's factor.
CreateFileOverviews::CreateFileOverviews()
    : type_(GetDefaultPyramidType()), factor_(kDefaultFactor) {}

CreateFileOverviews::CreateFileOverviews(const std::string& file)
    : CreateFileOverviews(file, std::vector<unsigned>()) {}

CreateFileOverviews::CreateFileOverviews(const std::string& file,
                                         const std::vector<unsigned>& channels)
    : fileName_(file),
      type_(GetDefaultPyramidType()),
      factor_(GetDefaultDecimationLevels()),
      channels_(channels) {}

CreateFileOverviews::CreateFileOverviews(const CreateFileOverviews&) = default;
CreateFileOverviews& CreateFileOverviews::operator=(const CreateFileOverviews&) = default;
CreateFileOverviews::~CreateFileOverviews() = default;

void CreateFileOverviews::SaveToKvx(bool external) {
  external_ = external;
  automatic_ = false;
}

void CreateFileOverviews::SetPyramidFactor(unsigned factor, bool force) {
  factor_ = factor;
  levels_.clear();
  force_ = force;
}

void CreateFileOverviews::SetPyramidLevels(const std::vector<unsigned>& levels, bool force) {
  factor_ = kExplicitLevels;
  levels_ = levels;
  force_ = force;
}

void CreateFileOverviews::SetPyramidType(QRTOverviewResampleType type) {
  type_ = type == ResampleInvalid ? GetDefaultPyramidType() : type;
}

void CreateFileOverviews::ShowProgress(bool on) { progress_ = on; }

bool CreateFileOverviews::OpenDataset(const std::string& name, IDataset** out) const {
  if (!out) return false;
  *out = nullptr;
  bool readOnly = false;
  try {
    const auto external = automatic_ ? std::nullopt : std::optional<bool>(external_);
    *out = orin::overviews::OpenForOverviews(name, external, readOnly).release();
  } catch (const orin::Exception&) {
    // deliberate: no dataset is the answer
  }
  return readOnly;
}

bool CreateFileOverviews::FileExists() const {
  IDataset* dataset = nullptr;
  OpenDataset(fileName_, &dataset);
  const HAutoPtr<IDataset> holder(dataset);
  return dataset != nullptr;
}

bool CreateFileOverviews::RasterDataExists() const {
  IDataset* dataset = nullptr;
  OpenDataset(fileName_, &dataset);
  const HAutoPtr<IDataset> holder(dataset);
  return dynamic_cast<IRasterDataset*>(dataset) != nullptr;
}

bool CreateFileOverviews::ValidChannelList() const {
  IDataset* dataset = nullptr;
  OpenDataset(fileName_, &dataset);
  const HAutoPtr<IDataset> holder(dataset);
  const auto* raster = dynamic_cast<IRasterDataset*>(dataset);
  if (!raster) return channels_.empty();
  const unsigned count = raster->GetChannelCount();
  return std::all_of(channels_.begin(), channels_.end(),
                     [count](unsigned channel) { return channel >= 1 && channel <= count; });
}

bool CreateFileOverviews::HasComplex() {
  IDataset* dataset = nullptr;
  OpenDataset(fileName_, &dataset);
  const HAutoPtr<IDataset> holder(dataset);
  const auto* raster = dynamic_cast<IRasterDataset*>(dataset);
  if (!raster) return false;
  std::vector<unsigned> channels = channels_;
  if (channels.empty()) {
    channels.resize(raster->GetChannelCount());
    std::iota(channels.begin(), channels.end(), 1u);
  }
  const unsigned count = raster->GetChannelCount();
  return std::any_of(channels.begin(), channels.end(), [raster, count](unsigned channel) {
    if (channel < 1 || channel > count) return false;
    const HAutoPtr<orin::datasources::IChannelInfo> info(raster->GetChannelInfo(channel));
    return info->GetDataType().isComplex;
  });
}
