/// Fuzzes what reads TIFF files: opening, structure, levels, pixels, metadata, side-cars.
// SPDX-License-Identifier: MIT

// The input is an image; what follows the text `[side-car]` in it is the image's side-car.
#include <algorithm>
#include <memory>
#include <string_view>

#include "fuzz/check.h"
#include "fuzz/scratchfile.h"
#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/levelstore.h"
#include "host/datasources/nodatamask.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/exception.h"

namespace {

using namespace orin;
using datasources::AccessMode;
using datasources::DatasetManager;
using datasources::IRasterDataset;
using datasources::IRasterReader;
using datasources::LevelDescription;

constexpr char kImage[] = "image.tif";
constexpr char kSideCar[] = "image.tif.ovr";
constexpr std::string_view kMarker = "[side-car]";
constexpr unsigned kMostChannels = 3;
constexpr unsigned kMostPixels = 40;  // columns, or rows, of what is read at once
constexpr size_t kMostLevels = 4;

std::vector<unsigned> SomeChannels(const IRasterDataset& raster) {
  std::vector<unsigned> channels;
  for (unsigned i = 0; i < std::min(raster.GetChannelCount(), kMostChannels); ++i)
    channels.push_back(raster.GetChannelCount() - i);
  return channels;
}

/// Reads with a margin of two pixels at (x, y); a failure that says which file is no finding.
void ReadBlock(IRasterReader& reader, unsigned x, unsigned y) {
  const unsigned width = std::min(kMostPixels, reader.GetWidth() - x);
  const unsigned height = std::min(kMostPixels, reader.GetHeight() - y);
  const gobs::RasterInfo info(width, height, reader.GetChannelCount(), reader.GetDataType());
  std::vector<uint8_t> buffer(gobs::PixelBytes(info) * (width + 4) * (height + 4));
  gobs::Raster block(info, {2, 2, x, y}, buffer.data());  // a heap buffer: its ends are guarded
  reader.Read(block);
}

/// The corners and the middle.
void ReadSome(IRasterReader& reader) {
  const unsigned width = reader.GetWidth(), height = reader.GetHeight();
  fuzz::Demand(width > 0 && height > 0, "a raster has pixels");
  fuzz::Demand(reader.GetTileWidth() > 0 && reader.GetTileHeight() > 0, "a grid has an extent");
  reader.SetMargin(2, 2, datasources::kMarginRepeatEdge);
  for (const unsigned y : {0u, height / 2, height - std::min(height, kMostPixels)})
    for (const unsigned x : {0u, width / 2, width - std::min(width, kMostPixels)})
      ReadBlock(reader, x, y);
}

/// Runs one operation. A refusal is as good as success if it names the file.
template <class Operation>
void Try(Operation&& operation) {
  try {
    operation();
  } catch (const Exception& refusal) {
    fuzz::Demand(refusal.GetMessage().find(kImage) != std::string::npos,
                 "a message names the file");
  }
}

void CheckLevel(const LevelDescription& entry, const IRasterDataset& raster) {
  fuzz::Demand(entry.level >= 2, "a level's factor is 2 or more");
  fuzz::Demand(entry.width > 0 && entry.width <= raster.GetWidth(), "a level is not wider");
  fuzz::Demand(entry.height > 0 && entry.height <= raster.GetHeight(), "a level is not higher");
  fuzz::Demand(entry.validChannels.size() == raster.GetChannelCount() &&
                   entry.presentChannels.size() == raster.GetChannelCount(),
               "a level says of every channel whether it is valid");
}

void ReadLevels(IRasterDataset& raster) {
  datasources::ILevelStore* store = raster.GetSource()->Levels();
  fuzz::Demand(store != nullptr, "a TIFF file can hold levels");
  const std::vector<LevelDescription> levels = store->List();
  for (size_t i = 0; i < levels.size(); ++i) {
    CheckLevel(levels[i], raster);
    fuzz::Demand(i == 0 || levels[i - 1].level < levels[i].level, "levels ascend");
    if (i >= kMostLevels) continue;
    Try([&] { ReadSome(*store->OpenWriter(levels[i].level, SomeChannels(raster))); });
  }
}

void ReadImage(IRasterDataset& raster) {
  datasources::BasicReader reader(&raster, SomeChannels(raster), false);
  const std::unique_ptr<gobs::IMaskDecision> noData(GetFileMetadataSrcMask(&reader));
  ReadSome(reader);
}

/// What a build asks before it writes the first pixel.
void PlanLevel(IRasterDataset& raster) {
  raster.GetSource()->Levels()->Create(2, SomeChannels(raster), "NEAREST");
}

void OpenAndRead(const std::string& path, const char* format, AccessMode mode) {
  Try([&] {
    DatasetManager* manager = DatasetManager::GetInstance();
    const std::unique_ptr<datasources::IDataset> dataset(manager->OpenFormat(format, path, mode));
    auto* raster = dynamic_cast<IRasterDataset*>(dataset.get());
    fuzz::Demand(raster && raster->GetChannelCount() > 0, "an image that opens has channels");
    Try([&] { ReadImage(*raster); });
    Try([&] { ReadLevels(*raster); });
    if (mode == AccessMode::kUpdate) Try([&] { PlanLevel(*raster); });
  });
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const fuzz::ScratchFolder folder;
  static const bool isRegistered = (drivers::RegisterTiffDriver(), true);
  if (!isRegistered) return 0;
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  const size_t marker = input.find(kMarker);
  const std::string path = folder.Write(kImage, data, std::min(marker, size));
  if (marker == input.npos) folder.Remove(kSideCar);
  else folder.Write(kSideCar, data + marker + kMarker.size(), size - marker - kMarker.size());
  OpenAndRead(path, "ZMBALL", AccessMode::kReadOnly);
  if (marker == input.npos) OpenAndRead(path, "TIFF", AccessMode::kUpdate);
  return 0;
}
