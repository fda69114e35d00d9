// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfaupdate.h"

#include <cpl_conv.h>

#include <algorithm>

#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/hfa/hfanodecopy.h"
#include "host/drivers/hfa/hfatree.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

/// An option of the library, for this thread, while the object lives.
class ThreadOption {
 public:
  ThreadOption(const char* key, const char* value) : key_(key) {
    const char* before = CPLGetThreadLocalConfigOption(key, nullptr);
    hadOne_ = before != nullptr;
    if (before) before_ = before;
    CPLSetThreadLocalConfigOption(key, value);
  }
  ~ThreadOption() { CPLSetThreadLocalConfigOption(key_, hadOne_ ? before_.c_str() : nullptr); }
  ThreadOption(const ThreadOption&) = delete;
  ThreadOption& operator=(const ThreadOption&) = delete;

 private:
  const char* key_;
  bool hadOne_ = false;
  std::string before_;
};

const char* CannotWrite() { return _("%s: cannot be written: %s."); }

GDALDatasetH OpenForUpdate(const std::string& path, const std::string& libraryName) {
  const ThreadOption noFileBeside("GDAL_PAM_ENABLED", "NO");
  const ThreadOption noOtherFiles("GDAL_DISABLE_READDIR_ON_OPEN", "EMPTY_DIR");
  const GdalErrors errors;
  const char* const allowed[] = {"HFA", nullptr};
  GDALDatasetH dataset =
      GDALOpenEx(libraryName.c_str(), GDAL_OF_RASTER | GDAL_OF_UPDATE | GDAL_OF_VERBOSE_ERROR,
                 allowed, nullptr, nullptr);
  errors.Require(dataset != nullptr, _("%s: cannot be opened for writing: %s."), path);
  return dataset;
}

}  // namespace

HfaUpdate::HfaUpdate(const std::string& path, const std::vector<HfaBlockMap>& renewed)
    : path_(path), file_(path) {
  for (const HfaBlockMap& map : renewed) RenewHfaBlocks(file_, map);
  dataset_ = OpenForUpdate(path, file_.LibraryName());
}

HfaUpdate::~HfaUpdate() {
  const GdalErrors ignored;
  Close();
}

void HfaUpdate::Close() {
  if (dataset_) GDALClose(dataset_);
  dataset_ = nullptr;
}

void HfaUpdate::AddLevel(unsigned level, const std::vector<unsigned>& channels) {
  std::vector<int> bands(channels.begin(), channels.end());
  std::vector<int> before;
  for (const int band : bands)
    before.push_back(GDALGetOverviewCount(GDALGetRasterBand(dataset_, band)));
  const ThreadOption inThisFile("HFA_USE_RRD", "NO");
  const GdalErrors errors;
  const int factor = static_cast<int>(level);
  const CPLErr answer =
      GDALBuildOverviews(dataset_, "NONE", 1, &factor, static_cast<int>(bands.size()), bands.data(),
                         GDALDummyProgress, nullptr);
  file_.RequireWritten();  // says why, which the library does not
  errors.Require(answer == CE_None, CannotWrite(), path_);
  for (size_t i = 0; i < bands.size(); ++i)
    if (GDALGetOverviewCount(GDALGetRasterBand(dataset_, bands[i])) != before[i] + 1)
      throw Exception(
          FormatString(_("%s: already holds a level of nearly the size of level %u; the format "
                         "cannot tell them apart. Choose another level, or build with --external."),
                       path_.c_str(), level),
          "host/drivers/hfa/hfaupdate", "orin::drivers::HfaUpdate::AddLevel", 0);
}

GDALRasterBandH HfaUpdate::LevelBand(unsigned channel, int position) const {
  const GdalErrors errors;
  GDALRasterBandH band = GDALGetRasterBand(dataset_, static_cast<int>(channel));
  if (band) band = GDALGetOverview(band, position);
  errors.Require(band != nullptr, CannotWrite(), path_);
  return band;
}

void HfaUpdate::WriteBlock(GDALRasterBandH band, const gobs::Raster& block, unsigned index,
                           unsigned width, unsigned height) {
  const GdalErrors errors;
  const auto pixel = static_cast<GSpacing>(PixelBytes(block));
  const GSpacing sample = pixel / block.channelCount;
  const GSpacing line = pixel * block.stride;
  CPLErr answer = CE_None;
  const auto put = [&](uint32_t x, uint32_t y, uint32_t columns, uint32_t rows, int64_t fromX,
                       int64_t fromY) {
    uint8_t* from =
        block.data + LayoutOf(block).Index(fromX, fromY) * PixelBytes(block) + index * sample;
    const CPLErr now =
        GDALRasterIOEx(band, GF_Write, int(x), int(y), int(columns), int(rows), from, int(columns),
                       int(rows), GDALGetRasterDataType(band), pixel, line, nullptr);
    if (now != CE_None) answer = now;
  };
  put(block.x, block.y, block.width, block.height, 0, 0);
  const bool surplusColumn =
      block.x + block.width == width && GDALGetRasterBandXSize(band) > int(width);
  const bool surplusRow =
      block.y + block.height == height && GDALGetRasterBandYSize(band) > int(height);
  if (surplusColumn) put(width, block.y, 1, block.height, block.width - 1, 0);
  if (surplusRow) put(block.x, height, block.width, 1, 0, block.height - 1);
  if (surplusColumn && surplusRow) put(width, height, 1, 1, block.width - 1, block.height - 1);
  // Now, so that no other thread meets the failures of these writes.
  if (GDALFlushRasterCache(band) != CE_None) answer = CE_Failure;
  file_.RequireWritten();  // says why, which the library does not
  errors.Require(answer == CE_None, CannotWrite(), path_);
}

void HfaUpdate::Finish() {
  const GdalErrors errors;
  Close();
  file_.RequireWritten();  // says why, which the library does not
  errors.Require(true, CannotWrite(), path_);
}

uint32_t HfaUpdate::AppendPart(unsigned channel, unsigned level) {
  HfaTree tree(file_.LibraryName());
  const auto parts = HfaLayersOf(tree).at(channel - 1).parts;
  const auto part = std::find_if(parts.begin(), parts.end(), [&](const HfaNode& node) {
    return FactorOfHfaPart(node) == level;
  });
  if (part == parts.end()) tree.Fail();
  const auto position = static_cast<uint32_t>(file_.Size());
  const std::string bytes = HfaNodeCopy(tree, *part).BytesAt(position);
  file_.Write(position, bytes.data(), bytes.size());
  return position;
}

void HfaUpdate::Keep() {
  file_.Keep();
  // The library writes a longer dictionary where the file's does not know what a level is. It holds
  // all that the other one holds, and may lead the way before anything needs it.
  const HfaTree::Header there = HfaTree(path_).FileHeader();
  const uint32_t dictionary = HfaTree(file_.LibraryName()).FileHeader().dictionary;
  if (dictionary == there.dictionary) return;
  std::string number(4, '\0');
  PutHfaNumber(number, 0, dictionary);
  file_.WriteNow(there.DictionaryPointer(), number.data(), number.size());
  file_.Sync();
}

}  // namespace orin::drivers
