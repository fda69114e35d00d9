/// A raster dataset over a driver's source: what every driver returns.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "host/datasources/dataset.h"
#include "host/datasources/formats.h"
#include "host/datasources/levelstore.h"
#include "host/datasources/nodataanswers.h"

namespace orin::datasources {

class SourceDataset final : public IRasterDataset {
 public:
  /// \param formatCode  of the format through which the dataset is open
  /// \param fileCode    of the file's own format; the same unless opened through the generic layer
  SourceDataset(std::unique_ptr<IRasterSource> source, std::string fileName, AccessMode access,
                int formatCode, int fileCode);

  IFormatDescriptor* GetFormatDescriptor() const override;
  AccessMode GetAccessMode() const override { return access_; }
  int GetFileFormatCode() const override { return fileCode_; }
  std::string GetFileName() const override { return fileName_; }
  bool IsRaster() const override { return true; }
  unsigned GetWidth() const override { return source_->Width(); }
  unsigned GetHeight() const override { return source_->Height(); }
  unsigned GetChannelCount() const override { return source_->ChannelCount(); }
  IChannelInfo* GetChannelInfo(unsigned channel) const override;
  IRasterSource* GetSource() override { return source_.get(); }
  IOverviewInfo* GetOverviewInfo() override;
  NoDataAnswers& GetNoDataAnswers() override { return noDataAnswers_; }

 private:
  std::unique_ptr<IRasterSource> source_;
  NoDataAnswers noDataAnswers_{*source_};
  std::string fileName_;
  AccessMode access_;
  int formatCode_;
  int fileCode_;
};

}  // namespace orin::datasources
