// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/archivedlevels.h"

#include <gdal.h>

#include <algorithm>
#include <charconv>
#include <string_view>
#include <utility>
#include <vector>

#include "host/drivers/gdal/gdalerrors.h"
#include "host/drivers/gdal/gdalhandle.h"
#include "host/model/levelrecord.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::LevelDescription;
using datasources::LevelPlace;
using datasources::LevelStatus;

/// Of the level's own directory; empty when it has no such item.
std::string ItemOf(GDALDatasetH level, const char* name) {
  const char* text = level ? GDALGetMetadataItem(level, name, nullptr) : nullptr;
  return text ? text : "";
}

unsigned NumberIn(const std::string& text) {
  unsigned number = 0;
  std::from_chars(text.data(), text.data() + text.size(), number);
  return number;
}

/// What the level's record says, in so far as it can be told without looking at the image's file.
void ReadRecord(GDALDatasetH level, LevelDescription& description) {
  description.method = ItemOf(level, model::kMethodItem);
  description.sourceLevel = NumberIn(ItemOf(level, model::kSourceItem));
  description.program = ItemOf(level, model::kProgramItem);
  const std::string validity = ItemOf(level, model::kValidityItem);
  for (size_t i = 0; i < description.validChannels.size(); ++i) {
    const char mark = i < validity.size() ? validity[i] : '-';
    description.presentChannels[i] = mark != '-';
    description.validChannels[i] = mark == '1';
    if (mark != '1') description.status = LevelStatus::kUnfinished;
  }
}

LevelDescription DescriptionOf(GDALDatasetH image, GDALRasterBandH band, const std::string& name) {
  LevelDescription description;
  GDALDatasetH level = GDALGetBandDataset(band);
  description.width = unsigned(GDALGetRasterBandXSize(band));
  description.height = unsigned(GDALGetRasterBandYSize(band));
  const std::string file = level ? GDALGetDescription(level) : "";
  const bool isBeside = file.ends_with(".ovr");
  description.place = isBeside ? LevelPlace::kSideCar : LevelPlace::kInternal;
  description.file = isBeside ? file : name;
  const auto channels = size_t(GDALGetRasterCount(image));
  description.presentChannels.assign(channels, true);
  description.validChannels.assign(channels, true);
  description.hasMask = (GDALGetMaskFlags(band) & GMF_PER_DATASET) != 0;
  description.level = NumberIn(ItemOf(level, model::kFactorItem));
  if (description.level >= 2) {
    ReadRecord(level, description);
  } else if (description.width > 0) {  // another program's: as near as its width tells
    const unsigned width = unsigned(GDALGetRasterXSize(image));
    description.level = std::max(2U, (width + description.width / 2) / description.width);
  }
  return description;
}

class Archived final : public datasources::ILevelStore {
 public:
  Archived(std::string name, const GdalFormat& format) : name_(std::move(name)), format_(format) {}

  std::vector<LevelDescription> List() const override { return {}; }

  std::vector<LevelDescription> ListHidden() const override {
    const GdalHandle image(name_, format_);
    const GdalErrors quiet;
    std::vector<LevelDescription> levels;
    GDALRasterBandH first = image.Band(1);
    for (int i = 0; i < GDALGetOverviewCount(first); ++i)
      if (GDALRasterBandH band = GDALGetOverview(first, i))
        levels.push_back(DescriptionOf(image.Get(), band, name_));
    return levels;
  }

  void Create(unsigned, const std::vector<unsigned>&, const std::string&) override { Refuse(); }
  std::unique_ptr<datasources::IRasterWriter> OpenWriter(unsigned,
                                                         const std::vector<unsigned>&) override {
    Refuse();
  }
  void SetValid(unsigned, const std::vector<unsigned>&, bool) override { Refuse(); }
  void Remove(const std::vector<unsigned>&) override {}

 private:
  [[noreturn]] void Refuse() const {
    throw Exception(FormatString(_("%s: cannot be opened for writing: it is no file of its own."),
                                 name_.c_str()),
                    "host/drivers/gdal/archivedlevels", "Archived::Refuse() const", 0);
  }

  std::string name_;
  const GdalFormat& format_;
};

}  // namespace

std::unique_ptr<datasources::ILevelStore> ArchivedLevels(const std::string& name,
                                                         const GdalFormat& format) {
  return std::make_unique<Archived>(name, format);
}

}  // namespace orin::drivers
