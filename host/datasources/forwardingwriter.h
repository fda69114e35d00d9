/// A level's reader and writer that hands everything to another one; its heirs change a part.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <utility>
#include <vector>

#include "host/datasources/rasterwriter.h"

namespace orin::datasources {

class ForwardingWriter : public IRasterWriter {
 public:
  explicit ForwardingWriter(std::unique_ptr<IRasterWriter> level) : level_(std::move(level)) {}

  void SetMargin(unsigned x, unsigned y, int mode) override { level_->SetMargin(x, y, mode); }
  unsigned GetMarginX() const override { return level_->GetMarginX(); }
  unsigned GetMarginY() const override { return level_->GetMarginY(); }
  unsigned GetWidth() const override { return level_->GetWidth(); }
  unsigned GetHeight() const override { return level_->GetHeight(); }
  unsigned GetChannelCount() const override { return level_->GetChannelCount(); }
  const gobs::DataType& GetDataType() const override { return level_->GetDataType(); }
  unsigned GetLevel() const override { return level_->GetLevel(); }
  unsigned GetTileWidth() const override { return level_->GetTileWidth(); }
  unsigned GetTileHeight() const override { return level_->GetTileHeight(); }
  void SetTileSize(unsigned width, unsigned height) override { level_->SetTileSize(width, height); }
  void SetOptimalTileSize() override { level_->SetOptimalTileSize(); }
  AuxiliaryData GetAuxiliaryData() const override { return level_->GetAuxiliaryData(); }
  std::vector<unsigned> GetChannelsInfo() const override { return level_->GetChannelsInfo(); }
  void Read(gobs::Raster& block) override { level_->Read(block); }
  void Write(const gobs::Raster& block) override { level_->Write(block); }

 protected:
  IRasterWriter& Level() { return *level_; }

 private:
  std::unique_ptr<IRasterWriter> level_;
};

}  // namespace orin::datasources
