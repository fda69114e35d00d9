/// An opened file, and an opened raster.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/datasources/channelinfo.h"
#include "host/datasources/overviewinfo.h"
#include "host/services/autoptr.h"

namespace orin::datasources {

class IRasterSource;
class NoDataAnswers;

enum AccessMode { kReadOnly = 0, kUpdate = 1 };

/// Describes the format through which a dataset is open.
class IFormatDescriptor {
 public:
  virtual ~IFormatDescriptor() = default;
  /// For users: "TIFF / GeoTIFF".
  virtual std::string GetDescription() const = 0;
  /// The format's code in the format table.
  virtual int GetCode() const = 0;
  /// "TIFF", "TESSRA" ...; "ZMBALL" for a dataset open through the generic layer.
  virtual std::string GetName() const = 0;
};

/// Objects that its operations return by pointer are new and belong to the caller.
class IDataset {
 public:
  virtual ~IDataset() = default;
  virtual IFormatDescriptor* GetFormatDescriptor() const = 0;
  virtual AccessMode GetAccessMode() const = 0;
  /// Code of the file's own format, also for a dataset open through the generic layer.
  virtual int GetFileFormatCode() const = 0;
  virtual std::string GetFileName() const = 0;
  /// True when the dataset holds pixels, which a dynamic cast to `IRasterDataset` reaches.
  virtual bool IsRaster() const = 0;
};

/// The name of the format through which `dataset` is open.
inline std::string FormatNameOf(const IDataset& dataset) {
  return HAutoPtr<IFormatDescriptor>(dataset.GetFormatDescriptor())->GetName();
}

class IRasterDataset : public IDataset {
 public:
  virtual unsigned GetWidth() const = 0;
  virtual unsigned GetHeight() const = 0;
  virtual unsigned GetChannelCount() const = 0;
  /// \param channel  1-based. \throws orin::DataException  no such channel
  virtual IChannelInfo* GetChannelInfo(unsigned channel) const = 0;
  /// The driver's side, for the contract's concrete classes; owned by the dataset.
  virtual IRasterSource* GetSource() = 0;
  /// The levels known at the time of the call; null when none can be.
  virtual IOverviewInfo* GetOverviewInfo() = 0;
  /// What readers answer about no data, and what that means for levels; owned by the dataset.
  virtual NoDataAnswers& GetNoDataAnswers() = 0;
};

}  // namespace orin::datasources
