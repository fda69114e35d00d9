// SPDX-License-Identifier: MIT
#include "processes/overviews/createoverviews.h"

#include <algorithm>
#include <numeric>

#include "host/datasources/datasetmanager.h"
#include "host/services/autoptr.h"
#include "host/services/exception.h"
#include "processes/overviews/levelplanning.h"
#include "processes/overviews/statusqueries.h"

namespace {

using orin::HAutoPtr;
using orin::datasources::AccessMode;
using orin::datasources::DatasetManager;
using orin::datasources::IDataset;
using orin::datasources::IRasterDataset;

constexpr unsigned kDefaultFactor = 2;
/// Marks that explicit levels are in force.
constexpr unsigned kExplicitLevels = 0x7FFFFFFF;

/// Null when the host refuses to open the file.
HAutoPtr<IDataset> TryOpen(const std::string& name, AccessMode access) {
  try {
    return HAutoPtr<IDataset>(DatasetManager::GetInstance()->Open(name, access));
  } catch (const orin::Exception&) {
    return nullptr;
  }
}

HAutoPtr<IDataset> TryOpenGenerically(const std::string& name, AccessMode access) {
  try {
    return HAutoPtr<IDataset>(DatasetManager::GetInstance()->OpenFormat("ZMBALL", name, access));
  } catch (const orin::Exception&) {
    return nullptr;
  }
}

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
  HAutoPtr<IDataset> dataset = TryOpen(name, orin::datasources::kUpdate);
  const bool readOnly = !dataset;
  if (readOnly) dataset = TryOpen(name, orin::datasources::kReadOnly);
  if (!dataset) return readOnly;
  const bool alreadyGeneric =
      orin::datasources::FormatNameOf(*dataset).find("ZMB") != std::string::npos;
  const bool outside =
      automatic_ ? readOnly || !SupportsInternalOverviews(dataset.get()) : external_;
  if (!alreadyGeneric && outside) {
    dataset.reset();
    dataset = TryOpenGenerically(
        name, readOnly ? orin::datasources::kReadOnly : orin::datasources::kUpdate);
  }
  *out = dataset.release();
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
  return std::any_of(channels.begin(), channels.end(), [raster](unsigned channel) {
    const HAutoPtr<orin::datasources::IChannelInfo> info(raster->GetChannelInfo(channel));
    return info->GetDataType().isComplex;
  });
}
