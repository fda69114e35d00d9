/// The host's reader of full-resolution pixels.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "host/datasources/rasterreader.h"

namespace orin::datasources {

/// Forwards to a reader of the dataset's driver.
class BasicReader : public IRasterReader {
 public:
  /// \param dataset   outlives the reader
  /// \param channels  1-based, all of one data type
  /// \throws orin::DataException  the dataset is no raster or has no such channel
  /// \throws orin::Exception      the driver cannot read them
  BasicReader(IDataset* dataset, const std::vector<unsigned>& channels, bool);
  ~BasicReader() override;

  void SetMargin(unsigned x, unsigned y, int mode) override { reader_->SetMargin(x, y, mode); }
  unsigned GetMarginX() const override { return reader_->GetMarginX(); }
  unsigned GetMarginY() const override { return reader_->GetMarginY(); }
  unsigned GetWidth() const override { return reader_->GetWidth(); }
  unsigned GetHeight() const override { return reader_->GetHeight(); }
  unsigned GetChannelCount() const override { return reader_->GetChannelCount(); }
  const gobs::DataType& GetDataType() const override { return reader_->GetDataType(); }
  unsigned GetLevel() const override { return reader_->GetLevel(); }
  unsigned GetTileWidth() const override { return reader_->GetTileWidth(); }
  unsigned GetTileHeight() const override { return reader_->GetTileHeight(); }
  void SetTileSize(unsigned width, unsigned height) override {
    reader_->SetTileSize(width, height);
  }
  void SetOptimalTileSize() override { reader_->SetOptimalTileSize(); }
  /// \throws orin::OutOfMemory  whatever in the driver wanted memory
  void Read(gobs::Raster& block) override;
  /// With no-data values as a run can take them; the first question may have the image searched for
  /// a value that does not occur.
  /// \throws orin::Exception  the image cannot be opened for that
  /// \throws orin::Cancelled  the user asked to stop the search
  AuxiliaryData GetAuxiliaryData() const override;
  std::vector<unsigned> GetChannelsInfo() const override { return reader_->GetChannelsInfo(); }

 private:
  std::string file_;
  NoDataAnswers* noData_;
  std::unique_ptr<IRasterReader> reader_;
};

}  // namespace orin::datasources
