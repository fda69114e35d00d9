/// Builds levels as a run does, through the accessors, and looks at the files through libtiff.
// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>
#include <tiffio.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <numeric>
#include <string>
#include <vector>

#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/datasources/overviewaccessors.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "tests/host/drivers/tiff/testimage.h"

namespace orin::tests {

using datasources::IRasterDataset;
using datasources::IRasterWriter;
using datasources::LevelDescription;

/// A scratch folder, and the TIFF driver alone in the registry.
class TiffStore : public ::testing::Test {
 protected:
  TiffStore() {
    datasources::FormatRegistry::Instance().Clear();
    drivers::RegisterTiffDriver();
    TIFFSetWarningHandler(nullptr);
  }
  ~TiffStore() override { datasources::FormatRegistry::Instance().Clear(); }

  ScratchFolder folder_;
};

/// How the datasets that are opened from now on store their levels.
inline datasources::LevelOptions& OptionsOfStores() {
  static datasources::LevelOptions options;
  return options;
}

inline std::unique_ptr<IRasterDataset> Opened(datasources::IDataset* dataset) {
  std::unique_ptr<IRasterDataset> raster(dynamic_cast<IRasterDataset*>(dataset));
  raster->GetSource()->Levels()->SetOptions(OptionsOfStores());
  return raster;
}
inline std::unique_ptr<IRasterDataset> Open(const std::string& file, datasources::AccessMode mode) {
  return Opened(datasources::DatasetManager::GetInstance()->Open(file, mode));
}
inline std::unique_ptr<IRasterDataset> OpenGeneric(const std::string& file) {
  return Opened(datasources::DatasetManager::GetInstance()->OpenFormat("ZMBALL", file,
                                                                       datasources::kReadOnly));
}

inline std::vector<unsigned> ChannelsOf(const IRasterDataset& dataset) {
  std::vector<unsigned> channels(dataset.GetChannelCount());
  std::iota(channels.begin(), channels.end(), 1u);
  return channels;
}

inline std::vector<LevelDescription> LevelsOf(IRasterDataset& dataset) {
  return std::unique_ptr<datasources::IOverviewInfo>(dataset.GetOverviewInfo())->Describe();
}
inline std::vector<LevelDescription> LevelsOf(const std::string& file) {
  return LevelsOf(*Open(file, datasources::kReadOnly));
}
inline std::vector<unsigned> FactorsOf(const std::string& file) {
  std::vector<unsigned> factors;
  for (const LevelDescription& level : LevelsOf(file)) factors.push_back(level.level);
  return factors;
}

/// "11-": one character a channel, as the level's tag has it.
inline std::string ValidityOf(const LevelDescription& level) {
  std::string text;
  for (size_t i = 0; i < level.presentChannels.size(); ++i)
    text += !level.presentChannels[i] ? '-' : level.validChannels[i] ? '1' : '0';
  return text;
}

/// The layout of `level` of an image: its size, its tiles.
inline Layout LevelLayout(Layout image, unsigned level) {
  if (image.tile == 0) image.tile = 256;
  image.width /= level;
  image.height /= level;
  return image;
}

/// Called before each block; false stops writing.
using BeforeBlock = std::function<bool(unsigned)>;

/// Writes the pattern of `layout` in blocks of that edge.
inline void WriteBlocks(
    IRasterWriter& writer, const Layout& layout, unsigned edge,
    const BeforeBlock& goesOn = [](unsigned) { return true; }) {
  unsigned number = 0;
  const std::vector<unsigned> channels = writer.GetChannelsInfo();
  for (uint32_t y = 0; y < writer.GetHeight(); y += edge)
    for (uint32_t x = 0; x < writer.GetWidth(); x += edge) {
      if (!goesOn(number++)) return;
      const gobs::RasterInfo info(std::min(edge, writer.GetWidth() - x),
                                  std::min(edge, writer.GetHeight() - y), writer.GetChannelCount(),
                                  writer.GetDataType());
      gobs::Raster block(info, {0, 0, x, y});
      uint8_t* to = block.data;
      for (uint32_t row = 0; row < info.height; ++row)
        for (uint32_t column = 0; column < info.width; ++column)
          for (const unsigned channel : channels) {
            const auto sample = SampleAt(layout, x + column, y + row, channel - 1);
            to = std::copy(sample.begin(), sample.end(), to);
          }
      writer.Write(block);
    }
}

struct LevelBuilding {
  unsigned level = 2;
  unsigned edge = 100;  ///< of the blocks
  std::string method = "NEAREST";
  std::vector<unsigned> channels = {};  ///< none: all
  BeforeBlock goesOn = [](unsigned) { return true; };
  bool marksValid = true;
};

/// One level as a run builds it. \param image  the image's layout
inline void Build(IRasterDataset& dataset, const Layout& image, LevelBuilding what) {
  if (what.channels.empty()) what.channels = ChannelsOf(dataset);
  datasources::BasicOverviewWriterAccessor accessor(&dataset, what.channels);
  accessor.SetResamplingName(what.method);
  accessor.CreateLevel(what.level);
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(what.level));
  WriteBlocks(*writer, LevelLayout(image, what.level), what.edge, what.goesOn);
  if (what.marksValid) accessor.SetLevelValid(what.level, true);
}
inline void Build(const std::string& file, const Layout& image, LevelBuilding what) {
  Build(*Open(file, datasources::kUpdate), image, std::move(what));
}

/// One directory as libtiff sees it.
struct Seen {
  uint32_t width, height, subfile;
  uint16_t compression, predictor, photometric, planar;
  uint64_t offset;
  std::string metadata;
};

inline std::vector<Seen> DirectoriesOf(const std::string& file) {
  std::vector<Seen> all;
  TIFF* tiff = TIFFOpen(file.c_str(), "rm");
  if (!tiff) return all;
  do {
    Seen seen{};
    char* metadata = nullptr;
    uint32_t count = 0;
    seen.predictor = 1;
    TIFFGetField(tiff, TIFFTAG_IMAGEWIDTH, &seen.width);
    TIFFGetField(tiff, TIFFTAG_IMAGELENGTH, &seen.height);
    TIFFGetFieldDefaulted(tiff, TIFFTAG_SUBFILETYPE, &seen.subfile);
    TIFFGetFieldDefaulted(tiff, TIFFTAG_COMPRESSION, &seen.compression);
    TIFFGetField(tiff, TIFFTAG_PREDICTOR, &seen.predictor);
    TIFFGetField(tiff, TIFFTAG_PHOTOMETRIC, &seen.photometric);
    TIFFGetFieldDefaulted(tiff, TIFFTAG_PLANARCONFIG, &seen.planar);
    if (TIFFGetField(tiff, 42112, &count, &metadata) && metadata)
      seen.metadata = std::string(metadata);
    seen.offset = TIFFCurrentDirOffset(tiff);
    all.push_back(seen);
  } while (TIFFReadDirectory(tiff));
  TIFFClose(tiff);
  return all;
}

/// "400x300 200x150": the sizes in the order of the chain.
inline std::string SizesOf(const std::string& file) {
  std::string sizes;
  for (const Seen& seen : DirectoriesOf(file))
    sizes +=
        (sizes.empty() ? "" : " ") + std::to_string(seen.width) + "x" + std::to_string(seen.height);
  return sizes;
}

/// Compares every tile of directory `index`, decoded by libtiff, with the pattern of `layout`.
/// \param tolerance  of a byte; for lossy codecs
/// \returns what differs first; empty when nothing does
inline std::string WrongTile(const std::string& file, uint16_t index, const Layout& layout,
                             int tolerance = 0) {
  TIFF* tiff = TIFFOpen(file.c_str(), "rm");
  if (!tiff || !TIFFSetDirectory(tiff, index)) return "no directory " + std::to_string(index);
  const std::unique_ptr<TIFF, void (*)(TIFF*)> closer(tiff, &TIFFClose);
  if (layout.photometric == PHOTOMETRIC_YCBCR && layout.compression == COMPRESSION_JPEG)
    TIFFSetField(tiff, TIFFTAG_JPEGCOLORMODE, JPEGCOLORMODE_RGB);
  uint32_t tile = 0;
  for (uint32_t plane = 0; plane < (layout.planar ? layout.samples : 1u); ++plane)
    for (uint32_t top = 0; top < layout.height; top += layout.tile)
      for (uint32_t left = 0; left < layout.width; left += layout.tile, ++tile) {
        const auto expected = TileBytes(layout, left, top, layout.tile, plane);
        std::vector<uint8_t> stored(expected.size());
        const auto size = static_cast<tmsize_t>(stored.size());
        if (TIFFReadEncodedTile(tiff, tile, stored.data(), size) != size)
          return "tile " + std::to_string(tile) + " cannot be read";
        for (size_t i = 0; i < stored.size(); ++i)
          if (std::abs(int{stored[i]} - int{expected[i]}) > tolerance)
            return "tile " + std::to_string(tile) + " differs at byte " + std::to_string(i);
      }
  return tile == TIFFNumberOfTiles(tiff) ? "" : "another number of tiles";
}

inline std::vector<char> BytesOf(const std::string& file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

/// The same without what levels record of image and file, which changes with the file's time.
inline std::string BytesWithoutRecords(const std::string& file) {
  const std::vector<char> bytes = BytesOf(file);
  std::string text(bytes.begin(), bytes.end());
  const std::pair<std::string, size_t> items[] = {{"ORIN_IMAGE\">", model::kImageTextLength},
                                                  {"ORIN_CONTENT\">", model::kContentTextLength}};
  for (const auto& [item, length] : items)
    for (size_t at = text.find(item); at != text.npos; at = text.find(item, at + 1))
      text.replace(at + item.size(), length, std::string(length, '-'));
  return text;
}

/// Where the first directory keeps its link, found out the short way.
inline size_t LinkOfFirst(const std::string& file) {
  const std::vector<char> bytes = BytesOf(file);
  const bool isBig = bytes[2] == 43 || bytes[3] == 43;
  const size_t offset = DirectoriesOf(file).at(0).offset;
  const size_t at = offset + (bytes[0] == 'M' ? (isBig ? 7 : 1) : 0);  // directories here are small
  return offset +
         (isBig ? 8 + 20 * size_t(uint8_t(bytes[at])) : 2 + 12 * size_t(uint8_t(bytes[at])));
}

/// Reads a level through the accessor, as a source of a smaller level. \returns the first
/// difference
inline std::string WrongPixels(const std::string& file, const Layout& image, unsigned level) {
  const auto dataset = Open(file, datasources::kReadOnly);
  datasources::BasicOverviewWriterAccessor accessor(dataset.get(), ChannelsOf(*dataset));
  const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(level));
  const Layout layout = LevelLayout(image, level);
  gobs::Raster block(
      {writer->GetWidth(), writer->GetHeight(), writer->GetChannelCount(), writer->GetDataType()},
      {});
  writer->Read(block);
  const uint8_t* at = block.data;
  for (uint32_t y = 0; y < layout.height; ++y)
    for (uint32_t x = 0; x < layout.width; ++x)
      for (uint32_t channel = 0; channel < layout.samples; ++channel) {
        const auto sample = SampleAt(layout, x, y, channel);
        if (!std::equal(sample.begin(), sample.end(), at))
          return "pixel " + std::to_string(x) + ", " + std::to_string(y);
        at += sample.size();
      }
  return "";
}

/// True when `now` starts with the bytes of `before`, but for the `width` bytes of a link at
/// `link`.
inline bool StartsWith(const std::vector<char>& now, const std::vector<char>& before,
                       size_t link = 0, size_t width = 0) {
  if (now.size() < before.size()) return false;
  for (size_t i = 0; i < before.size(); ++i)
    if (now[i] != before[i] && !(i >= link && i < link + width)) return false;
  return true;
}

}  // namespace orin::tests
