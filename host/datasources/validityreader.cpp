// SPDX-License-Identifier: MIT
#include "host/datasources/validityreader.h"

#include <algorithm>
#include <optional>
#include <utility>
#include <vector>

namespace orin::datasources {
namespace {

class ValidityAddingReader final : public IRasterReader {
 public:
  /// \param alphaPosition  0-based within the reader's channels
  ValidityAddingReader(std::unique_ptr<IRasterReader> pixels, std::optional<uint32_t> alphaPosition,
                       std::unique_ptr<IValidityReader> validity)
      : pixels_(std::move(pixels)), alphaPosition_(alphaPosition), validity_(std::move(validity)) {}

  void SetMargin(unsigned x, unsigned y, int mode) override { pixels_->SetMargin(x, y, mode); }
  unsigned GetMarginX() const override { return pixels_->GetMarginX(); }
  unsigned GetMarginY() const override { return pixels_->GetMarginY(); }
  unsigned GetWidth() const override { return pixels_->GetWidth(); }
  unsigned GetHeight() const override { return pixels_->GetHeight(); }
  unsigned GetChannelCount() const override { return pixels_->GetChannelCount(); }
  const gobs::DataType& GetDataType() const override { return pixels_->GetDataType(); }
  unsigned GetLevel() const override { return pixels_->GetLevel(); }
  unsigned GetTileWidth() const override { return pixels_->GetTileWidth(); }
  unsigned GetTileHeight() const override { return pixels_->GetTileHeight(); }
  void SetTileSize(unsigned width, unsigned height) override {
    pixels_->SetTileSize(width, height);
  }
  void SetOptimalTileSize() override { pixels_->SetOptimalTileSize(); }
  std::vector<unsigned> GetChannelsInfo() const override { return pixels_->GetChannelsInfo(); }

  void Read(gobs::Raster& block) override {
    pixels_->Read(block);
    if (alphaPosition_) AddOpacity(*alphaPosition_, block);
    if (validity_) AddValidity(*validity_, block);
  }

  AuxiliaryData GetAuxiliaryData() const override {
    AuxiliaryData metadata = pixels_->GetAuxiliaryData();
    model::SourceFacts& facts = metadata.Facts();
    facts.carriesValidity = true;
    facts.channels.resize(GetChannelCount());
    if (alphaPosition_) facts.channels[*alphaPosition_].isAlpha = true;
    if (facts.First()) return metadata;
    metadata.DeclareNoData(*model::NoData::Parse("0", model::NoDataOrigin::kNowhere));
    facts.noDataIsFill = true;
    return metadata;
  }

 private:
  std::unique_ptr<IRasterReader> pixels_;
  std::optional<uint32_t> alphaPosition_;
  std::unique_ptr<IValidityReader> validity_;
};

}  // namespace

std::unique_ptr<IRasterReader> WithValidity(std::unique_ptr<IRasterReader> pixels,
                                            ValidityParts parts) {
  const std::vector<unsigned> channels = pixels->GetChannelsInfo();
  const auto alpha = std::find(channels.begin(), channels.end(), parts.alphaChannel);
  std::optional<uint32_t> position;
  if (alpha != channels.end()) position = static_cast<uint32_t>(alpha - channels.begin());
  ValidityReaders readers;
  readers.push_back(std::move(parts.mask));
  if (parts.alphaChannel != 0 && !position) readers.push_back(OpaquePixelsOf(parts.openAlpha()));
  auto validity = AllOf(std::move(readers));
  if (!validity && !position) return pixels;
  return std::make_unique<ValidityAddingReader>(std::move(pixels), position, std::move(validity));
}

}  // namespace orin::datasources
